#pragma once

#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>

#include <gtest/gtest.h>
#include <stdlib.h>

#include "parvel/foundation/URL.h"

namespace parvel::testing {

/// A fresh directory that goes with its owner. Its path has no symbolic link in it.
class TemporaryDirectory {
public:
    TemporaryDirectory() {
        std::string pattern =
            (std::filesystem::canonical(std::filesystem::temp_directory_path()) / "parvel-XXXXXX")
                .string();
        if (!mkdtemp(pattern.data()))
            throw std::runtime_error("no temporary directory");
        m_path = pattern;
    }
    ~TemporaryDirectory() {
        std::error_code ignored;
        std::filesystem::remove_all(m_path, ignored);
    }
    TemporaryDirectory(const TemporaryDirectory&) = delete;
    TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

    [[nodiscard]] const std::filesystem::path& path() const { return m_path; }
    [[nodiscard]] std::string operator/(std::string_view name) const {
        return (m_path / name).string();
    }
    [[nodiscard]] URL url(std::string_view name) const {
        return URL::fileURLWithPath(*this / name);
    }

    /// Writes a file, its folders made as needed, and gives its path.
    std::string write(std::string_view name, std::string_view bytes) const {
        const std::filesystem::path path = m_path / name;
        std::filesystem::create_directories(path.parent_path());
        std::ofstream(path, std::ios::binary) << bytes;
        return path.string();
    }
    [[nodiscard]] std::string read(std::string_view name) const {
        std::ifstream file(m_path / name, std::ios::binary);
        return {std::istreambuf_iterator<char>(file), {}};
    }

private:
    std::filesystem::path m_path;
};

}  // namespace parvel::testing
