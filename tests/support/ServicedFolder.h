#pragma once

#include <sys/xattr.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

#include <gtest/gtest.h>

#include "parvel/platform/FileSystemService.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {

/// A folder, and the host's file-system service to act on it.
class ServicedFolder : public ::testing::Test {
protected:
    using Names = std::vector<std::string>;

    static std::optional<Error> generalError(PVFileErrorCode code, const URL& url) {
        return makeFileError(code, url);
    }
    /// All names in a folder, hidden ones included, so that no staging folder goes unseen.
    static Names namesIn(const std::filesystem::path& folder) {
        Names names;
        for (const auto& entry : std::filesystem::directory_iterator(folder))
            names.push_back(entry.path().filename().string());
        std::sort(names.begin(), names.end());
        return names;
    }
    static void setAttribute(const std::string& path, const char* name, std::string_view value) {
        ASSERT_EQ(setxattr(path.c_str(), name, value.data(), value.size(), 0), 0)
            << strerror(errno);
    }
    static std::string attribute(const std::string& path, const char* name) {
        char value[256];
        const ssize_t length = getxattr(path.c_str(), name, value, sizeof value);
        return length < 0 ? "(none)" : std::string(value, static_cast<std::size_t>(length));
    }

    TemporaryDirectory m_folder;
    std::shared_ptr<FileSystemService> m_service = FileSystemService::makeDefault();
    std::optional<Error> m_error;
};

}  // namespace parvel::testing
