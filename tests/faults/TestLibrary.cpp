#include "tests/faults/TestLibrary.h"

#include <stdlib.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <stdexcept>

#include "parvel/foundation/PVCasts.h"
#include "parvel/platform/PropertyList.h"
#include "tests/faults/TrappedRun.h"
#include "tests/support/ZipBuilder.h"

namespace parvel::testing {
namespace {

namespace fs = std::filesystem;

constexpr const char* kOtherFileSystem = "/dev/shm";
constexpr std::string_view kStorePrefix = "store ";
const std::vector<std::string> kFolders = {"from",
                                           "to",
                                           "cloud",
                                           "staging",
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

std::string storeFileOf(const std::string& title) {
    const auto bytes = PropertyListCodec::host().writeXML(Dictionary{{"itemName", title}});
    std::vector<std::uint8_t> storage;
    const Data::Bytes text = bytes->contiguous(storage);
    return {text.begin(), text.end()};
}

/// The files of a zipped or expanded book.
std::map<std::string, std::string> membersOf(const std::string& item) {
    return {{"BazaarArtwork", contentOf("cover 1")},
            {"BazaarMetadata.plist", storeFileOf("of the zip")},
            {"OPS/text", contentOf(item)}};
}

void makeZip(const std::string& path, const std::string& item) {
    ZipBuilder archive;
    for (const auto& [name, content] : membersOf(item))
        archive.deflated(name, content);
    writeFile(path, archive.bytes());
    setMode(path, 0644);
}

void makePrivateFolder(const std::string& path, const std::map<std::string, std::string>& files) {
    for (const auto& [name, content] : files) {
        writeFile(path + "/" + name, content);
        setMode(path + "/" + name, 0600);
        setMode(fs::path(path + "/" + name).parent_path(), 0700);
    }
    setMode(path, 0700);
}

void makePackage(const std::string& path, const std::string& item) {
    const bool isClosed = contains(item, "closed");
    const bool isPrivate = contains(item, "private");
    writeFile(path + "/META-INF/container.xml", contentOf(item));
    writeFile(path + "/OPS/text", contentOf(item) + "text");
    fs::create_symlink("OPS/text", path + "/link");
    setAttribute(path + "/OPS/text", "user.note", "on a member");
    setMode(path + "/META-INF/container.xml", isPrivate ? 0600 : 0644);
    setMode(path + "/OPS/text", isPrivate ? 0600 : 0440);
    setMode(path + "/OPS", isClosed ? 0555 : contains(item, "barred") ? 0600 : 0755);
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

void makeBareFile(const std::string& path, const std::string& content, mode_t mode) {
    writeFile(path, content);
    setMode(path, mode);
}

void makeItem(const std::string& path, const std::string& item) {
    if (item.starts_with("package"))
        makePackage(path, item);
    else if (item.starts_with("zip"))
        makeZip(path, item);
    else if (item.starts_with("expanded"))
        makePrivateFolder(path, membersOf(item));
    else if (item.starts_with("folder"))
        makePrivateFolder(path, {{"text", contentOf(item)}});
    else if (item.starts_with("cover"))
        makeBareFile(path, contentOf(item), 0600);
    else if (item.starts_with("image"))
        makeBareFile(path, contentOf(item), 0644);
    else if (item.starts_with(kStorePrefix))
        makeBareFile(path, storeFileOf(item.substr(kStorePrefix.size())), 0644);
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

std::string bytesOf(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

enum class Modes { Told, Untold };

/// One line an entry: name, mode, attributes and, shortened where they repeat, its bytes.
std::string fingerprint(const std::string& path, Modes modes, const std::string& name = ".") {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0)
        return name + " missing";
    const mode_t told = modes == Modes::Told ? status.st_mode : status.st_mode & S_IFMT;
    std::string text = name + " " + std::to_string(told) + attributesOf(path);
    if (S_ISLNK(status.st_mode))
        return text + " -> " + fs::read_symlink(path).string() + "\n";
    if (!S_ISDIR(status.st_mode)) {
        const std::string bytes = bytesOf(path);
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
        text += fingerprint(path + "/" + entry, modes, name + "/" + entry);
    return text;
}

/// An item as it is to be, for comparison.
struct Model {
    explicit Model(const std::string& item) : path(folder / "item") {
        makeItem(path, item);
        whole = fingerprint(path, Modes::Told);
        butForModes = fingerprint(path, Modes::Untold);
    }

    TemporaryDirectory folder;
    std::string path;
    std::string whole;
    std::string butForModes;
};

const Model& modelOf(const std::string& item) {
    static std::map<std::string, Model> known;
    return known.try_emplace(item, item).first->second;
}

/// Whether all that is there of an item, attributes and modes left aside, is as in the whole one.
bool isPartOf(const std::string& path, const std::string& whole) {
    const fs::file_type type = fs::symlink_status(path).type();
    if (type != fs::symlink_status(whole).type())
        return false;
    if (type == fs::file_type::symlink)
        return fs::read_symlink(path) == fs::read_symlink(whole);
    if (type != fs::file_type::directory)
        return bytesOf(whole).starts_with(bytesOf(path));
    return std::all_of(fs::directory_iterator(path), fs::directory_iterator(),
                       [&whole](const fs::directory_entry& entry) {
                           return isPartOf(entry.path(), fs::path(whole) / entry.path().filename());
                       });
}

/// A store file that was cut short is no property list.
std::string nameOfStoreFile(const std::string& path) {
    const auto list = PropertyListCodec::host().parse(Data::copyOf(bytesOf(path)), std::nullopt);
    const Dictionary* store = list ? list->as<Dictionary>() : nullptr;
    const String* title = store ? PVDynamicCast(classOf<String>, store->find("itemName")) : nullptr;
    return title ? std::string(kStorePrefix) + *title : "broken store";
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
        const std::string top = place.substr(0, place.find('/', place.find('/') + 1));
        giveToChildren(path(top));
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
    if (isEmptyItem(path))
        return "placeholder";
    if (path.ends_with(".plist"))
        return nameOfStoreFile(path);
    const std::string found = fingerprint(path, Modes::Told);
    const std::string foundButForModes = fingerprint(path, Modes::Untold);
    for (const auto& [place, item] : known) {
        if (modelOf(item).whole == found)
            return item;
    }
    std::string alike;  // the plainest of those that differ from each other in modes alone
    for (const auto& [place, item] : known) {
        const bool isPlainer = alike.empty() || item.size() < alike.size();
        if (isPlainer && modelOf(item).butForModes == foundButForModes)
            alike = item;
    }
    if (!alike.empty())
        return alike + " but for modes";
    for (const auto& [place, item] : known) {
        if (isPartOf(path, modelOf(item).path))
            return "part of " + item;
    }
    return found;
}

void TestLibrary::addEntriesOf(const std::string& folder, const Layout& known,
                               Layout& result) const {
    for (const auto& entry : fs::directory_iterator(path(folder))) {
        const std::string name = entry.path().filename().string();
        if (name == ".stfolder" || name.starts_with(".parvel-stage-"))
            continue;
        const std::string place = folder + "/" + name;
        const auto member = known.lower_bound(place + "/");
        const bool isToldByMembers =
            member != known.end() && member->first.starts_with(place + "/");
        if (isToldByMembers && fs::is_directory(entry.symlink_status()))
            addEntriesOf(place, known, result);
        else
            result[place] = nameOf(entry.path().string(), known);
    }
}

Layout TestLibrary::layout(const Layout& known) const {
    Layout result;
    for (const std::string& folder : kFolders)
        addEntriesOf(folder, known, result);
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
    for (const std::string& left : litter()) {
        const std::string parent = fs::path(left).parent_path();
        if (!contains(parent, "/.parvel-"))
            paths.push_back(parent);
    }
    return paths;
}

void TestLibrary::setEnvironment(bool hasTrashOnOtherFileSystem) const {
    ::setenv("XDG_DATA_HOME", path(hasTrashOnOtherFileSystem ? "other trash" : "trash").c_str(), 1);
    ::setenv("XDG_RUNTIME_DIR", (m_here / "locks").c_str(), 1);
}

std::string contentOf(const std::string& item) {
    return std::string(9000, item[item.find_first_of("0123456789")]);
}

bool hasTwoFileSystems() {
    const TemporaryDirectory folder;
    struct stat here {};
    struct stat there {};
    return ::stat(folder.path().c_str(), &here) == 0 && ::stat(kOtherFileSystem, &there) == 0 &&
           here.st_dev != there.st_dev && ::access(kOtherFileSystem, W_OK) == 0;
}

}  // namespace parvel::testing
