#include "parvel/platform/linux/RehearsedDisk.h"

#include <sys/stat.h>

#include <cerrno>

#include "parvel/foundation/URL.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/TrashFolders.h"

namespace parvel::host {

namespace {

/// The path with its folder's links resolved, as far as the folder is there. The empty path names
/// nothing, and stays as it is.
std::string keyOf(const std::string& path) {
    if (path.empty())
        return path;
    const std::string folder = parentFolderOf(path);
    if (const auto canonical = canonicalPath(folder))
        return pathAppending(*canonical, lastComponentOfPath(path));
    if (folder == path)
        return path;
    return pathAppending(keyOf(folder), lastComponentOfPath(path));
}

/// Two names of one file: a replacement of one by the other only takes a name away.
bool isSameFile(const std::string& path, const std::string& other) {
    struct stat status {};
    struct stat otherStatus {};
    return ::lstat(path.c_str(), &status) == 0 && ::lstat(other.c_str(), &otherStatus) == 0 &&
           isSameItem(status, otherStatus);
}

/// Takes out what lies below the key and gives it by the rest of its path.
template <class Map>
std::vector<std::pair<std::string, typename Map::mapped_type>> takeBelow(Map& map,
                                                                         const std::string& key) {
    std::vector<std::pair<std::string, typename Map::mapped_type>> taken;
    for (auto it = map.lower_bound(key + "/"); it != map.end() && isBelow(it->first, key);) {
        taken.emplace_back(it->first.substr(key.size()), std::move(it->second));
        it = map.erase(it);
    }
    return taken;
}

}  // namespace

// What stands where

RehearsedDisk::Entry RehearsedDisk::entryAt(const std::string& key) const {
    for (std::string_view above = key;; above = pathWithoutLastComponent(above)) {
        const auto found = m_entries.find(above);
        if (found != m_entries.end()) {
            if (found->second.kind == Kind::Real)
                return {Kind::Real, found->second.real + key.substr(above.size())};
            return above == key ? found->second : Entry{Kind::Gone, {}};
        }
        if (above == "/" || above.empty())
            return {Kind::Real, key};
    }
}

/// 0 where something stands, else the errno value of looking at it.
int RehearsedDisk::lookUp(const std::string& key) const {
    const Entry entry = entryAt(key);
    if (entry.kind != Kind::Real)
        return entry.kind == Kind::Gone ? ENOENT : 0;
    struct stat status {};
    return ::lstat(entry.real.c_str(), &status) == 0 ? 0 : errno;
}

bool RehearsedDisk::isFolder(const std::string& key) const {
    const Entry entry = entryAt(key);
    struct stat status {};
    return entry.kind == Kind::MadeFolder ||
           (entry.kind == Kind::Real && ::lstat(entry.real.c_str(), &status) == 0 &&
            S_ISDIR(status.st_mode));
}

// What becomes of it

void RehearsedDisk::set(const std::string& key, Entry entry) {
    takeBelow(m_entries, key);
    takeBelow(m_attributes, key);
    m_attributes.erase(key);
    m_entries.insert_or_assign(key, std::move(entry));
}

void RehearsedDisk::relocate(const std::string& source, const std::string& destination) {
    Entry entry = entryAt(source);
    auto below = takeBelow(m_entries, source);
    auto attributesBelow = takeBelow(m_attributes, source);
    auto attributes = m_attributes.extract(source);
    set(source, {Kind::Gone, {}});
    set(destination, std::move(entry));
    for (auto& [rest, each] : below)
        m_entries.insert_or_assign(destination + rest, std::move(each));
    for (auto& [rest, each] : attributesBelow)
        m_attributes.insert_or_assign(destination + rest, std::move(each));
    if (attributes)
        m_attributes.insert_or_assign(destination, std::move(attributes.mapped()));
}

int RehearsedDisk::moveByKey(const std::string& source, const std::string& destination) {
    const int error = moveError(source, destination);
    if (error == 0)
        relocate(source, destination);
    return error;
}

int RehearsedDisk::makeFolders(const std::string& path) {
    const std::string key = keyOf(path);
    if (const int error = lookUp(key); error != ENOENT)
        return error;
    if (const int error = makeFolders(parentFolderOf(key)))
        return error;
    if (const int error = folderError(parentFolderOf(key)))
        return error;
    if (const int error = changeError(key))
        return error;
    set(key, {Kind::MadeFolder, {}});
    return 0;
}

// The acts

bool RehearsedDisk::itemStandsAt(const std::string& path) {
    const std::lock_guard lock(m_mutex);
    return lookUp(keyOf(path)) == 0;
}

int RehearsedDisk::move(const std::string& source, const std::string& destination) {
    const std::lock_guard lock(m_mutex);
    const std::string from = keyOf(source);
    const std::string to = keyOf(destination);
    const auto info = infoFileOfTrashed(from);
    if (!info || lookUp(*info) != 0)
        return moveByKey(from, to);
    const bool staysInTrash = parentFolderOf(from) == parentFolderOf(to);
    const auto newInfo = infoFileOfTrashed(to);
    if (staysInTrash && newInfo && lookUp(*newInfo) == 0)
        return EEXIST;
    const int error = moveByKey(from, to);
    if (error == 0 && staysInTrash && newInfo)
        relocate(*info, *newInfo);
    else if (error == 0)
        set(*info, {Kind::Gone, {}});
    return error;
}

int RehearsedDisk::replace(const std::string& existing, const std::string& replacement,
                           ReplaceOptions /*options*/) {
    const std::lock_guard lock(m_mutex);
    const std::string place = keyOf(existing);
    const std::string item = keyOf(replacement);
    if (const int error = lookUp(item))
        return error;
    const int existingError = lookUp(place);
    if (existingError == ENOENT)
        return moveByKey(item, place);
    if (existingError != 0 || place == item)
        return existingError;
    if (isSameFile(entryAt(place).real, entryAt(item).real)) {
        const int error = removalError(item);
        if (error == 0)
            set(item, {Kind::Gone, {}});
        return error;
    }
    const int error = replaceError(place, item);
    if (error == 0)
        relocate(item, place);
    return error;
}

int RehearsedDisk::copy(const std::string& source, const std::string& destination) {
    const std::lock_guard lock(m_mutex);
    const std::string from = keyOf(source);
    const std::string to = keyOf(destination);
    if (const int error = copyError(from, to))
        return error;
    set(to, entryAt(from));
    if (const auto attributes = m_attributes.find(from); attributes != m_attributes.end())
        m_attributes.insert_or_assign(to, attributes->second);
    return 0;
}

int RehearsedDisk::remove(const std::string& path) {
    const std::lock_guard lock(m_mutex);
    const std::string key = keyOf(path);
    int error = lookUp(key);
    if (error == 0)
        error = removalError(key);
    if (error == 0)
        set(key, {Kind::Gone, {}});
    return error;
}

int RehearsedDisk::trash(const std::string& item, std::string& resulting) {
    const std::lock_guard lock(m_mutex);
    const std::string key = keyOf(item);
    if (const int error = lookUp(key))
        return error;
    const auto plan = planTrash(entryAt(key).real);
    if (!plan)
        return errno;
    int error = 0;
    for (const TrashFolder& trash : plan->folders) {
        error = makeTrash(trash);
        if (error == 0)
            error = moveIntoTrash(trash, item, resulting);
        if (error == 0)
            return 0;
    }
    return error;
}

int RehearsedDisk::makeTrash(const TrashFolder& trash) {
    const bool isVolumes = !trash.topDirectory.empty();
    if (isVolumes && lookUp(keyOf(trash.path)) == 0 && !isOwnRealFolder(trash.path))
        return EPERM;
    if (const int error = makeFolders(trash.filesFolder()))
        return error;
    return makeFolders(trash.infoFolder());
}

int RehearsedDisk::moveIntoTrash(const TrashFolder& trash, const std::string& item,
                                 std::string& resulting) {
    for (int attempt = 1; attempt <= kMaximumTrashNames; ++attempt) {
        const std::string name = trashName(lastComponentOfPath(item), attempt);
        const std::string info = keyOf(infoFileFor(trash.path, name));
        if (lookUp(info) == 0)
            continue;
        resulting = pathAppending(trash.filesFolder(), name);
        int error = changeError(info);
        if (error == 0)
            error = moveByKey(keyOf(item), keyOf(resulting));
        if (error == 0)
            set(info, {Kind::MadeFile, {}});
        if (error != EEXIST)
            return error;
    }
    return EEXIST;
}

// What is made new

std::optional<RehearsedDisk::Made> RehearsedDisk::madeAt(const std::string& path) const {
    const std::lock_guard lock(m_mutex);
    const Kind kind = entryAt(keyOf(path)).kind;
    if (kind == Kind::MadeFile)
        return Made::File;
    return kind == Kind::MadeFolder ? std::optional(Made::Folder) : std::nullopt;
}

int RehearsedDisk::makeFile(const std::string& path) {
    const std::lock_guard lock(m_mutex);
    const std::string key = keyOf(path);
    if (isFolder(key))
        return EISDIR;
    if (const int error = folderError(parentFolderOf(key)))
        return error;
    if (const int error = changeError(key))
        return error;
    set(key, {Kind::MadeFile, {}});
    return 0;
}

int RehearsedDisk::makeFolder(const std::string& path) {
    const std::lock_guard lock(m_mutex);
    const std::string key = keyOf(path);
    const int error = makingErrorByKey(key);
    if (error == 0)
        set(key, {Kind::MadeFolder, {}});
    return error;
}

int RehearsedDisk::makeFrom(const std::string& real, const std::string& path) {
    const std::lock_guard lock(m_mutex);
    const std::string key = keyOf(path);
    const int error = makingErrorByKey(key);
    if (error == 0)
        set(key, {Kind::Real, real});
    return error;
}

int RehearsedDisk::makingError(const std::string& path) const {
    const std::lock_guard lock(m_mutex);
    return makingErrorByKey(keyOf(path));
}

// Attributes

std::optional<std::string> RehearsedDisk::realPath(const std::string& path) const {
    const std::lock_guard lock(m_mutex);
    const Entry entry = entryAt(keyOf(path));
    return entry.kind == Kind::Real ? std::optional(entry.real) : std::nullopt;
}

/// Attributes are those of the item behind a link.
std::string RehearsedDisk::attributeKey(const std::string& path) const {
    std::string key = keyOf(path);
    const Entry entry = entryAt(key);
    struct stat status {};
    if (entry.kind == Kind::Real && ::lstat(entry.real.c_str(), &status) == 0 &&
        S_ISLNK(status.st_mode))
        return canonicalPath(entry.real).value_or(key);
    return key;
}

RehearsedDisk::Attributes RehearsedDisk::attributesAt(const std::string& path) const {
    const std::lock_guard lock(m_mutex);
    const auto found = m_attributes.find(attributeKey(path));
    return found == m_attributes.end() ? Attributes() : found->second;
}

void RehearsedDisk::setAttribute(const std::string& path, const std::string& name,
                                 std::optional<std::vector<std::byte>> value) {
    const std::lock_guard lock(m_mutex);
    m_attributes[attributeKey(path)].insert_or_assign(name, std::move(value));
}

}  // namespace parvel::host
