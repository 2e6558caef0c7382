#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <memory>

#include "parvel/platform/DirectoryEnumerator.h"
#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel {

namespace {

using host::FileDescriptor;

constexpr int kMaximumEnumeratedDepth = 400;

class EnumeratedEntry : public DirectoryEnumerator::Entry {
public:
    EnumeratedEntry(int folder, const char* name) : m_folder(folder), m_name(name) {
        m_isKnown = ::fstatat(folder, name, &m_status, AT_SYMLINK_NOFOLLOW) == 0;
    }

    std::optional<bool> isDirectory() const override {
        return m_isKnown ? std::optional(S_ISDIR(m_status.st_mode)) : std::nullopt;
    }
    std::optional<std::uint64_t> totalAllocatedSize() const override {
        if (!m_isKnown)
            return std::nullopt;
        return static_cast<std::uint64_t>(m_status.st_blocks) * 512;
    }
    bool setPermissions(unsigned mode) const override {
        return ::fchmodat(m_folder, m_name, mode, AT_SYMLINK_NOFOLLOW) == 0;
    }

private:
    int m_folder;
    const char* m_name;
    struct stat m_status {};
    bool m_isKnown;
};

void enumerateFolder(FileDescriptor folder, int depth,
                     const std::function<void(const DirectoryEnumerator::Entry&)>& visit) {
    DIR* opened = folder ? ::fdopendir(folder.get()) : nullptr;
    if (!opened)
        return;
    (void)folder.release();
    const std::unique_ptr<DIR, int (*)(DIR*)> listing(opened, &::closedir);
    const int descriptor = ::dirfd(opened);
    while (const dirent* found = ::readdir(opened)) {
        if (found->d_name[0] == '.')
            continue;
        const EnumeratedEntry entry(descriptor, found->d_name);
        visit(entry);
        if (entry.isDirectory() == true && depth < kMaximumEnumeratedDepth)
            enumerateFolder(
                FileDescriptor(::openat(descriptor, found->d_name,
                                        O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC)),
                depth + 1, visit);
    }
}

class LinuxDirectoryEnumerator : public DirectoryEnumerator {
public:
    void enumerate(const URL& directory, const std::function<void(const Entry&)>& visit) override {
        if (!directory.isFileURL())
            return;
        enumerateFolder(
            FileDescriptor(::open(directory.path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC)), 0,
            visit);
    }
};

}  // namespace

DirectoryEnumerator& DirectoryEnumerator::host() {
    static LinuxDirectoryEnumerator enumerator;
    return enumerator;
}

}  // namespace parvel
