#include "parvel/platform/FileSystemService.h"

#include <cerrno>

#include "parvel/platform/CloudStore.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/linux/ItemMoves.h"
#include "parvel/platform/linux/ItemOperations.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/Trash.h"

namespace parvel {

namespace {

/// The acts on the disk itself.
class HostItems : public host::ItemOperations {
public:
    bool itemStandsAt(const std::string& path) override { return host::itemStandsAt(path); }
    int move(const std::string& source, const std::string& destination) override {
        return host::isTrashed(source) ? host::moveTrashed(source, destination)
                                       : host::moveExclusively(source, destination);
    }
    int replace(const std::string& existing, const std::string& replacement,
                ReplaceOptions options) override {
        return host::replace(existing, replacement, options);
    }
    int copy(const std::string& source, const std::string& destination) override {
        return host::copyExclusively(source, destination);
    }
    int remove(const std::string& path) override { return host::discardItem(path); }
    int trash(const std::string& item, std::string& resulting) override {
        return host::trashItem(item, resulting);
    }
};

CloudStore& cloud() {
    return Service<CloudStore>::current();
}

/// Moving what only stands for a book out of its root does not move the book, so that it has to be
/// here before; within the root that depends on the client.
bool fetchBeforeMove(const URL& item, const URL& destination, ErrorOut error) {
    const bool staysInRoot =
        host::parentFolderOf(item.path()) == host::parentFolderOf(destination.path()) ||
        cloud().lieBelowOneRoot(item, destination);
    return (staysInRoot && cloud().renamesWhole(item)) || cloud().fetchContent(item, error);
}

class LinuxFileSystemService : public FileSystemService {
public:
    explicit LinuxFileSystemService(std::shared_ptr<host::ItemOperations> items)
        : m_items(std::move(items)) {}

    bool itemExistsAtPath(const std::string& path) override {
        return m_items->itemStandsAt(path) ||
               cloud().placeholderFile(URL::fileURLWithPath(path)).has_value();
    }

    bool moveItem(const URL& source, const URL& destination, ErrorOut error) override {
        if (!fetchBeforeMove(source, destination, error))
            return false;
        const int failure =
            cloud().placeholderFile(destination) ? EEXIST : moveOrPlaceholder(source, destination);
        return failure == 0 || fail(error, makeTransferError(failure, source, destination));
    }

    bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                     std::optional<URL>* resulting, ErrorOut error) override {
        if (!fetchBeforeMove(replacement, existing, error) ||
            (itemExistsAtPath(existing.path()) && !cloud().fetchContent(existing, error)))
            return false;
        const int failure = m_items->replace(existing.path(), replacement.path(), options);
        if (failure != 0)
            return fail(error, makeTransferError(failure, replacement, existing));
        if (resulting)
            *resulting = existing;
        return true;
    }

    bool copyItem(const URL& source, const URL& destination, ErrorOut error) override {
        if (!cloud().fetchContent(source, error))
            return false;
        const int failure = m_items->copy(source.path(), destination.path());
        return failure == 0 || fail(error, makeTransferError(failure, source, destination));
    }

    bool removeItem(const URL& item, ErrorOut error) override {
        int failure = m_items->remove(item.path());
        // What stands for an item that is not on this device goes without a download.
        if (failure == ENOENT) {
            const auto placeholder = cloud().placeholderFile(item);
            if (placeholder && cloud().lieBelowOneRoot(item, *placeholder))
                failure = m_items->remove(placeholder->path());
        }
        return failure == 0 || fail(error, makeServiceError(failure, item));
    }

    bool trashItem(const URL& item, std::optional<URL>* resulting, ErrorOut error) override {
        if (!cloud().fetchContent(item, error))
            return false;
        std::string place;
        const int failure = m_items->trash(item.path(), place);
        if (failure != 0)
            return fail(error, makeServiceError(failure, item));
        if (resulting)
            *resulting = URL::fileURLWithPath(place);
        return true;
    }

    bool setUbiquitous(bool ubiquitous, const URL& item, const URL& destination,
                       ErrorOut error) override {
        if (ubiquitous && !cloud().isUbiquitous(destination).value_or(false))
            return fail(error, makePOSIXError(ENOTSUP, destination));
        if (!ubiquitous && !cloud().fetchContent(item, error))
            return false;
        return moveItem(item, destination, error);
    }

private:
    /// A placeholder that stays below its root is renamed in the item's place, which makes the
    /// client rename the book.
    [[nodiscard]] int moveOrPlaceholder(const URL& source, const URL& destination) {
        const int failure = m_items->move(source.path(), destination.path());
        const auto placeholder = failure == ENOENT ? cloud().placeholderFile(source) : std::nullopt;
        if (!placeholder || !cloud().lieBelowOneRoot(source, destination))
            return failure;
        if (m_items->itemStandsAt(destination.path()))
            return EEXIST;
        return m_items->move(placeholder->path(),
                             destination.path() + placeholder->path().substr(source.path().size()));
    }

    /// Which of the two items a failed move or copy is about: the source where that is missing, the
    /// destination where the new item can't be made.
    [[nodiscard]] Error makeTransferError(int errnoValue, const URL& source,
                                          const URL& destination) const {
        return makeServiceError(errnoValue,
                                m_items->itemStandsAt(source.path()) ? destination : source);
    }

    std::shared_ptr<host::ItemOperations> m_items;
};

}  // namespace

std::shared_ptr<FileSystemService> FileSystemService::makeDefault() {
    return host::makeFileSystemService(std::make_shared<HostItems>());
}

std::shared_ptr<FileSystemService> host::makeFileSystemService(
    std::shared_ptr<ItemOperations> operations) {
    return std::make_shared<LinuxFileSystemService>(std::move(operations));
}

}  // namespace parvel
