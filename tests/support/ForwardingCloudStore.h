#pragma once

#include "parvel/platform/CloudStore.h"
#include "parvel/platform/Service.h"

namespace parvel::testing {

/// Passes every call on to the host's store; derive from it to change some of them. In force while
/// it lives.
class ForwardingCloudStore : public CloudStore {
public:
    std::optional<bool> isUbiquitous(const URL& url, ErrorOut error) override {
        return host().isUbiquitous(url, error);
    }
    bool isPromisedItemReachable(const URL& url, ErrorOut error) override {
        return host().isPromisedItemReachable(url, error);
    }
    bool downloadingStatus(const URL& url, std::optional<DownloadingStatus>& status,
                           ErrorOut error) override {
        return host().downloadingStatus(url, status, error);
    }
    std::optional<URL> placeholderFile(const URL& url) override {
        return host().placeholderFile(url);
    }
    bool lieBelowOneRoot(const URL& left, const URL& right) override {
        return host().lieBelowOneRoot(left, right);
    }
    bool renamesWhole(const URL& item) override { return host().renamesWhole(item); }
    bool isAllHere(const URL& url) override { return host().isAllHere(url); }
    bool fetchContent(const URL& url, ErrorOut error) override {
        return host().fetchContent(url, error);
    }
    std::optional<CloudReport> report(const URL& url, ErrorOut error) override {
        return host().report(url, error);
    }

private:
    Service<CloudStore>::Replacement m_replacement{*this};
};

}  // namespace parvel::testing
