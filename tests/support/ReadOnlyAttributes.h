#pragma once

#include <cerrno>

#include "tests/support/ForwardingXattrStore.h"

namespace parvel::testing {

/// The host's store, but no attribute can be written (EROFS), in force while it lives.
class ReadOnlyAttributes : public ForwardingXattrStore {
public:
    int set(const std::string&, const std::string&, std::span<const std::byte>) override {
        return EROFS;
    }
};

}  // namespace parvel::testing
