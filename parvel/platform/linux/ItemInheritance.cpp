#include "parvel/platform/linux/ItemInheritance.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>

#include "parvel/platform/linux/DirectoryStream.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ItemContent.h"
#include "parvel/platform/linux/OpenFolder.h"

namespace parvel::host {

namespace {

constexpr int kDeepestMembers = 200;  // two descriptors a level

/// Two items of one place, open: the one that goes and the one that comes.
class Succession {
public:
    Succession(const std::string& oldItem, const std::string& newItem)
        : m_old(openItem(AT_FDCWD, oldItem.c_str())), m_new(openItem(AT_FDCWD, newItem.c_str())) {
        m_error = m_old && m_new ? 0 : errno;
        if (m_error == 0 &&
            (::fstat(m_old.get(), &m_oldStatus) != 0 || ::fstat(m_new.get(), &m_newStatus) != 0))
            m_error = errno;
    }

    /// Why they can't be looked at; 0 where they can. ELOOP for a link.
    [[nodiscard]] int error() const { return m_error; }
    [[nodiscard]] int from() const { return m_old.get(); }
    [[nodiscard]] int to() const { return m_new.get(); }
    [[nodiscard]] const struct stat& oldStatus() const { return m_oldStatus; }

    [[nodiscard]] bool areOfOneKind() const {
        return isFolder(m_oldStatus) == isFolder(m_newStatus);
    }
    [[nodiscard]] bool haveOneMode() const { return m_oldStatus.st_mode == m_newStatus.st_mode; }
    [[nodiscard]] bool isToAFolder() const { return isFolder(m_newStatus); }
    /// Whether the new item belongs to others than the old one, and this process could mend it.
    [[nodiscard]] bool changesHands() const {
        return m_oldStatus.st_gid != m_newStatus.st_gid ||
               (m_oldStatus.st_uid != m_newStatus.st_uid && ::geteuid() == 0);
    }

private:
    static bool isFolder(const struct stat& item) { return S_ISDIR(item.st_mode); }

    FileDescriptor m_old;
    FileDescriptor m_new;
    struct stat m_oldStatus {};
    struct stat m_newStatus {};
    int m_error = 0;
};

/// Gives all that is in a folder, links too, to an owner and group.
int giveMembers(int folder, const struct stat& owner, int depth) {
    if (depth >= kDeepestMembers)
        return ELOOP;
    DirectoryStream members(openFolder(folder, ".", O_RDONLY));
    if (!members.isOpen())
        return errno;
    while (const dirent* entry = members.next()) {
        const FileDescriptor member(
            ::openat(members.descriptor(), entry->d_name, O_PATH | O_NOFOLLOW | O_CLOEXEC));
        struct stat status {};
        if (!member || ::fstat(member.get(), &status) != 0)
            return errno;
        if (const int error = copyOwner(owner, member.get()))
            return error;
        const int error = S_ISDIR(status.st_mode) ? giveMembers(member.get(), owner, depth + 1) : 0;
        if (error != 0)
            return error;
    }
    return errno;
}

}  // namespace

bool hasToInherit(const std::string& oldItem, const std::string& newItem) {
    const Succession items(oldItem, newItem);
    if (items.error() != 0 || items.changesHands() || !hasAttributesOf(items.from(), items.to()))
        return true;
    return items.areOfOneKind() &&
           (!items.haveOneMode() || !haveSameAccessList(items.from(), items.to()));
}

int inheritMetadata(const std::string& oldItem, const std::string& newItem) {
    const Succession items(oldItem, newItem);
    if (items.error() != 0)
        return items.error() == ELOOP ? 0 : items.error();  // a link has none of its own
    if (const int error = copyAttributes(items.from(), items.to(), /*onlyMissing=*/true))
        return error;
    // A file's mode on a folder would close it, a folder's on a file would open it to be run.
    const int error = items.areOfOneKind() ? copyAccess(items.from(), items.oldStatus(), items.to())
                                           : copyOwner(items.oldStatus(), items.to());
    const bool hasMembersToGive = items.isToAFolder() && items.changesHands();
    return error == 0 && hasMembersToGive ? giveMembers(items.to(), items.oldStatus(), 0) : error;
}

}  // namespace parvel::host
