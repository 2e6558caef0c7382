#include "parvel/platform/DirectoryEnumerator.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <utility>

#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/OpenFolder.h"

namespace parvel {

namespace {

constexpr int kMaximumEnumeratedDepth = 400;

class EnumeratedEntry : public DirectoryEnumerator::Entry {
public:
    EnumeratedEntry(int folder, const dirent& listed) : m_folder(folder), m_listed(listed) {
        m_isKnown = ::fstatat(folder, listed.d_name, &m_status, AT_SYMLINK_NOFOLLOW) == 0;
    }

    /// Most file systems list the kind with the name. So a folder whose status can't be had is not
    /// given the mode of a file, by which nobody could enter it.
    std::optional<bool> isDirectory() const override {
        if (m_isKnown)
            return S_ISDIR(m_status.st_mode);
        return m_listed.d_type == DT_UNKNOWN ? std::nullopt
                                             : std::optional(m_listed.d_type == DT_DIR);
    }
    std::optional<std::uint64_t> totalAllocatedSize() const override {
        if (!m_isKnown)
            return std::nullopt;
        return static_cast<std::uint64_t>(m_status.st_blocks) * 512;
    }
    bool setPermissions(unsigned mode) const override {
        return ::fchmodat(m_folder, m_listed.d_name, mode, AT_SYMLINK_NOFOLLOW) == 0;
    }

private:
    int m_folder;
    const dirent& m_listed;
    struct stat m_status {};
    bool m_isKnown;
};

void enumerateFolder(host::FileDescriptor folder, int depth,
                     const std::function<void(const DirectoryEnumerator::Entry&)>& visit) {
    host::DirectoryStream entries(std::move(folder));
    while (const dirent* listed = entries.isOpen() ? entries.next() : nullptr) {
        if (listed->d_name[0] == '.')
            continue;
        const EnumeratedEntry entry(entries.descriptor(), *listed);
        visit(entry);
        if (entry.isDirectory() == true && depth < kMaximumEnumeratedDepth)
            enumerateFolder(
                host::openFolder(entries.descriptor(), listed->d_name, O_RDONLY | O_NOFOLLOW),
                depth + 1, visit);
    }
}

class LinuxDirectoryEnumerator : public DirectoryEnumerator {
public:
    void enumerate(const URL& directory, const std::function<void(const Entry&)>& visit) override {
        if (!directory.isFileURL())
            return;
        enumerateFolder(host::openFolder(AT_FDCWD, directory.path().c_str(), O_RDONLY), 0, visit);
    }
};

}  // namespace

DirectoryEnumerator& DirectoryEnumerator::host() {
    static LinuxDirectoryEnumerator enumerator;
    return enumerator;
}

}  // namespace parvel
