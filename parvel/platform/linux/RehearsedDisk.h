#pragma once

#include <cstddef>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "parvel/platform/linux/ItemOperations.h"
#include "parvel/platform/linux/TrashFolders.h"

namespace parvel::host {

/// The disk as it would be after operations that were only rehearsed: the real one under a layer of
/// names that have gone or come. Every act gives the errno value that the real one would give, as
/// far as looking tells, and touches nothing. Callable from any thread.
class RehearsedDisk : public ItemOperations {
public:
    /// Attributes that would differ from the disk, by name; none for one that would be removed.
    using Attributes = std::map<std::string, std::optional<std::vector<std::byte>>, std::less<>>;

    bool itemStandsAt(const std::string& path) override;
    int move(const std::string& source, const std::string& destination) override;
    int replace(const std::string& existing, const std::string& replacement,
                ReplaceOptions options) override;
    int copy(const std::string& source, const std::string& destination) override;
    int remove(const std::string& path) override;
    int trash(const std::string& item, std::string& resulting) override;

    /// What would be made new at the path; none for anything else, and for nothing.
    enum class Made { File, Folder };
    [[nodiscard]] std::optional<Made> madeAt(const std::string& path) const;
    /// Puts a new file in the place of the file or link that stands there, if any.
    [[nodiscard]] int makeFile(const std::string& path);
    /// Makes a folder where nothing stands.
    [[nodiscard]] int makeFolder(const std::string& path);
    /// Makes an item where nothing stands that is read at a real path.
    [[nodiscard]] int makeFrom(const std::string& real, const std::string& path);
    /// Whether an item could be made where nothing stands.
    [[nodiscard]] int makingError(const std::string& path) const;

    /// Where on the real disk that is looked for which would stand at the path; none where it would
    /// be gone, or made new.
    [[nodiscard]] std::optional<std::string> realPath(const std::string& path) const;
    /// Of the item that the path leads to.
    [[nodiscard]] Attributes attributesAt(const std::string& path) const;
    void setAttribute(const std::string& path, const std::string& name,
                      std::optional<std::vector<std::byte>> value);

private:
    enum class Kind { Gone, Real, MadeFile, MadeFolder };
    /// What stands at a name.
    struct Entry {
        Kind kind;
        std::string real;  ///< where a Real one lies on the disk
    };

    // The caller holds the lock. A key is a path with its folder's links resolved.
    [[nodiscard]] Entry entryAt(const std::string& key) const;
    [[nodiscard]] int lookUp(const std::string& key) const;
    [[nodiscard]] bool isFolder(const std::string& key) const;
    [[nodiscard]] int folderError(const std::string& folder) const;
    [[nodiscard]] int changeError(const std::string& key) const;
    [[nodiscard]] int makingErrorByKey(const std::string& key) const;
    [[nodiscard]] int removalError(const std::string& key) const;
    [[nodiscard]] bool isSameMount(const std::string& folder, const std::string& other) const;
    [[nodiscard]] int renameError(const std::string& source, const std::string& destination) const;
    [[nodiscard]] int copyError(const std::string& source, const std::string& destination) const;
    [[nodiscard]] int moveError(const std::string& source, const std::string& destination) const;
    [[nodiscard]] int replaceError(const std::string& existing,
                                   const std::string& replacement) const;
    [[nodiscard]] std::string attributeKey(const std::string& path) const;
    [[nodiscard]] int makeFolders(const std::string& path);
    void set(const std::string& key, Entry entry);
    void relocate(const std::string& source, const std::string& destination);
    [[nodiscard]] int moveByKey(const std::string& source, const std::string& destination);
    [[nodiscard]] int makeTrash(const TrashFolder& trash);
    [[nodiscard]] int moveIntoTrash(const TrashFolder& trash, const std::string& item,
                                    std::string& resulting);

    mutable std::mutex m_mutex;
    std::map<std::string, Entry, std::less<>> m_entries;
    std::map<std::string, Attributes, std::less<>> m_attributes;
};

}  // namespace parvel::host
