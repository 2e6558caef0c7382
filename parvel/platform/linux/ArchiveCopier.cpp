#include "parvel/platform/ArchiveCopier.h"

#include <atomic>

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
        return host::countArchiveEntries(path, reports());
    }

    int copy(const std::string& source, const std::string& destination,
             const Dictionary& options) override {
        const host::CopierReports running = reports();
        if (const int error = running.cancellation())
            return error;
        const bool isArchive = boolReading(options.find(extractPKZip));
        if (const int error = isArchive ? host::expandArchive(source, destination, running)
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

    ArchiveCopierCallbacks* m_callbacks = nullptr;
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
