#include <cerrno>

#include "parvel/platform/CloudStore.h"
#include "parvel/platform/FileSystemService.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/linux/ItemMoves.h"
#include "parvel/platform/linux/ItemTree.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/Trash.h"

namespace parvel {

namespace {

/// Which of the two items a failed move or copy is about: the source where that is missing, the
/// destination where the new item can't be made.
Error makeTransferError(int errnoValue, const URL& source, const URL& destination) {
    return makeServiceError(errnoValue, host::itemStandsAt(source.path()) ? destination : source);
}

/// Moving a file that only stands for a book does not move the book.
bool isNotDownloaded(const URL& item) {
    std::optional<DownloadingStatus> status;
    return Service<CloudStore>::current().downloadingStatus(item, status) &&
           status == DownloadingStatus::NotDownloaded;
}

class LinuxFileSystemService : public FileSystemService {
public:
    bool itemExistsAtPath(const std::string& path) override { return host::itemStandsAt(path); }

    bool moveItem(const URL& source, const URL& destination, ErrorOut error) override {
        const std::string& from = source.path();
        const std::string& to = destination.path();
        const int failure = host::isRenameWithinTrash(from, to) ? host::renameWithinTrash(from, to)
                                                                : host::moveExclusively(from, to);
        return failure == 0 || fail(error, makeTransferError(failure, source, destination));
    }

    bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                     std::optional<URL>* resulting, ErrorOut error) override {
        const int failure = host::replace(existing.path(), replacement.path(), options);
        if (failure != 0)
            return fail(error, makeTransferError(failure, replacement, existing));
        if (resulting)
            *resulting = existing;
        return true;
    }

    bool copyItem(const URL& source, const URL& destination, ErrorOut error) override {
        const int failure = host::copyExclusively(source.path(), destination.path());
        return failure == 0 || fail(error, makeTransferError(failure, source, destination));
    }

    bool removeItem(const URL& item, ErrorOut error) override {
        int failure = host::discardItem(item.path());
        // What stands for an item that is not on this device goes without a download.
        if (failure == ENOENT) {
            if (const auto placeholder = Service<CloudStore>::current().placeholderFile(item))
                failure = host::discardItem(placeholder->path());
        }
        return failure == 0 || fail(error, makeServiceError(failure, item));
    }

    bool trashItem(const URL& item, std::optional<URL>* resulting, ErrorOut error) override {
        if (isNotDownloaded(item))
            return fail(error, makePOSIXError(ETIMEDOUT, item));
        std::string place;
        const int failure = host::trashItem(item.path(), place);
        if (failure != 0)
            return fail(error, makeServiceError(failure, item));
        if (resulting)
            *resulting = URL::fileURLWithPath(place);
        return true;
    }

    bool setUbiquitous(bool ubiquitous, const URL& item, const URL& destination,
                       ErrorOut error) override {
        if (ubiquitous && !Service<CloudStore>::current().isUbiquitous(destination).value_or(false))
            return fail(error, makePOSIXError(ENOTSUP, destination));
        if (!ubiquitous && isNotDownloaded(item))
            return fail(error, makePOSIXError(ETIMEDOUT, item));
        return moveItem(item, destination, error);
    }
};

}  // namespace

std::shared_ptr<FileSystemService> FileSystemService::makeDefault() {
    return std::make_shared<LinuxFileSystemService>();
}

}  // namespace parvel
