#include "parvel/platform/linux/FoldersBelow.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>

#include "parvel/platform/linux/OpenBeneath.h"

namespace parvel::host {

namespace {

constexpr std::size_t kMostFoldersKept = 8;

}  // namespace

int FoldersBelow::open(std::string_view path) {
    if (path.empty())
        return m_root.get();
    if (const int known = find(path); known >= 0)
        return known;
    const std::size_t slash = path.rfind('/');
    const bool isAtTop = slash == std::string_view::npos;
    const int above = isAtTop ? m_root.get() : find(path.substr(0, slash));
    if (above >= 0)
        return make(above, path, isAtTop ? 0 : slash + 1);
    FileDescriptor folder =
        openBeneath(m_root.get(), std::string(path).c_str(), O_PATH | O_DIRECTORY);
    if (!folder && errno == ENOENT)
        return makeAll(path);
    return keep(path, std::move(folder));
}

int FoldersBelow::find(std::string_view path) const {
    for (const Folder& folder : m_kept) {
        if (folder.path == path)
            return folder.descriptor.get();
    }
    return -1;
}

/// One component after the other.
int FoldersBelow::makeAll(std::string_view path) {
    int above = m_root.get();
    for (std::size_t start = 0; start < path.size() && above >= 0;) {
        const std::size_t end = std::min(path.find('/', start), path.size());
        const std::string_view part = path.substr(0, end);
        const int known = find(part);
        above = known >= 0 ? known : make(above, part, start);
        start = end + 1;
    }
    return above;
}

/// The folder of the path, whose name begins there, in the one above.
int FoldersBelow::make(int above, std::string_view path, std::size_t nameStart) {
    const std::string name(path.substr(nameStart));
    const bool isMade = ::mkdirat(above, name.c_str(), 0700) == 0;
    if (!isMade && errno != EEXIST)
        return -1;
    FileDescriptor folder = openBeneath(above, name.c_str(), O_PATH | O_DIRECTORY);
    if (const int error = folder && isMade ? m_owner.give(folder.get()) : 0) {
        errno = error;
        return -1;
    }
    return keep(path, std::move(folder));
}

/// Keeps an open folder in the place of that which has been open longest.
int FoldersBelow::keep(std::string_view path, FileDescriptor folder) {
    if (!folder)
        return -1;
    if (m_kept.size() == kMostFoldersKept)
        m_kept.pop_front();
    m_kept.push_back({std::string(path), std::move(folder)});
    return m_kept.back().descriptor.get();
}

}  // namespace parvel::host
