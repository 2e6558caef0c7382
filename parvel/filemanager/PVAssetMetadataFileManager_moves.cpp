// Moves an item by one operation of the file-system service, which leaves it whole at the old place
// or whole at the new one. Names are tested first; the move behind the test is exclusive itself, so
// a competitor that takes a tested name sends the counter on instead of being overwritten.

#include "parvel/filemanager/AssetNames.h"
#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/metadata/AssetURL.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel {

namespace {

constexpr unsigned long kLastCount = 9999;

bool isSamePlace(const std::optional<URL>& left, const std::optional<URL>& right) {
    return left && right && left->standardized() == right->standardized();
}

/// What the caller's slot holds, as the log prints it.
std::optional<Error> valueOf(ErrorOut error) {
    return error ? *error : std::nullopt;
}

/// "Guide.pdf", "Guide 1.pdf", "Guide 2.pdf", …: the next name behind the count.
class CountedTarget {
public:
    CountedTarget(const URL& directory, std::string_view fileName)
        : m_directory(directory),
          m_stem(pathWithoutExtension(fileName)),
          m_extension(extensionOfPath(fileName)),
          m_url(directory.appendingPathComponent(fileName)) {}

    [[nodiscard]] const URL& url() const { return m_url; }
    [[nodiscard]] bool isExhausted() const { return m_count > kLastCount; }

    void countUp() {
        String name = m_stem + " " + std::to_string(m_count);
        if (!m_extension.empty())
            name += "." + m_extension;
        m_url = m_directory.appendingPathComponent(name);
        PVParvelLog().info(
            "Duplicate name encountered during renaming. Appending count to file %ld", m_count);
        ++m_count;
    }

private:
    URL m_directory;
    String m_stem;
    String m_extension;
    unsigned long m_count = 1;
    URL m_url;
};

}  // namespace

AssetPtr PVAssetMetadataFileManager::moveAsset_toURL_replaceExisting_error(
    const AssetPtr& asset, const std::optional<URL>& target, bool replaceExisting, ErrorOut error) {
    const std::optional<URL> source = urlOf(asset);
    if (isSamePlace(source, target))
        return asset;
    if (!target)
        return nullptr;
    if (!source)
        assign(error, makeMissingURLError());

    bool isMoved = false;
    if (replaceExisting) {
        isMoved =
            source && m_fileManager->replaceItem(*target, *source, ReplaceOptions::NewMetadataOnly,
                                                 /*resulting=*/nullptr, error);
        PVParvelLog().info(
            "Rename: Replacing possibly existing file. source: %@ target: %@ error: %@", source,
            target, valueOf(error));
    } else {
        isMoved = source && m_fileManager->moveItem(*source, *target, error);
        PVParvelLog().info("Rename: Move without replacement. source: %@ target: %@ error: %@",
                           source, target, valueOf(error));
    }
    return isMoved ? asset->copyWithUpdatedURL(target) : nullptr;
}

AssetPtr PVAssetMetadataFileManager::
    moveAsset_toDirectory_replaceExisting_renameIfCollision_useAssetIDFileName_error(
        const AssetPtr& asset, const URL& directory, bool replaceExisting, bool renameIfCollision,
        bool useAssetIDFileName, ErrorOut error) {
    PVParvelLog().debug("Rename: Start");
    const bool isBook = !asset || (!asset->isPDF() && !asset->isAudiobook());
    if (isBook) {
        const auto name = useAssetIDFileName ? assetIDFileName(asset) : lastComponentOf(asset);
        if (!name) {
            PVParvelLog().error("Failed to rename imported book");
            return fail(error, makeFileError(PVFileErrorCode::Corrupt, std::nullopt));
        }
        return moveAsset_toURL_replaceExisting_error(asset, directory.appendingPathComponent(*name),
                                                     replaceExisting, error);
    }

    const auto name = lastComponentOf(asset);
    if (!name)
        return nullptr;
    CountedTarget target(directory, *name);
    const std::optional<Error> errorBefore = valueOf(error);
    for (;;) {
        // Deliberate: the last candidate is used as it stands, taken or not.
        while (renameIfCollision && !target.isExhausted() &&
               m_fileManager->itemExistsAtPath(target.url().path()))
            target.countUp();
        AssetPtr moved =
            moveAsset_toURL_replaceExisting_error(asset, target.url(), replaceExisting, error);
        const bool wasTakenMeanwhile = !moved && renameIfCollision && !replaceExisting &&
                                       !target.isExhausted() &&
                                       m_fileManager->itemExistsAtPath(target.url().path());
        if (!wasTakenMeanwhile)
            return moved;
        assign(error, errorBefore);  // a try that is made again leaves none of its own
        target.countUp();
    }
}

String PVAssetMetadataFileManager::nonCollidingNameForFileName_inDestPath(
    const String& fileName, const String& destPath) const {
    const auto isTaken = [&](const String& name) {
        return m_fileManager->itemExistsAtPath(pathAppending(destPath, name));
    };
    if (!isTaken(fileName))
        return fileName;
    const String stem(pathWithoutExtension(fileName));
    const String extension(extensionOfPath(fileName));
    for (unsigned long long count = 1;; ++count) {
        // Deliberate: the dot is written without an extension too, and the count has no limit.
        String candidate = stem + " " + std::to_string(count) + "." + extension;
        if (!isTaken(candidate))
            return candidate;
    }
}

std::optional<String> PVAssetMetadataFileManager::_sanitizedFilenameForAsset(
    const AssetPtr& asset) const {
    return sanitizedFileName(asset);
}

AssetPtr PVAssetMetadataFileManager::updateWithKeyAttributesAssetMetadata_error(
    const AssetPtr& asset, ErrorOut error) {
    if (!asset) {
        assign(error, std::nullopt);
        return nullptr;
    }
    AssetPtr stamped = asset;
    // An insertion date is never absent, so the size alone decides.
    if (!asset->_hasAllocatedSize()) {
        std::optional<Error> sizeError;
        const auto url = asset->url();
        const std::uint64_t size =
            url ? _fixPermissionsAndCalculateAllocatedSizeAtURL_error(*url, &sizeError) : 0;
        stamped = asset->copyWithUpdates([size](PVMutableAssetMetadata& copy) {
            copy.setAllocatedSize(size);
            copy.setInsertionDate(Date::now());
        });
        assign(error, sizeError);
    }

    std::optional<Error> attributeError;
    (void)setExtendedAttributesForAsset_error(stamped, &attributeError);
    assign(error, attributeError);
    return stamped;
}

}  // namespace parvel
