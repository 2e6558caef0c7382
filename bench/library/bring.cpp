// The library's tasks: bring LIST INTO expand|copy|install [progress] brings each asset into a
// folder of its own below INTO.

#include <filesystem>
#include <memory>

#include "bench/Runner.h"
#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/iotasks/PVCopyAssetMetadataIOTask.h"
#include "parvel/iotasks/PVCrateAssetMetadataIOTask.h"
#include "parvel/iotasks/PVInstallAssetMetadataIOTask.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace {

using namespace parvel;

using ManagerPtr = std::shared_ptr<PVAssetMetadataFileManager>;
using TaskPtr = std::shared_ptr<PVAssetMetadataIOTask>;

TaskPtr installTask(const URL& url, const URL& folder, const ManagerPtr& manager) {
    const auto task =
        manager->taskToInstallAsset(PVAssetMetadataInspector::metadataForAssetAtURL_error(url));
    const URL staging = folder.appendingPathComponent("staging");
    std::filesystem::create_directory(staging.path());
    task->setTemporaryDirectory(staging);
    task->setShouldPlainCopy(true);
    return task;
}

TaskPtr makeTask(const bench::Arguments& arguments, const URL& url, const URL& folder,
                 const ManagerPtr& manager) {
    if (arguments.has("install"))
        return installTask(url, folder, manager);
    // The tasks copy the record's source.
    const AssetPtr record =
        PVAssetMetadata::metadataWithURL_dictionary(url, nullptr)
            ->copyWithUpdates([&url](PVMutableAssetMetadata& copy) { copy.setSourceURL(url); });
    if (arguments.has("copy"))
        return PVCopyAssetMetadataIOTask::initWithSourceMetadata_manager(record, manager);
    return PVCrateAssetMetadataIOTask::initWithSourceMetadata_manager(record, manager);
}

}  // namespace

int main(int argumentCount, char** argumentWords) {
    const bench::Arguments arguments = bench::argumentsOf(argumentCount, argumentWords);
    const ManagerPtr manager = PVAssetMetadataFileManager::init();
    double share = 0;
    return bench::runInto(arguments, [&](const std::string& path, const std::string& into) {
        const URL folder = URL::fileURLWithPath(into);
        const TaskPtr task = makeTask(arguments, URL::fileURLWithPath(path), folder, manager);
        if (arguments.has("progress")) {
            task->setProgressHandler(
                [&share](const AssetPtr& progress) { share = progress->percentComplete(); });
        }
        return task->executeWithTargetDirectory_error(folder) != nullptr;
    });
}
