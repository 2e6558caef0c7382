#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace parvel::cli {

/// A PATH to work on, or one that could not be read on the way to PATHs: a folder, a file of PATHs.
struct FoundPath {
    std::string path;
    int readErrno = 0;
};

/// Goes through every asset below a folder, in the byte order of names, a folder's own assets and
/// subfolders among each other. A folder with the extension of a book is a package: one asset, not
/// gone into. Hidden entries are left out, and so are files that are no asset by their extension. A
/// link to a file or package counts as what it names; a link to any other folder is not followed,
/// so that no loop is. Holds the names of the folders on the way down alone.
class AssetWalk {
public:
    explicit AssetWalk(std::string root);

    /// The next asset; none when there are no more.
    std::optional<FoundPath> next();

private:
    struct Folder {
        std::string path;
        std::vector<std::string> names;  ///< backwards; a folder to go into ends with a slash
    };

    void enter(std::string path);

    std::vector<Folder> m_folders;
    std::optional<FoundPath> m_unreadable;
};

/// Whether a recursive walk goes into the PATH: a folder that is no package itself.
bool isPlainFolder(const std::string& path);

}  // namespace parvel::cli
