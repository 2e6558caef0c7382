#include "parvel/platform/StagingDirectory.h"

#include "parvel/platform/Service.h"
#include "parvel/platform/linux/StagingFolder.h"

namespace parvel {

namespace {

class HostStagingDirectory final : public StagingDirectory {
public:
    explicit HostStagingDirectory(host::StagingFolder folder)
        : m_folder(std::move(folder)), m_url(URL::fileURLWithPath(m_folder.path())) {}

    [[nodiscard]] const URL& url() const override { return m_url; }

private:
    host::StagingFolder m_folder;
    URL m_url;
};

class HostStagingService final : public StagingService {
public:
    std::unique_ptr<StagingDirectory> makeIn(const URL& folder, ErrorOut error) override {
        int failure = 0;
        auto made = host::StagingFolder::makeIn(folder.path(), failure);
        if (!made)
            return fail(error, makeServiceError(failure, folder));
        return std::make_unique<HostStagingDirectory>(std::move(*made));
    }
};

}  // namespace

std::unique_ptr<StagingDirectory> StagingDirectory::makeIn(const URL& folder, ErrorOut error) {
    return Service<StagingService>::current().makeIn(folder, error);
}

StagingService& StagingService::host() {
    static HostStagingService service;
    return service;
}

}  // namespace parvel
