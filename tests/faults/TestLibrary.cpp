#include "tests/faults/TestLibrary.h"

#include <stdlib.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <stdexcept>

#include "tests/faults/TrappedRun.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

constexpr const char* kOtherFileSystem = "/dev/shm";
const std::vector<std::string> kFolders = {"from",
                                           "to",
                                           "cloud",
                                           "trash/Trash/files",
                                           "trash/Trash/info",
                                           "other",
                                           "other trash/Trash/files",
                                           "other trash/Trash/info"};

bool contains(const std::string& text, std::string_view part) {
    return text.find(part) != std::string::npos;
}

void check(bool isDone, const std::string& path) {
    if (!isDone)
        throw std::runtime_error("the test can't make " + path);
}

void setAttribute(const std::string& path, const std::string& name, const std::string& value) {
    check(::setxattr(path.c_str(), name.c_str(), value.data(), value.size(), 0) == 0, path);
}

void setMode(const std::string& path, mode_t mode) {
    check(::chmod(path.c_str(), mode) == 0, path);
}

void writeFile(const std::string& path, const std::string& content) {
    fs::create_directories(fs::path(path).parent_path());
    std::ofstream file(path, std::ios::binary);
    check(static_cast<bool>(file << content), path);
}

std::string contentOf(const std::string& item) {
    return std::string(9000, item[item.find_first_of("0123456789")]);
}

void makePackage(const std::string& path, const std::string& item) {
    const bool isClosed = contains(item, "closed");
    writeFile(path + "/META-INF/container.xml", contentOf(item));
    writeFile(path + "/OPS/text", contentOf(item) + "text");
    fs::create_symlink("OPS/text", path + "/link");
    setAttribute(path + "/OPS/text", "user.note", "on a member");
    setMode(path + "/OPS/text", 0440);
    setMode(path + "/OPS", isClosed ? 0555 : 0755);
    setAttribute(path, "user.title", item.substr(0, 9));
    if (contains(item, "kept"))
        setAttribute(path, "user.kept", "yes");
    setMode(path, isClosed ? 0555 : contains(item, "kept") ? 0750 : 0755);
}

void makeFile(const std::string& path, const std::string& item) {
    writeFile(path, contentOf(item));
    setAttribute(path, "user.title", item.substr(0, 6));
    if (contains(item, "kept"))
        setAttribute(path, "user.kept", "yes");
    setMode(path, contains(item, "kept") ? 0640 : 0644);
}

void makeItem(const std::string& path, const std::string& item) {
    if (item.starts_with("package"))
        makePackage(path, item);
    else
        makeFile(path, item);
}

std::string attributesOf(const std::string& path) {
    char names[4096];
    const ssize_t length = ::llistxattr(path.c_str(), names, sizeof names);
    std::vector<std::string> attributes;
    for (ssize_t at = 0; at < length;) {
        const std::string name = names + at;
        at += static_cast<ssize_t>(name.size()) + 1;
        char value[4096];
        const ssize_t size = ::lgetxattr(path.c_str(), name.c_str(), value, sizeof value);
        // Those of the library itself are judged apart.
        if (name.starts_with("user.") && !name.starts_with("user.com."))
            attributes.push_back(name + "=" +
                                 std::string(value, size > 0 ? static_cast<std::size_t>(size) : 0));
    }
    std::sort(attributes.begin(), attributes.end());
    std::string text;
    for (const std::string& attribute : attributes)
        text += " " + attribute;
    return text;
}

/// One line an entry: name, mode, attributes and, shortened where they repeat, its bytes.
std::string fingerprint(const std::string& path, const std::string& name = ".") {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0)
        return name + " missing";
    std::string text = name + " " + std::to_string(status.st_mode) + attributesOf(path);
    if (S_ISLNK(status.st_mode))
        return text + " -> " + fs::read_symlink(path).string() + "\n";
    if (!S_ISDIR(status.st_mode)) {
        std::ifstream file(path, std::ios::binary);
        const std::string bytes(std::istreambuf_iterator<char>(file), {});
        const bool isEven =
            !bytes.empty() && bytes.find_first_not_of(bytes[0]) == std::string::npos;
        text += " " + std::to_string(bytes.size()) + " bytes ";
        return text + (isEven ? bytes.substr(0, 1) : bytes) + "\n";
    }
    text += "\n";
    std::vector<std::string> entries;
    for (const auto& entry : fs::directory_iterator(path))
        entries.push_back(entry.path().filename().string());
    std::sort(entries.begin(), entries.end());
    for (const std::string& entry : entries)
        text += fingerprint(path + "/" + entry, name + "/" + entry);
    return text;
}

const std::string& fingerprintOfItem(const std::string& item) {
    static std::map<std::string, std::string> known;
    std::string& text = known[item];
    if (text.empty()) {
        const TemporaryDirectory folder;
        makeItem(folder / "item", item);
        text = fingerprint(folder / "item");
    }
    return text;
}

bool isEmptyItem(const std::string& path) {
    return !fs::is_symlink(path) && fs::is_empty(path);
}

}  // namespace

TestLibrary::TestLibrary() {
    std::string pattern = std::string(kOtherFileSystem) + "/parvel-XXXXXX";
    m_other = ::mkdtemp(pattern.data()) ? pattern : m_here / "no other";
    for (const std::string& folder : kFolders)
        fs::create_directories(path(folder));
    fs::create_directory(path("cloud/.stfolder"));
    fs::create_directory(m_here / "locks");
    fs::permissions(m_here / "locks", fs::perms::owner_all);
    giveToChildren(m_here.path());
    giveToChildren(m_other);
}

TestLibrary::~TestLibrary() {
    std::error_code ignored;
    fs::remove_all(m_other, ignored);
}

void TestLibrary::fill(const Layout& layout) {
    for (const auto& [place, item] : layout) {
        makeItem(path(place), item);
        giveToChildren(path(place));
    }
}

std::string TestLibrary::path(const std::string& place) const {
    return place.starts_with("other") ? (m_other / place).string() : m_here / place;
}

URL TestLibrary::url(const std::string& place) const {
    return URL::fileURLWithPath(path(place));
}

std::string TestLibrary::nameOf(const std::string& path, const Layout& known) const {
    if (path.ends_with(".trashinfo"))
        return "info";
    const std::string found = fingerprint(path);
    for (const auto& [place, item] : known) {
        if (fingerprintOfItem(item) == found)
            return item;
    }
    return isEmptyItem(path) ? "placeholder" : found;
}

Layout TestLibrary::layout(const Layout& known) const {
    Layout result;
    for (const std::string& folder : kFolders) {
        for (const auto& entry : fs::directory_iterator(path(folder))) {
            const std::string name = entry.path().filename().string();
            if (name != ".stfolder" && !name.starts_with(".parvel-stage-"))
                result[folder + "/" + name] = nameOf(entry.path().string(), known);
        }
    }
    return result;
}

std::vector<std::string> TestLibrary::litter() const {
    std::vector<std::string> found;
    for (const fs::path& root : {m_here.path(), m_other}) {
        for (const auto& entry : fs::recursive_directory_iterator(root)) {
            if (entry.path().filename().string().starts_with(".parvel-"))
                found.push_back(entry.path().string());
        }
    }
    return found;
}

std::vector<std::string> TestLibrary::folders() const {
    std::vector<std::string> paths;
    for (const std::string& folder : kFolders)
        paths.push_back(path(folder));
    return paths;
}

void TestLibrary::setEnvironment(bool hasTrashOnOtherFileSystem) const {
    ::setenv("XDG_DATA_HOME", path(hasTrashOnOtherFileSystem ? "other trash" : "trash").c_str(), 1);
    ::setenv("XDG_RUNTIME_DIR", (m_here / "locks").c_str(), 1);
}

bool hasTwoFileSystems() {
    const TemporaryDirectory folder;
    struct stat here {};
    struct stat there {};
    return ::stat(folder.path().c_str(), &here) == 0 && ::stat(kOtherFileSystem, &there) == 0 &&
           here.st_dev != there.st_dev && ::access(kOtherFileSystem, W_OK) == 0;
}

}  // namespace parvel::testing
