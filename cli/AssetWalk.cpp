#include "cli/AssetWalk.h"

#include <algorithm>
#include <cerrno>
#include <functional>
#include <memory>
#include <utility>

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel::cli {
namespace {

enum class Kind { Skipped, Asset, Folder };

PVAssetType typeByName(std::string_view name) {
    return PVAssetMetadata::assetTypeForFileExtension(extensionOfPath(name));
}

bool isPackageName(std::string_view name) {
    const PVAssetType type = typeByName(name);
    return type == PVAssetTypeEPub || type == PVAssetTypeKestrelPub;
}

/// The file type of an entry as dirent.h has it, for file systems that don't give it there.
unsigned char typeOf(int folder, const dirent& entry) {
    struct stat status {};
    if (entry.d_type != DT_UNKNOWN)
        return entry.d_type;
    if (fstatat(folder, entry.d_name, &status, AT_SYMLINK_NOFOLLOW) != 0)
        return DT_UNKNOWN;
    return static_cast<unsigned char>(IFTODT(status.st_mode));
}

bool linksToFolder(int folder, const char* name) {
    struct stat status {};
    return fstatat(folder, name, &status, 0) == 0 && S_ISDIR(status.st_mode);
}

Kind kindOf(int folder, const dirent& entry) {
    const std::string_view name = entry.d_name;
    if (name.starts_with('.'))
        return Kind::Skipped;
    switch (typeOf(folder, entry)) {
        case DT_DIR:
            return isPackageName(name) ? Kind::Asset : Kind::Folder;
        case DT_REG:
            return typeByName(name) != PVAssetTypeUnknown ? Kind::Asset : Kind::Skipped;
        case DT_LNK:
            if (linksToFolder(folder, entry.d_name))
                return isPackageName(name) ? Kind::Asset : Kind::Skipped;
            return typeByName(name) != PVAssetTypeUnknown ? Kind::Asset : Kind::Skipped;
        default:
            return Kind::Skipped;
    }
}

struct CloseFolder {
    void operator()(DIR* folder) const { closedir(folder); }
};

std::string joined(const std::string& folder, std::string_view name) {
    return folder.ends_with('/') ? folder + std::string(name) : folder + "/" + std::string(name);
}

}  // namespace

bool isPlainFolder(const std::string& path) {
    struct stat status {};
    return path.find('\0') == std::string::npos && stat(path.c_str(), &status) == 0 &&
           S_ISDIR(status.st_mode) && !PVAssetMetadata::isBookURL(URL::fileURLWithPath(path));
}

AssetWalk::AssetWalk(std::string root) {
    enter(std::move(root));
}

void AssetWalk::enter(std::string path) {
    const std::unique_ptr<DIR, CloseFolder> folder(opendir(path.c_str()));
    if (!folder) {
        m_unreadable = FoundPath{std::move(path), errno};
        return;
    }
    std::vector<std::string> names;
    errno = 0;
    while (const dirent* entry = readdir(folder.get())) {
        const Kind kind = kindOf(dirfd(folder.get()), *entry);
        if (kind != Kind::Skipped)
            names.push_back(std::string(entry->d_name) + (kind == Kind::Folder ? "/" : ""));
        errno = 0;
    }
    if (errno != 0)
        m_unreadable = FoundPath{path, errno};
    std::sort(names.begin(), names.end(), std::greater<>());
    m_folders.push_back({std::move(path), std::move(names)});
}

std::optional<FoundPath> AssetWalk::next() {
    while (true) {
        if (m_unreadable)
            return std::exchange(m_unreadable, std::nullopt);
        if (m_folders.empty())
            return std::nullopt;
        Folder& folder = m_folders.back();
        if (folder.names.empty()) {
            m_folders.pop_back();
            continue;
        }
        std::string path = joined(folder.path, folder.names.back());
        folder.names.pop_back();
        if (!path.ends_with('/'))
            return FoundPath{std::move(path)};
        path.pop_back();
        enter(std::move(path));
    }
}

}  // namespace parvel::cli
