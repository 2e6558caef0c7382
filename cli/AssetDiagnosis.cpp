#include "cli/AssetDiagnosis.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <filesystem>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include "cli/AssetRecord.h"
#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/CloudReport.h"
#include "parvel/platform/Rehearsal.h"
#include "parvel/platform/StagingDirectory.h"
#include "parvel/xattr/ExtendedAttributes.h"
#include "parvel/xattr/PNMetadataXattr.h"

namespace parvel::cli {
namespace {

namespace fs = std::filesystem;

/// What is written with the identity, which comes last.
constexpr std::array kWrittenBeforeIdentity{PNMetadataXattrTitle, PNMetadataXattrAuthor,
                                            PNMetadataXattrGenre, PNMetadataXattrExplicit};

bool keepsNoAttributes(const URL& url) {
    std::optional<String> identity;
    std::optional<Error> error;
    pvamfm_extendedAttributeString_forKey_error(url, &identity, PNMetadataXattrAssetID, &error);
    return error && error->domain() == PVPOSIXErrorDomain && error->code() == ENOTSUP;
}

Finding makeNoAttributesFinding() {
    return {"noAttributes",
            "its file system keeps no extended attributes: identities, titles and authors that are "
            "not in the files themselves are lost",
            "keep the library on a file system that has them, such as ext4, XFS or Btrfs"};
}

/// The identity that inspecting the asset would give without its attributes.
std::optional<String> identityOfContent(const URL& url) {
    const Rehearsal rehearsal;
    if (!pvamfm_setExtendedAttributeString_forKey_error(url, std::nullopt, PNMetadataXattrAssetID))
        return std::nullopt;
    const AssetPtr asset = PVAssetMetadataInspector::metadataForAssetAtURL_error(url);
    return asset ? asset->assetID() : std::nullopt;
}

void addAttributeFindings(const URL& url, bool isSynchronised, std::vector<Finding>& findings) {
    const AssetPtr named = PVAssetMetadata::metadataWithURL_dictionary(url, nullptr);
    const auto kept = PVAssetMetadataFileManager::init()->extendedAttributesForAsset_error(named);
    if (!kept)
        return;
    const Value* identity = kept->find(PNMetadataXattrAssetID);
    const bool isHalfWritten =
        !identity && std::any_of(kWrittenBeforeIdentity.begin(), kWrittenBeforeIdentity.end(),
                                 [&](std::string_view name) { return kept->contains(name); });
    if (isHalfWritten)
        findings.push_back({"halfWrittenAttributes",
                            "its attributes lack the identity, as a run leaves them that was "
                            "ended while it wrote them",
                            "\"parvel attributes --write\" completes them"});
    const String* text = identity ? identity->as<String>() : nullptr;
    if (!text || !isSynchronised)
        return;
    const std::optional<String> own = identityOfContent(url);
    if (own && *own != *text)
        findings.push_back({"identityInAttributes",
                            "only an attribute says that it is " + *text +
                                "; no sync client carries that to other devices, and a change made "
                                "there takes it away here: then it is " +
                                *own,
                            "keep it in a file of its own, with \"parvel attributes --dump\""});
}

Finding makeNotDownloadedFinding(const CloudReport& report) {
    return {"notDownloaded",
            "its content is not on this device: " + report.client + " has it elsewhere",
            "let the sync client download it before you are without a network"};
}

bool isUnheld(const std::string& path) {
    struct stat status {};
    if (lstat(path.c_str(), &status) != 0 || status.st_uid != geteuid())
        return false;
    const int item = open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (item < 0)
        return false;
    const bool isLocked = flock(item, LOCK_SH | LOCK_NB) != 0;
    close(item);
    return !isLocked;
}

/// The URL of the asset that a file of another kind may stand for: its name less the last part.
std::optional<URL> assetStoodFor(const fs::path& path) {
    const URL asset = URL::fileURLWithPath(fs::path(path).replace_extension().string());
    const bool isAsset = PVAssetMetadata::assetTypeForAssetAtURL(asset) != PVAssetTypeUnknown;
    const bool isNamedAsset = PVAssetMetadata::assetTypeForAssetAtURL(
                                  URL::fileURLWithPath(path.string())) != PVAssetTypeUnknown;
    return isAsset && !isNamedAsset ? std::optional(asset) : std::nullopt;
}

std::optional<Remnant> remnantAt(const fs::path& path) {
    const std::string name = path.filename().string();
    if (name.starts_with(StagingDirectory::asidePrefix))
        return Remnant{path.string(),
                       {"steppedAside",
                        "it was to be replaced by a run that was killed, and may be the only copy",
                        "see whether the new one is there, else give it back its name"}};
    if (name.starts_with(StagingDirectory::namePrefix)) {
        if (!isUnheld(path.string()))
            return std::nullopt;
        return Remnant{path.string(),
                       {"staleStaging", "a run that was killed has left it behind",
                        "the next run that stages in its folder clears it; look into it before, if "
                        "you miss anything"}};
    }
    const auto asset = assetStoodFor(path);
    const auto report = asset ? cloudReportForURL(urlOfPath(asset->path())) : std::nullopt;
    if (!report || report->status != DownloadingStatus::NotDownloaded)
        return std::nullopt;
    return Remnant{asset->path(), makeNotDownloadedFinding(*report)};
}

}  // namespace

bool AssetDiagnosis::isFirstOfItsFileSystem(const URL& url) {
    struct stat status {};
    return stat(url.path().c_str(), &status) == 0 && m_fileSystems.insert(status.st_dev).second;
}

std::vector<Finding> AssetDiagnosis::findingsOfFolder(const URL& folder) {
    if (keepsNoAttributes(folder) && isFirstOfItsFileSystem(folder))
        return {makeNoAttributesFinding()};
    return {};
}

std::vector<Finding> AssetDiagnosis::findingsOfAsset(Result& result) {
    const URL url = urlOfPath(result.path);
    std::vector<Finding> findings;
    const std::optional<CloudReport> report = cloudReportForURL(url);
    if (report && report->status == DownloadingStatus::NotDownloaded) {
        findings.push_back(makeNotDownloadedFinding(*report));
        return findings;
    }

    Result inspected = resultForPath(result.path);
    const AssetPtr record = AssetRecord(Uninspectable::Fails).forResult(inspected);
    const bool isNone = inspected.assetType == PVAssetTypeUnknown ||
                        !FileSystemService::makeDefault()->itemExistsAtPath(url.path());
    if (isNone) {
        result.error = inspected.error;
        return findings;
    }
    if (record)
        result.assetID = record->assetID();
    else
        findings.push_back({"unreadable",
                            "it can't be inspected: " + (inspected.reason.empty() && inspected.error
                                                             ? inspected.error->message()
                                                             : inspected.reason),
                            access(url.path().c_str(), R_OK) == 0
                                ? "bring it back from a backup, or from where it came"
                                : "check the permissions of the file"});
    if (keepsNoAttributes(url) && isFirstOfItsFileSystem(url))
        findings.push_back(makeNoAttributesFinding());
    addAttributeFindings(url, report && report->isUbiquitous, findings);
    return findings;
}

std::vector<Remnant> remnantsBelow(const std::string& folder) {
    std::vector<Remnant> remnants;
    std::error_code error;
    fs::recursive_directory_iterator entries(folder, fs::directory_options::skip_permission_denied,
                                             error);
    for (; !error && entries != fs::recursive_directory_iterator(); entries.increment(error)) {
        const fs::path& path = entries->path();
        const bool isClosed = path.filename().string().starts_with('.') ||
                              PVAssetMetadata::isBookURL(URL::fileURLWithPath(path.string()));
        if (isClosed)
            entries.disable_recursion_pending();
        if (std::optional<Remnant> remnant = remnantAt(path))
            remnants.push_back(std::move(*remnant));
    }
    std::sort(remnants.begin(), remnants.end(),
              [](const Remnant& left, const Remnant& right) { return left.path < right.path; });
    return remnants;
}

std::vector<Finding> findingsOfTrash(FileSystemService& service, const URL& item) {
    std::optional<Error> error;
    std::optional<URL> place;
    if (service.trashItem(item, &place, &error))
        return {};
    return {
        {"noTrash", "it can't be trashed" + (error ? ": " + error->message() : std::string()),
         "see that you may write to its folder and to the trash, in $XDG_DATA_HOME or ~/.local/share"}};
}

}  // namespace parvel::cli
