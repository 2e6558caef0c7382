#include "cli/AssetChanges.h"
#include "cli/BookStaging.h"
#include "cli/Command.h"
#include "cli/Interrupt.h"
#include "cli/Progress.h"
#include "cli/ServiceInPlace.h"
#include "cli/TransferAdvice.h"
#include "parvel/iotasks/PVInstallAssetMetadataIOTask.h"

namespace parvel::cli {
namespace {

/// Keeps the one copy of a book that is moved: the library would delete it where the move fails.
class SourceGuard : public ForwardingFileSystemService {
public:
    SourceGuard(std::shared_ptr<FileSystemService> target, URL source)
        : ForwardingFileSystemService(std::move(target)), m_source(std::move(source)) {}

    bool removeItem(const URL& item, ErrorOut error) override {
        if (isSamePlace(item, m_source))
            return fail(error, makePOSIXError(EPERM, item));
        return ForwardingFileSystemService::removeItem(item, error);
    }

private:
    URL m_source;
};

class InstallCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    void install(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) const;
    [[nodiscard]] bool isRefused(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                 Result& result) const;
    [[nodiscard]] std::optional<URL> takenPlace(PVAssetMetadataFileManager& manager,
                                                const AssetPtr& asset) const;
    [[nodiscard]] std::optional<URL> replacedPlace(const AssetPtr& asset) const;
    [[nodiscard]] std::optional<URL> placeOfOldName(PVAssetMetadataFileManager& manager) const;

    std::optional<std::string> m_into;
    bool m_moves = false;
    bool m_replaces = false;
    bool m_renames = false;
    bool m_takesAssetID = false;
    bool m_goesToCloud = false;
    std::optional<std::string> m_updatingPath;
    BookStaging m_staging;
    ProgressOption m_progress;
    AssetChanges m_changes{Uninspectable::Fails};

    URL m_folder = URL::fileURLWithPath("");
    AssetPtr m_updating;
    Progress::Form m_form = Progress::Form::Auto;
};

void InstallCommand::declare(CommandLine& line) {
    line.group("Where to, and how");
    line.option("--into", "DIR", "the folder of the library", m_into);
    line.flag("--move", "move the asset itself, in place of a copy", m_moves);
    line.flag("--replace", "put it in the place of what stands there", m_replaces);
    line.flag("--rename", "count up to a free name (PDF documents and audiobooks)", m_renames);
    line.flag("--asset-id-name", "name a book after its identity", m_takesAssetID);
    line.flag("--cloud", "DIR lies in synchronised storage: name it after its title",
              m_goesToCloud);
    line.option("--updating", "PATH",
                "the asset of the library that the one PATH is a new\n"
                "version of: with --replace it takes that one's place",
                m_updatingPath);
    m_staging.declare(line);
    m_progress.declare(line);
    m_changes.declareForce(line, "do it even where that loses a book or a folder");
    m_changes.declare(line);
}

int InstallCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    m_staging.begin();
    m_form = m_progress.form();
    if (!m_into)
        throw UsageError("say where to: --into DIR");
    m_folder = urlOfOption("--into", *m_into);
    m_changes.setTarget(m_folder);
    if (m_updatingPath) {
        if (!m_changes.hasOnePath(operands))
            throw UsageError("--updating takes one PATH");
        Result updating = resultForPath(urlOfOption("--updating", *m_updatingPath).path());
        m_updating = AssetRecord(Uninspectable::HasItsURLAlone).forResult(updating);
    }
    return m_changes.run("install", std::move(operands),
                         [this](PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                Result& result) { install(manager, asset, result); });
}

/// What stands where a moved asset would go, and would be neither replaced nor given way to.
std::optional<URL> InstallCommand::takenPlace(PVAssetMetadataFileManager& manager,
                                              const AssetPtr& asset) const {
    const bool givesWay = m_renames && (asset->isPDF() || asset->isAudiobook());
    if (m_replaces || givesWay || m_goesToCloud)
        return std::nullopt;
    const auto place = placeInFolder(asset, m_folder, m_takesAssetID);
    const bool isTaken = place && manager.fileManager()->itemExistsAtPath(place->path()) &&
                         !isSamePlace(*place, *asset->url());
    return isTaken ? place : std::nullopt;
}

/// Where a moved asset would go over what stands there.
std::optional<URL> InstallCommand::replacedPlace(const AssetPtr& asset) const {
    if (!m_replaces)
        return std::nullopt;
    const auto old = m_updating ? m_updating->url() : std::nullopt;
    if (old)
        return m_goesToCloud ? old : m_folder.appendingPathComponent(old->lastPathComponent());
    return m_goesToCloud ? std::nullopt : placeInFolder(asset, m_folder, m_takesAssetID);
}

/// What stands under the updated asset's name in a folder that it does not lie in.
std::optional<URL> InstallCommand::placeOfOldName(PVAssetMetadataFileManager& manager) const {
    const bool takesOldName = m_updating && m_replaces && !m_goesToCloud;
    const auto old = takesOldName ? m_updating->url() : std::nullopt;
    if (!old)
        return std::nullopt;
    const URL place = m_folder.appendingPathComponent(old->lastPathComponent());
    const bool isOther =
        manager.fileManager()->itemExistsAtPath(place.path()) && !isSamePlace(place, *old);
    return isOther ? std::optional(place) : std::nullopt;
}

bool InstallCommand::isRefused(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                               Result& result) const {
    if (m_changes.isForced())
        return false;
    const bool takesOldName = m_updating && m_replaces && !m_goesToCloud;
    if (takesOldName && m_updating->assetType() != asset->assetType()) {
        refuse(result, "the updated one is an asset of another kind, whose name it would get",
               "leave out --updating, or give --force");
        return true;
    }
    if (const std::optional<URL> other = placeOfOldName(manager)) {
        refuse(result, other->path() + " is another asset than the updated one, and would be lost",
               "give its folder with --into, or --force to lose it");
        return true;
    }
    if (!m_moves)
        return false;
    if (isRefusedForCapitals(asset, result))
        return true;
    const std::optional<URL> replaced = replacedPlace(asset);
    if (replaced && manager.fileManager()->itemExistsAtPath(replaced->path()) &&
        !m_changes.mayReplace(*replaced, *asset->url(), result)) {
        result.advice = adviceForTransfer(result, *asset->url(), {});
        return true;
    }
    const std::optional<URL> taken = takenPlace(manager, asset);
    if (taken)
        refuse(result, taken->path() + " is taken, and the library would delete the book then",
               "--replace replaces it, --rename counts up to a free name (PDF documents and "
               "audiobooks), --force loses the book");
    return taken.has_value();
}

void InstallCommand::install(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                             Result& result) const {
    result.nothing = "not installed";
    if (isRefused(manager, asset, result))
        return;
    const std::optional<StagingPlace> place =
        m_staging.placeFor(*asset->url(), m_folder, m_changes.isForced(), result);
    if (!place)
        return;
    std::optional<ServiceInPlace> guarded;
    if (!m_changes.isForced())
        guarded.emplace(manager,
                        std::make_shared<SourceGuard>(manager.fileManager(), *asset->url()));

    const auto task = manager.taskToInstallAsset(asset);
    task->setTemporaryDirectory(place->directory);
    task->setUpdatingAsset(m_updating);
    task->setReplaceExisting(m_replaces);
    task->setRenameIfCollision(m_renames);
    task->setUseAssetIDFileName(m_takesAssetID);
    task->setMakeUbiquitous(m_goesToCloud);
    task->setShouldPlainCopy(!m_moves);
    AssetPtr installed;
    {
        Progress progress(m_form, result.path);
        task->setProgressHandler(
            [&progress](const AssetPtr& copy) { progress.report(copy->percentComplete()); });
        const OnInterrupt cancelling([&task] { task->cancel(); });
        installed = task->executeWithTargetDirectory_error(m_folder, &result.error);
        task->setProgressHandler(nullptr);
    }
    setRecord(result, installed, PVAssetMetadataFlavorFull);
    if (installed && installed->url())
        result.outcome = "installed as " + installed->url()->path();
    else
        result.advice = adviceForTransfer(result, *asset->url(), "--replace replaces it");
}

}  // namespace

std::unique_ptr<Command> makeInstallCommand() {
    return std::make_unique<InstallCommand>();
}

}  // namespace parvel::cli
