#include "parvel/platform/XattrStore.h"

#include <sys/xattr.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <string_view>

#include "parvel/platform/HeldItem.h"
#include "parvel/platform/linux/OpenItem.h"

namespace parvel {

namespace {

/// The namespace that the kernel leaves to programs.
constexpr std::string_view userPrefix = "user.";
/// The kernel's longest name, its prefix included.
constexpr std::size_t longestName = 255;
/// The kernel's longest list (XATTR_LIST_MAX).
constexpr std::size_t longestList = 65536;
/// A list of this length takes one call: our own names and a few others fit.
constexpr std::size_t usualList = 1024;

/// Our own names and a few others.
constexpr std::size_t usualNames = 16;

/// A name as the kernel takes it.
class HostName {
public:
    explicit HostName(std::string_view name) {
        if (name.find('\0') != std::string_view::npos) {
            m_errno = EINVAL;
            return;
        }
        if (name.size() > longestName - userPrefix.size()) {
            m_errno = ERANGE;
            return;
        }
        std::memcpy(m_text.data(), userPrefix.data(), userPrefix.size());
        std::memcpy(m_text.data() + userPrefix.size(), name.data(), name.size());
        m_text[userPrefix.size() + name.size()] = '\0';
    }

    [[nodiscard]] int errnoValue() const { return m_errno; }
    [[nodiscard]] const char* text() const { return m_text.data(); }

private:
    std::array<char, longestName + 1> m_text;
    int m_errno = 0;
};

/// Cuts the kernel's list at its NULs and keeps the names of our namespace.
std::vector<std::string> userNames(std::string_view list) {
    std::vector<std::string> names;
    if (!list.empty())
        names.reserve(usualNames);
    while (!list.empty()) {
        const std::string_view name = list.substr(0, list.find('\0'));
        if (name.starts_with(userPrefix))
            names.emplace_back(name.substr(userPrefix.size()));
        list.remove_prefix(std::min(name.size() + 1, list.size()));
    }
    return names;
}

class HostXattrStore final : public XattrStore {
public:
    bool decorate(std::string& name) override {
        if (name.find('\0') == std::string::npos)
            return true;
        errno = EINVAL;
        return false;
    }

    // The size query passes size 0: any other size with no buffer is EFAULT here.
    int size(const std::string& path, const std::string& name, std::size_t& size) override {
        return read(path, name, nullptr, 0, size);
    }

    int get(const std::string& path, const std::string& name, std::span<std::byte> buffer,
            std::size_t& length) override {
        const int errnoValue = read(path, name, buffer.data(), buffer.size(), length);
        if (errnoValue == 0 && length > buffer.size())
            return ERANGE;
        return errnoValue;
    }

    int set(const std::string& path, const std::string& name,
            std::span<const std::byte> value) override {
        const HostName hostName(name);
        if (hostName.errnoValue() != 0)
            return hostName.errnoValue();
        const int result = ::setxattr(path.c_str(), hostName.text(), value.data(), value.size(), 0);
        return result == 0 ? 0 : errno;
    }

    int remove(const std::string& path, const std::string& name) override {
        const HostName hostName(name);
        if (hostName.errnoValue() != 0)
            return hostName.errnoValue();
        return ::removexattr(path.c_str(), hostName.text()) == 0 ? 0 : errno;
    }

    int list(const std::string& path, std::vector<std::string>& names) override {
        names.clear();
        std::array<char, usualList> usual;
        ssize_t length = readList(path, usual.data(), usual.size());
        if (length >= 0) {
            names = userNames({usual.data(), static_cast<std::size_t>(length)});
        } else if (errno == ERANGE) {
            std::string longest(longestList, '\0');
            length = readList(path, longest.data(), longest.size());
            if (length >= 0)
                names = userNames({longest.data(), static_cast<std::size_t>(length)});
        }
        return length < 0 ? errno : 0;
    }

private:
    static ssize_t readList(const std::string& path, char* buffer, std::size_t capacity) {
        if (const auto& held = HeldItem::at(path))
            return ::flistxattr(held->descriptor.get(), buffer, capacity);
        return ::listxattr(path.c_str(), buffer, capacity);
    }

    static int read(const std::string& path, const std::string& name, void* buffer,
                    std::size_t capacity, std::size_t& length) {
        const HostName hostName(name);
        if (hostName.errnoValue() != 0)
            return hostName.errnoValue();
        const auto& held = HeldItem::at(path);
        const ssize_t result =
            held ? ::fgetxattr(held->descriptor.get(), hostName.text(), buffer, capacity)
                 : ::getxattr(path.c_str(), hostName.text(), buffer, capacity);
        if (result < 0)
            return errno;
        length = static_cast<std::size_t>(result);
        return 0;
    }
};

}  // namespace

XattrStore& XattrStore::host() {
    static HostXattrStore store;
    return store;
}

}  // namespace parvel
