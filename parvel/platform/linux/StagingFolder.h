#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::host {

/// A hidden folder `.parvel-stage-<random>`, beside a target and so on its file system, in which an
/// item is made before it gets its final name. It is locked while its owner lives and removed, with
/// what is left in it, when the owner goes; what a killed process left unlocked is cleared by the
/// next one that stages in the same place.
class StagingFolder {
public:
    /// Makes one in `parent`, after clearing stale ones there; none, with errno in `error`.
    static std::optional<StagingFolder> makeIn(const std::string& parent, int& error);

    StagingFolder(StagingFolder&&) noexcept = default;
    StagingFolder& operator=(StagingFolder&&) = delete;
    ~StagingFolder();

    [[nodiscard]] const std::string& path() const { return m_path; }
    [[nodiscard]] int descriptor() const { return m_descriptor.get(); }

private:
    StagingFolder(std::string path, FileDescriptor descriptor)
        : m_path(std::move(path)), m_descriptor(std::move(descriptor)) {}

    std::string m_path;
    FileDescriptor m_descriptor;  ///< holds the lock
};

/// The prefix and twelve letters and digits by chance.
[[nodiscard]] std::string randomName(std::string_view prefix);

/// Whether a name, one path component, is that of a staging folder.
[[nodiscard]] bool isStagingName(std::string_view name);

}  // namespace parvel::host
