// Makes the package under its own name in the target directory, exclusively, and leaves there what
// a failed or cancelled copy has made.

#include "parvel/iotasks/PVCrateAssetMetadataIOTask.h"

#include <cerrno>
#include <utility>

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/iotasks/PlacedCopy.h"
#include "parvel/metadata/AssetURL.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/ArchiveCopier.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"

namespace parvel {

namespace {

/// Text without the line breaks around it; what is no text counts as absent.
std::optional<String> trimmedOfLineBreaks(const Value* value) {
    constexpr std::string_view lineBreaks = "\r\n";
    const String* text = PVDynamicCast(classOf<String>, value);
    if (!text)
        return std::nullopt;
    const std::size_t start = text->find_first_not_of(lineBreaks);
    if (start == String::npos)
        return String();
    return text->substr(start, text->find_last_not_of(lineBreaks) + 1 - start);
}

}  // namespace

/// Takes the copier's reports for the task, while it executes.
class PVCrateAssetMetadataIOTask::Callbacks final : public ArchiveCopierCallbacks {
public:
    Callbacks(PVCrateAssetMetadataIOTask& task, ArchiveCopier& copier)
        : m_task(task), m_url(task.sourceMetadata()->url()), m_copier(copier) {
        m_copier.setCallbacks(this);
    }
    ~Callbacks() override { m_copier.setCallbacks(nullptr); }
    Callbacks(const Callbacks&) = delete;
    Callbacks& operator=(const Callbacks&) = delete;

    void fatalError(ArchiveCopier&) override {
        const int current = errno;
        m_task.m_crateError = makePOSIXError(current, m_url);
        // Deliberate: the misspelling is part of the text.
        PVParvelLog().error(
            "Crate extraction: Encountered faltal posix error: %d url: %@ crateError: %@", current,
            m_url, m_task.m_crateError);
    }

    // Deliberate: the error's code is errno, while the text is that of the copier's own number.
    int fileError(ArchiveCopier&, const std::string& path, int errnoValue) override {
        const int current = errno;
        m_task.m_crateError = makePOSIXError(current, m_url);
        PVParvelLog().info("Crate extraction: File Error: %d path: %s errString: %s", current, path,
                           makePOSIXError(errnoValue, std::nullopt).message());
        return kStopAfterFileError;
    }

    void fileFinished(ArchiveCopier&, const std::string&, ArchiveObjectType,
                      std::uint64_t size) override {
        m_task.m_bytesSoFar += size;
        if (m_task.progressHandler())
            m_task.reportProgress(static_cast<double>(m_task.m_bytesSoFar) /
                                  static_cast<double>(m_task.m_totalBytes));
    }

private:
    PVCrateAssetMetadataIOTask& m_task;
    std::optional<URL> m_url;
    ArchiveCopier& m_copier;
};

std::shared_ptr<PVCrateAssetMetadataIOTask>
PVCrateAssetMetadataIOTask::initWithSourceMetadata_manager(
    AssetPtr sourceMetadata, std::shared_ptr<PVAssetMetadataFileManager> manager) {
    return std::make_shared<PVCrateAssetMetadataIOTask>(Construction(), std::move(sourceMetadata),
                                                        std::move(manager));
}

AssetPtr PVCrateAssetMetadataIOTask::executeWithTargetDirectory_error(
    const std::optional<URL>& directory, ErrorOut error) {
    PVParvelLog().info("CrateCopy: start: targetDirectory: %@", directory);
    m_copiers.push_back(Service<ArchiveCopierFactory>::current().makeCopier());
    m_currentCopier.store(m_copiers.back().get(), std::memory_order_release);

    AssetPtr result = copyInto(directory, error);

    PVParvelLog().debug("CrateCopy: end success: %d", result != nullptr);
    return result;
}

AssetPtr PVCrateAssetMetadataIOTask::copyInto(const std::optional<URL>& directory, ErrorOut error) {
    const AssetPtr& asset = sourceMetadata();
    const std::optional<URL> url = urlOf(asset);
    const std::optional<URL> source = asset ? asset->sourceURL() : std::nullopt;
    const std::optional<bool> isDirectory =
        source ? Service<ResourceQueries>::current().isDirectory(*source, error) : std::nullopt;
    if (!isDirectory) {
        PVParvelLog().info("Failed to stat source URL information. sourceMetadataURL: %@ error: %@",
                           url, error ? *error : std::nullopt);
        return nullptr;
    }
    const std::optional<URL> target = urlOfCopy(source, directory);

    const std::shared_ptr<ArchiveCopier> copier = m_copiers.back();
    ArchiveCopier::Count count;
    if (*isDirectory) {
        count = copier->countTree(source->path());
        PVParvelLog().debug("CrateCopy: files in directory {count: %llu}", count.files);
    } else {
        count = copier->countArchive(source->path());
        PVParvelLog().debug("CrateCopy: files in archive {count: %llu}", count.files);
    }
    m_totalBytes = count.bytes;

    const Callbacks callbacks(*this, *copier);
    const bool isZip = !*isDirectory;
    Dictionary options;
    if (isZip)
        options.set(ArchiveCopier::extractPKZip, Number::boolean(true));
    PVParvelLog().debug("CrateCopy: starting copy {isZip: %d}", isZip);
    const int failure = copier->copy(source->path(), pathOrEmpty(target), options);
    if (failure != 0) {
        if (isCancelled()) {
            PVParvelLog().info("CrateCopy: Cancelled sourceMetadataURL: %@", url);
            return fail(error, makeCancelledError(url));
        }
        PVParvelLog().info("CrateCopy: Error: %d sourceMetadataURL: %@ crateError: %@", failure,
                           url, m_crateError);
        // Deliberate: none where the copier told no error.
        assign(error, m_crateError);
        return nullptr;
    }

    return asset->copyWithUpdates([&](PVMutableAssetMetadata& copy) {
        copy.setPercentComplete(1.0);
        copy.setUrl(target);
        copy.setMimeType(trimmedOfLineBreaks(copy.mimeType()));
    });
}

std::shared_ptr<ArchiveCopier> PVCrateAssetMetadataIOTask::copier() const {
    return m_copiers.empty() ? nullptr : m_copiers.back();
}

// The flag comes first, so that a copy which ends by the copier's knows why.
void PVCrateAssetMetadataIOTask::cancel() {
    m_isCancelled.store(true, std::memory_order_release);
    if (ArchiveCopier* copier = m_currentCopier.load(std::memory_order_acquire))
        copier->cancel();
}

}  // namespace parvel
