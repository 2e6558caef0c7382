#pragma once

#include <algorithm>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "parvel/platform/ArchiveCopier.h"
#include "tests/support/RecordingCopierCallbacks.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/ZipBuilder.h"

namespace parvel::testing {

/// A new archive copier of the host's, which copies "source" to "copy" in a folder of its own.
class ArchiveCopying : public ::testing::Test {
protected:
    using Names = std::vector<std::string>;

    ArchiveCopying() { m_copier->setCallbacks(&m_callbacks); }

    static Dictionary expanding() {
        return {{std::string(ArchiveCopier::extractPKZip), Number::boolean(true)}};
    }
    [[nodiscard]] std::string sourcePath() const { return m_folder / "source"; }
    [[nodiscard]] std::string copyPath(const std::string& member) const {
        return member.empty() ? m_folder / "copy" : m_folder / ("copy/" + member);
    }

    void writeSource(const ZipBuilder& archive) { m_folder.write("source", archive.bytes()); }
    int expandSource() { return m_copier->copy(sourcePath(), copyPath(""), expanding()); }
    int expand(const ZipBuilder& archive) {
        writeSource(archive);
        return expandSource();
    }
    int copyTree() { return m_copier->copy(sourcePath(), copyPath(""), Dictionary()); }

    [[nodiscard]] std::string read(const std::string& member) const {
        return m_folder.read("copy/" + member);
    }
    /// All that stands in the copy, hidden items included.
    [[nodiscard]] Names names() const {
        Names names;
        const std::filesystem::path copy = copyPath("");
        for (const auto& entry : std::filesystem::recursive_directory_iterator(copy))
            names.push_back(entry.path().lexically_relative(copy).string());
        std::sort(names.begin(), names.end());
        return names;
    }

    TemporaryDirectory m_folder;
    RecordingCopierCallbacks m_callbacks;
    std::shared_ptr<ArchiveCopier> m_copier = ArchiveCopierFactory::host().makeCopier();
};

}  // namespace parvel::testing
