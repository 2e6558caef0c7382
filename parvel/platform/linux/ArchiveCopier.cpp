#include "parvel/platform/ArchiveCopier.h"

#include <atomic>
#include <memory>
#include <utility>

#include "parvel/foundation/ValueReadings.h"
#include "parvel/platform/linux/ArchiveExpansion.h"
#include "parvel/platform/linux/CopierReports.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/PackageCopy.h"
#include "parvel/platform/linux/Paths.h"

namespace parvel {

namespace {

class HostArchiveCopier final : public ArchiveCopier {
public:
    void setCallbacks(ArchiveCopierCallbacks* callbacks) override { m_callbacks = callbacks; }

    Count countTree(const std::string& path) override {
        return host::countPackage(path, reports());
    }
    Count countArchive(const std::string& path) override {
        int error = 0;
        m_source = host::SourceArchive::open(path, reports(), error);
        return m_source ? host::countArchiveEntries(*m_source, reports()) : Count();
    }

    int copy(const std::string& source, const std::string& destination,
             const Dictionary& options) override {
        const host::CopierReports running = reports();
        if (const int error = running.cancellation())
            return error;
        const bool isArchive = boolReading(options.find(extractPKZip));
        if (const int error = isArchive ? expand(source, destination, running)
                                        : host::copyPackage(source, destination, running))
            return error;
        int error = host::syncItem(destination);
        if (error == 0)
            error = host::syncFolder(host::parentFolderOf(destination));
        return error != 0 ? running.fatal(error) : running.cancellation();
    }

    void cancel() override { m_isCancelled.store(true, std::memory_order_release); }

private:
    [[nodiscard]] host::CopierReports reports() { return {*this, m_callbacks, m_isCancelled}; }

    /// Expands what was counted, where that stands there still, with its directory read already.
    int expand(const std::string& source, const std::string& destination,
               const host::CopierReports& running) {
        int error = 0;
        std::unique_ptr<host::SourceArchive> archive = std::move(m_source);
        if (!archive || !archive->isStillAt(source))
            archive = host::SourceArchive::open(source, running, error);
        return archive ? host::expandArchive(*archive, destination, running) : running.fatal(error);
    }

    ArchiveCopierCallbacks* m_callbacks = nullptr;
    std::unique_ptr<host::SourceArchive> m_source;
    std::atomic<bool> m_isCancelled{false};
};

class HostArchiveCopierFactory final : public ArchiveCopierFactory {
public:
    std::shared_ptr<ArchiveCopier> makeCopier() override {
        return std::make_shared<HostArchiveCopier>();
    }
};

}  // namespace

ArchiveCopierFactory& ArchiveCopierFactory::host() {
    static HostArchiveCopierFactory factory;
    return factory;
}

}  // namespace parvel
