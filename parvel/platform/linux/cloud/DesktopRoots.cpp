#include "parvel/platform/linux/cloud/DesktopRoots.h"

#include <fcntl.h>
#include <stdlib.h>

#include <algorithm>
#include <memory>
#include <set>
#include <string_view>
#include <utility>

#include "parvel/foundation/URL.h"
#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/OpenFolder.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel::host {

namespace {

constexpr const char* kAccountInterface = "org.freedesktop.CloudProviders.Account";
constexpr std::size_t kMostFiles = 64;
constexpr std::size_t kMostRoots = 64;
constexpr std::size_t kLargestFile = 16'384;
constexpr std::size_t kLongestText = 4096;

struct CloseBus {
    const Libsystemd* systemd = nullptr;
    void operator()(sd_bus* bus) const { systemd->sd_bus_close_unref(bus); }
};
using Bus = std::unique_ptr<sd_bus, CloseBus>;

struct FreeMessage {
    const Libsystemd& systemd;
    void operator()(sd_bus_message* message) const { systemd.sd_bus_message_unref(message); }
};
using Message = std::unique_ptr<sd_bus_message, FreeMessage>;

/// Where a client can be asked: a name on the bus and an object there.
using Provider = std::pair<std::string, std::string>;

std::string readSmallFile(int folder, const char* name) {
    const FileDescriptor file(
        retried([&] { return ::openat(folder, name, O_RDONLY | O_CLOEXEC | O_NONBLOCK); }));
    struct stat status {};
    if (!file || ::fstat(file.get(), &status) != 0 || !S_ISREG(status.st_mode))
        return {};
    std::string text(kLargestFile, '\0');
    const ssize_t length = retried([&] { return ::read(file.get(), text.data(), text.size()); });
    text.resize(length > 0 ? static_cast<std::size_t>(length) : 0);
    return text;
}

std::string_view withoutSpace(std::string_view text) {
    const std::size_t begin = std::min(text.find_first_not_of(" \t\r"), text.size());
    const std::size_t end = text.find_last_not_of(" \t\r") + 1;
    return begin < end ? text.substr(begin, end - begin) : std::string_view();
}

/// Reads a key file whose lines are `BusName=…` and `ObjectPath=…`.
Provider parsedProvider(std::string_view text) {
    Provider provider;
    while (!text.empty()) {
        const std::size_t end = std::min(text.find('\n'), text.size());
        const std::string_view line = text.substr(0, end);
        text.remove_prefix(std::min(end + 1, text.size()));
        const std::size_t equals = line.find('=');
        if (equals == line.npos)
            continue;
        const std::string_view key = withoutSpace(line.substr(0, equals));
        const std::string_view value = withoutSpace(line.substr(equals + 1));
        if (key == "BusName")
            provider.first = value;
        else if (key == "ObjectPath")
            provider.second = value;
    }
    return provider;
}

void addProvidersIn(const std::string& folder, std::set<Provider>& providers) {
    DirectoryStream entries(openFolder(AT_FDCWD, folder.c_str(), O_RDONLY));
    if (!entries.isOpen())
        return;
    std::size_t files = 0;
    while (const dirent* entry = entries.next()) {
        if (!std::string_view(entry->d_name).ends_with(".ini"))
            continue;
        if (++files > kMostFiles)
            return;
        providers.insert(parsedProvider(readSmallFile(entries.descriptor(), entry->d_name)));
    }
}

std::set<Provider> registeredProviders() {
    const char* set = ::secure_getenv("XDG_DATA_DIRS");
    std::string_view folders = set && *set ? set : "/usr/local/share:/usr/share";
    std::set<Provider> providers;
    while (!folders.empty()) {
        const std::size_t end = std::min(folders.find(':'), folders.size());
        if (folders.starts_with('/'))
            addProvidersIn(pathAppending(folders.substr(0, end), "cloud-providers"), providers);
        folders.remove_prefix(std::min(end + 1, folders.size()));
    }
    return providers;
}

bool isUsable(const Libsystemd& systemd, const Provider& provider) {
    return systemd.sd_bus_service_name_is_valid(provider.first.c_str()) > 0 &&
           systemd.sd_bus_object_path_is_valid(provider.second.c_str()) > 0;
}

std::string busAddress() {
    if (const char* address = ::secure_getenv("DBUS_SESSION_BUS_ADDRESS"))
        return address;
    const char* folder = ::secure_getenv("XDG_RUNTIME_DIR");
    return folder ? "unix:path=" + std::string(folder) + "/bus" : std::string();
}

std::uint64_t microsecondsUntil(Deadline deadline) {
    using std::chrono::microseconds;
    const auto left = std::chrono::ceil<microseconds>(deadline - std::chrono::steady_clock::now());
    return static_cast<std::uint64_t>(std::max<microseconds::rep>(left.count(), 0));
}

/// Connects in steps of its own: the library's own wait for a bus that says nothing is far longer.
Bus connectedBus(const Libsystemd& systemd, Deadline deadline) {
    sd_bus* made = nullptr;
    if (systemd.sd_bus_new(&made) < 0)
        return nullptr;
    Bus bus(made, CloseBus{&systemd});
    const std::string address = busAddress();
    if (address.empty() || systemd.sd_bus_set_address(made, address.c_str()) < 0 ||
        systemd.sd_bus_set_bus_client(made, 1) < 0 || systemd.sd_bus_start(made) < 0)
        return nullptr;
    while (systemd.sd_bus_is_ready(made) == 0) {
        const int processed = systemd.sd_bus_process(made, nullptr);
        const std::uint64_t left = microsecondsUntil(deadline);
        if (processed < 0 || left == 0 || (processed == 0 && systemd.sd_bus_wait(made, left) < 0))
            return nullptr;
    }
    return systemd.sd_bus_is_ready(made) > 0 ? std::move(bus) : nullptr;
}

/// Reads a property whose value is a text; another is passed over. Negative on a broken message.
int readTextProperty(const Libsystemd& systemd, sd_bus_message* message, std::string& out) {
    const char* contents = nullptr;
    const int peeked = systemd.sd_bus_message_peek_type(message, nullptr, &contents);
    if (peeked < 0 || !contents || std::string_view(contents) != "s")
        return systemd.sd_bus_message_skip(message, "v");
    const char* text = nullptr;
    const int read = systemd.sd_bus_message_read(message, "v", "s", &text);
    if (read >= 0 && text && std::string_view(text).size() <= kLongestText)
        out = text;
    return read;
}

/// A folder that a client may keep: none keeps the whole system.
bool isPossibleRoot(DesktopRoot& root) {
    struct stat system {};
    return root.path.starts_with('/') && ::stat(root.path.c_str(), &root.status) == 0 &&
           S_ISDIR(root.status.st_mode) && ::stat("/", &system) == 0 &&
           !isSameItem(root.status, system);
}

/// Reads the properties of one interface, `a{sv}`, and adds the folder that an account names.
int readProperties(const Libsystemd& systemd, sd_bus_message* message, bool isAccount,
                   std::vector<DesktopRoot>& roots) {
    int result = systemd.sd_bus_message_enter_container(message, 'a', "{sv}");
    DesktopRoot root{};
    while (result >= 0 &&
           (result = systemd.sd_bus_message_enter_container(message, 'e', "sv")) > 0) {
        const char* name = nullptr;
        std::string other;
        result = systemd.sd_bus_message_read_basic(message, 's', &name);
        if (result < 0)
            return result;
        const std::string_view property = name;
        result = readTextProperty(systemd, message,
                                  property == "Path"   ? root.path
                                  : property == "Name" ? root.client
                                                       : other);
        if (result >= 0)
            result = systemd.sd_bus_message_exit_container(message);
    }
    if (result < 0)
        return result;
    if (isAccount && roots.size() < kMostRoots && isPossibleRoot(root))
        roots.push_back(std::move(root));
    return systemd.sd_bus_message_exit_container(message);
}

/// Reads `a{oa{sa{sv}}}`: objects, their interfaces, the properties of these.
int readObjects(const Libsystemd& systemd, sd_bus_message* message,
                std::vector<DesktopRoot>& roots) {
    int result = systemd.sd_bus_message_enter_container(message, 'a', "{oa{sa{sv}}}");
    while (result >= 0 &&
           (result = systemd.sd_bus_message_enter_container(message, 'e', "oa{sa{sv}}")) > 0) {
        if ((result = systemd.sd_bus_message_skip(message, "o")) >= 0)
            result = systemd.sd_bus_message_enter_container(message, 'a', "{sa{sv}}");
        while (result >= 0 &&
               (result = systemd.sd_bus_message_enter_container(message, 'e', "sa{sv}")) > 0) {
            const char* interface = nullptr;
            if ((result = systemd.sd_bus_message_read_basic(message, 's', &interface)) >= 0)
                result = readProperties(systemd, message,
                                        std::string_view(interface) == kAccountInterface, roots);
            if (result >= 0)
                result = systemd.sd_bus_message_exit_container(message);
        }
        if (result >= 0)
            result = systemd.sd_bus_message_exit_container(message);
        if (result >= 0)
            result = systemd.sd_bus_message_exit_container(message);
    }
    return result;
}

void askProvider(const Libsystemd& systemd, sd_bus* bus, const Provider& provider,
                 Deadline deadline, std::vector<DesktopRoot>& roots) {
    sd_bus_message* made = nullptr;
    if (systemd.sd_bus_message_new_method_call(
            bus, &made, provider.first.c_str(), provider.second.c_str(),
            "org.freedesktop.DBus.ObjectManager", "GetManagedObjects") < 0)
        return;
    const Message call(made, FreeMessage{systemd});
    sd_bus_message* answered = nullptr;
    const std::uint64_t left = microsecondsUntil(deadline);
    if (left == 0 || systemd.sd_bus_message_set_auto_start(made, 0) < 0 ||
        systemd.sd_bus_call(bus, made, left, nullptr, &answered) < 0)
        return;
    const Message answer(answered, FreeMessage{systemd});
    std::vector<DesktopRoot> told;
    // An answer that is wrong anywhere is believed nowhere.
    if (readObjects(systemd, answered, told) >= 0)
        roots.insert(roots.end(), std::make_move_iterator(told.begin()),
                     std::make_move_iterator(told.end()));
}

}  // namespace

std::vector<DesktopRoot> desktopRoots(Deadline deadline, const Libsystemd& (*libsystemd)()) {
    std::vector<DesktopRoot> roots;
    std::set<Provider> providers = registeredProviders();
    if (providers.empty())
        return roots;
    const Libsystemd& systemd = libsystemd();
    if (!systemd.isComplete())
        return roots;
    std::erase_if(providers,
                  [&](const Provider& provider) { return !isUsable(systemd, provider); });
    if (providers.empty())
        return roots;
    if (const Bus bus = connectedBus(systemd, deadline))
        for (const Provider& provider : providers)
            askProvider(systemd, bus.get(), provider, deadline, roots);
    return roots;
}

}  // namespace parvel::host
