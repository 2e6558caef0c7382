#pragma once

#include "tests/support/ManagedFolder.h"

namespace parvel::testing {

/// Moves of the folder's assets, their errors in the folder's place for them.
class MovedAssets : public ManagedFolder {
protected:
    struct Options {
        bool replace = false;
        bool renameIfCollision = false;
        bool useAssetIDFileName = false;
    };

    AssetPtr moveTo(const AssetPtr& moved, const std::optional<URL>& target, bool replace = false) {
        return m_manager->moveAsset_toURL_replaceExisting_error(moved, target, replace, &m_error);
    }
    AssetPtr moveInto(const AssetPtr& moved, const URL& directory, Options options) {
        return m_manager
            ->moveAsset_toDirectory_replaceExisting_renameIfCollision_useAssetIDFileName_error(
                moved, directory, options.replace, options.renameIfCollision,
                options.useAssetIDFileName, &m_error);
    }
    AssetPtr moveInto(const AssetPtr& moved, const URL& directory) {
        return moveInto(moved, directory, Options());
    }
};

}  // namespace parvel::testing
