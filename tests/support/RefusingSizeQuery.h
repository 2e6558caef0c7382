#pragma once

#include <cerrno>

#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"

namespace parvel::testing {

/// The host's queries, but no item tells its size (EIO), in force while it lives.
class RefusingSizeQuery : public ResourceQueries {
public:
    bool isReachable(const URL& url, ErrorOut error) override {
        return host().isReachable(url, error);
    }
    std::optional<bool> isDirectory(const URL& url, ErrorOut error) override {
        return host().isDirectory(url, error);
    }
    std::optional<std::uint64_t> totalAllocatedSize(const URL& url, ErrorOut error) override {
        return fail(error, makePOSIXError(EIO, url));
    }
    std::optional<DirectoryRelationship> relationship(const URL& directory, const URL& item,
                                                      ErrorOut error) override {
        return host().relationship(directory, item, error);
    }

private:
    Service<ResourceQueries>::Replacement m_replacement{*this};
};

}  // namespace parvel::testing
