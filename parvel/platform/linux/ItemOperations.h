#pragma once

#include <memory>
#include <string>

#include "parvel/platform/FileSystemService.h"

namespace parvel::host {

/// The acts on whole items by path that a file-system service is made of: those on the disk, or
/// rehearsed ones. Every act gives 0 or the errno value.
class ItemOperations {
public:
    virtual ~ItemOperations() = default;

    [[nodiscard]] virtual bool itemStandsAt(const std::string& path) = 0;
    [[nodiscard]] virtual int move(const std::string& source, const std::string& destination) = 0;
    [[nodiscard]] virtual int replace(const std::string& existing, const std::string& replacement,
                                      ReplaceOptions options) = 0;
    [[nodiscard]] virtual int copy(const std::string& source, const std::string& destination) = 0;
    [[nodiscard]] virtual int remove(const std::string& path) = 0;
    /// `resulting` is the item's place in the trash.
    [[nodiscard]] virtual int trash(const std::string& item, std::string& resulting) = 0;
};

/// The host's file-system service over these acts.
[[nodiscard]] std::shared_ptr<FileSystemService> makeFileSystemService(
    std::shared_ptr<ItemOperations> operations);

}  // namespace parvel::host
