#include "cli/DryRun.h"

namespace parvel::cli {

void DryRun::declare(CommandLine& line) {
    line.flag("--dry-run", "print what would come of it, and touch nothing", m_isAsked);
}

void DryRun::begin() {
    if (m_isAsked)
        m_rehearsal = std::make_unique<Rehearsal>();
}

std::shared_ptr<PVAssetMetadataFileManager> DryRun::makeManager() const {
    if (!m_rehearsal)
        return PVAssetMetadataFileManager::init();
    auto manager = PVAssetMetadataFileManager::initWithFileManager(m_rehearsal->fileManager());
    manager->setFileCoordinator(m_rehearsal->fileCoordinator());
    return manager;
}

}  // namespace parvel::cli
