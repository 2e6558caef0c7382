#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// What a replacement keeps of the item that it replaces.
enum class ReplaceOptions {
    /// Its owner, group, access list and mode, and those of its attributes that the new item lacks.
    Default = 0,
    NewMetadataOnly = 1,  ///< nothing: the new item's metadata alone
};

/// The host's file operations on whole items, files and folders alike. A symbolic link is an item
/// of its own. A caller of the file manager can give it another. What is not all on this device is
/// downloaded before it is copied, trashed or taken out of its synchronised folder; ETIMEDOUT, with
/// the item's URL and nothing touched, where it is not here within a minute. All errors are those
/// of makeServiceError. After a failure each item is whole at its old place or whole at its new
/// one, and nothing half-made has a final name.
class PV_EXPORT FileSystemService {
public:
    virtual ~FileSystemService() = default;

    /// Whether anything stands at the path, a dangling link included, or a sync client's
    /// placeholder for an item of that name.
    [[nodiscard]] virtual bool itemExistsAtPath(const std::string& path) = 0;
    /// Renames, or copies across file systems (synced before the source goes). Fails where anything
    /// stands at the destination, also against a competitor in the same instant. Within one trash
    /// folder the item's info file follows; it goes when the item leaves the trash. Within one
    /// synchronised folder what stands for an item is renamed with no download, where its client
    /// takes that for a rename of the item.
    virtual bool moveItem(const URL& source, const URL& destination, ErrorOut error = nullptr) = 0;
    /// Puts the replacement at the existing item's place in one atomic step and removes the old
    /// item; moves it there when nothing stands there. The resulting URL is the existing item's.
    /// EINVAL for a link that leads to the existing item or into it, and would lead nowhere then.
    /// An existing item that is not on this device is downloaded before.
    virtual bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                             std::optional<URL>* resulting = nullptr, ErrorOut error = nullptr) = 0;
    /// Copies data, attributes, owner and group as far as they may be given, access list, mode and
    /// times; the copy appears whole or not at all. Fails where anything stands at the destination.
    virtual bool copyItem(const URL& source, const URL& destination, ErrorOut error = nullptr) = 0;
    /// Removes a file, a link or a whole folder; links are not followed. What stands for an item
    /// that is not on this device goes without a download. After a failure the item stands as it
    /// was; where a part of a folder was gone already, its name is free.
    virtual bool removeItem(const URL& item, ErrorOut error = nullptr) = 0;
    /// Moves the item to the user's trash (freedesktop.org Trash specification 1.0): the home
    /// trash, or its volume's own. `resulting` is its place there.
    virtual bool trashItem(const URL& item, std::optional<URL>* resulting,
                           ErrorOut error = nullptr) = 0;
    /// Moves a local item into synchronised storage (true), where the destination must lie, or a
    /// synchronised one out of it (false). ENOTSUP where the destination lies in no such storage.
    virtual bool setUbiquitous(bool ubiquitous, const URL& item, const URL& destination,
                               ErrorOut error = nullptr) = 0;

    /// A new default service.
    static std::shared_ptr<FileSystemService> makeDefault();
};

/// Passes every operation on to another service; derive from it to change some of them.
class PV_EXPORT ForwardingFileSystemService : public FileSystemService {
public:
    explicit ForwardingFileSystemService(std::shared_ptr<FileSystemService> target)
        : m_target(std::move(target)) {}

    bool itemExistsAtPath(const std::string& path) override {
        return m_target->itemExistsAtPath(path);
    }
    bool moveItem(const URL& source, const URL& destination, ErrorOut error) override {
        return m_target->moveItem(source, destination, error);
    }
    bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                     std::optional<URL>* resulting, ErrorOut error) override {
        return m_target->replaceItem(existing, replacement, options, resulting, error);
    }
    bool copyItem(const URL& source, const URL& destination, ErrorOut error) override {
        return m_target->copyItem(source, destination, error);
    }
    bool removeItem(const URL& item, ErrorOut error) override {
        return m_target->removeItem(item, error);
    }
    bool trashItem(const URL& item, std::optional<URL>* resulting, ErrorOut error) override {
        return m_target->trashItem(item, resulting, error);
    }
    bool setUbiquitous(bool ubiquitous, const URL& item, const URL& destination,
                       ErrorOut error) override {
        return m_target->setUbiquitous(ubiquitous, item, destination, error);
    }

private:
    std::shared_ptr<FileSystemService> m_target;
};

}  // namespace parvel
