#pragma once

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {

/// A folder of assets, a manager over the host's services, and a place for its errors.
class ManagedFolder : public ::testing::Test {
protected:
    using Names = std::vector<std::string>;

    /// A record of a new file.
    MutableAssetPtr asset(const std::string& name, const std::string& content = "content") {
        return PVAssetMetadata::metadataWithURL_dictionary(
            URL::fileURLWithPath(m_folder.write(name, content)), nullptr);
    }
    /// All names in a folder below, hidden ones included.
    [[nodiscard]] Names names(const std::string& below = "") const {
        Names names;
        for (const auto& entry : std::filesystem::directory_iterator(m_folder.path() / below))
            names.push_back(entry.path().filename().string());
        std::sort(names.begin(), names.end());
        return names;
    }
    URL makeFolder(const std::string& name) const {
        std::filesystem::create_directories(m_folder / name);
        return m_folder.url(name);
    }

    TemporaryDirectory m_folder;
    std::shared_ptr<PVAssetMetadataFileManager> m_manager = PVAssetMetadataFileManager::init();
    std::optional<Error> m_error;
};

}  // namespace parvel::testing
