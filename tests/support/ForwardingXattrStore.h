#pragma once

#include "parvel/platform/Service.h"
#include "parvel/platform/XattrStore.h"

namespace parvel::testing {

/// Passes every call on to the host's store; derive from it to change some of them. In force while
/// it lives.
class ForwardingXattrStore : public XattrStore {
public:
    bool decorate(std::string& name) override { return host().decorate(name); }
    int size(const std::string& path, const std::string& name, std::size_t& size) override {
        return host().size(path, name, size);
    }
    int get(const std::string& path, const std::string& name, std::span<std::byte> buffer,
            std::size_t& length) override {
        return host().get(path, name, buffer, length);
    }
    int set(const std::string& path, const std::string& name,
            std::span<const std::byte> value) override {
        return host().set(path, name, value);
    }
    int remove(const std::string& path, const std::string& name) override {
        return host().remove(path, name);
    }
    int list(const std::string& path, std::vector<std::string>& names) override {
        return host().list(path, names);
    }

private:
    Service<XattrStore>::Replacement m_replacement{*this};
};

}  // namespace parvel::testing
