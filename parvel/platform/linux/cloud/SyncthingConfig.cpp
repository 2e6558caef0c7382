#include "parvel/platform/linux/cloud/SyncthingConfig.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <stdlib.h>
#include <sys/stat.h>

#include <charconv>
#include <cstring>
#include <string_view>
#include <vector>

#include "parvel/platform/FileReader.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/XmlDocument.h"
#include "parvel/platform/linux/ItemTree.h"

namespace parvel::host {

namespace {

constexpr std::uint64_t kLargestConfiguration = 4ULL << 20;
constexpr int kMostFolders = 1000;

std::string folderInHome(const char* variable, std::string_view fallback) {
    const char* set = ::secure_getenv(variable);
    if (set && *set == '/')
        return set;
    const char* home = ::secure_getenv("HOME");
    return home && *home == '/' ? pathAppending(home, fallback) : std::string();
}

/// The configurations that there may be: newer versions keep it with the state.
std::vector<std::string> configurationFiles() {
    std::vector<std::string> files;
    for (const std::string& folder : {folderInHome("XDG_STATE_HOME", ".local/state"),
                                      folderInHome("XDG_CONFIG_HOME", ".config")})
        if (!folder.empty())
            files.push_back(folder + "/syncthing/config.xml");
    return files;
}

std::string expanded(const std::string& path) {
    const char* home = ::secure_getenv("HOME");
    return home && (path == "~" || path.starts_with("~/")) ? home + path.substr(1) : path;
}

/// Each configuration that can be read.
std::vector<std::shared_ptr<const XmlDocument>> configurations() {
    std::vector<std::shared_ptr<const XmlDocument>> documents;
    for (const std::string& file : configurationFiles()) {
        const URL url = URL::fileURLWithPath(file);
        const auto bytes = Service<FileReader>::current().readFile(url, kLargestConfiguration);
        if (auto document = bytes ? Service<XmlParser>::current().parse(*bytes, url) : nullptr)
            documents.push_back(std::move(document));
    }
    return documents;
}

bool findRoot(const std::string& path, struct stat& root) {
    return ::stat(expanded(path).c_str(), &root) == 0;
}

std::optional<XmlNode> element(const XmlDocument& document, const std::string& expression) {
    return document.evaluate(nullptr, expression).first;
}

std::string textOf(const XmlDocument& document, const std::string& expression) {
    const std::optional<XmlNode> node = element(document, expression);
    return node ? document.stringValue(node->node) : std::string();
}

/// Whether the key can stand in a header: it is sent as it is.
bool isPlainKey(std::string_view key) {
    return !key.empty() && key.size() <= 256 &&
           key.find_first_not_of(
               "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz"
               "0123456789-_.") == key.npos;
}

socklen_t setLoopback4(sockaddr_storage& address, in_addr host, std::uint16_t port) {
    constexpr std::uint32_t loopbackNet = 127;
    if (host.s_addr == htonl(INADDR_ANY))
        host.s_addr = htonl(INADDR_LOOPBACK);
    if (ntohl(host.s_addr) >> 24 != loopbackNet)
        return 0;
    sockaddr_in made{};
    made.sin_family = AF_INET;
    made.sin_port = htons(port);
    made.sin_addr = host;
    std::memcpy(&address, &made, sizeof made);
    return sizeof made;
}

socklen_t setLoopback6(sockaddr_storage& address, const in6_addr& host, std::uint16_t port) {
    if (!IN6_IS_ADDR_LOOPBACK(&host) && !IN6_IS_ADDR_UNSPECIFIED(&host))
        return 0;
    sockaddr_in6 made{};
    made.sin6_family = AF_INET6;
    made.sin6_port = htons(port);
    made.sin6_addr = in6addr_loopback;
    std::memcpy(&address, &made, sizeof made);
    return sizeof made;
}

/// Reads "127.0.0.1:8384" and its kin; one that listens everywhere is asked on the loopback. The
/// length of the address, or 0.
socklen_t parseAddress(std::string_view text, sockaddr_storage& address) {
    const std::size_t colon = text.rfind(':');
    if (colon == text.npos)
        return 0;
    const std::string_view digits = text.substr(colon + 1);
    std::uint16_t port = 0;
    const auto read = std::from_chars(digits.data(), digits.data() + digits.size(), port);
    if (read.ec != std::errc() || read.ptr != digits.data() + digits.size() || port == 0)
        return 0;
    std::string host(text.substr(0, colon));
    if (host.empty() || host == "localhost")
        host = "127.0.0.1";
    if (host.starts_with('[') && host.ends_with(']'))
        host = host.substr(1, host.size() - 2);
    in_addr host4{};
    in6_addr host6{};
    if (::inet_pton(AF_INET, host.c_str(), &host4) == 1)
        return setLoopback4(address, host4, port);
    return ::inet_pton(AF_INET6, host.c_str(), &host6) == 1 ? setLoopback6(address, host6, port)
                                                            : 0;
}

void setInterface(SyncthingFolder& folder, const XmlDocument& document) {
    const std::optional<XmlNode> gui = element(document, "/configuration/gui");
    if (!gui || document.attribute(gui->node, "enabled") != "true" ||
        document.attribute(gui->node, "tls") == "true")
        return;
    folder.apiKey = textOf(document, "/configuration/gui/apikey");
    if (isPlainKey(folder.apiKey))
        folder.addressLength =
            parseAddress(textOf(document, "/configuration/gui/address"), folder.address);
}

std::optional<SyncthingFolder> folderIn(const XmlDocument& document, const struct stat& root) {
    for (int number = 1; number <= kMostFolders; ++number) {
        const std::optional<XmlNode> node =
            element(document, "/configuration/folder[" + std::to_string(number) + "]");
        if (!node)
            return std::nullopt;
        const auto path = document.attribute(node->node, "path");
        const auto id = document.attribute(node->node, "id");
        struct stat status {};
        if (!path || !id || !findRoot(*path, status) || !isSameItem(status, root))
            continue;
        SyncthingFolder folder{*id, {}, 0, {}};
        setInterface(folder, document);
        return folder;
    }
    return std::nullopt;
}

void addUnusualMarks(const XmlDocument& document, std::vector<SyncthingMark>& marks) {
    const std::string unusual = std::string("/configuration/folder[markerName!='") +
                                usualSyncthingMark + "' and markerName!='']";
    for (int number = 1; number <= kMostFolders; ++number) {
        const std::string each = unusual + "[" + std::to_string(number) + "]";
        const std::optional<XmlNode> node = element(document, each);
        if (!node)
            return;
        const auto path = document.attribute(node->node, "path");
        struct stat root {};
        if (path && findRoot(*path, root))
            marks.push_back({root, textOf(document, each + "/markerName")});
    }
}

}  // namespace

std::vector<SyncthingMark> unusualSyncthingMarks() {
    std::vector<SyncthingMark> marks;
    for (const auto& document : configurations())
        addUnusualMarks(*document, marks);
    return marks;
}

std::optional<SyncthingFolder> syncthingFolderAt(const std::string& root) {
    struct stat status {};
    if (::stat(root.c_str(), &status) != 0)
        return std::nullopt;
    for (const auto& document : configurations())
        if (auto folder = folderIn(*document, status))
            return folder;
    return std::nullopt;
}

}  // namespace parvel::host
