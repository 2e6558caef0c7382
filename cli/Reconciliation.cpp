#include "cli/Reconciliation.h"

#include <unordered_map>
#include <unordered_set>

#include "parvel/foundation/ValueReadings.h"

namespace parvel::cli {
namespace {

/// What an identity may be found by: the identifiers as texts, each with its kind before it.
std::vector<std::string> identifiersOf(const PVAssetMetadata& asset) {
    std::vector<std::string> identifiers;
    if (const auto generated = stringForm(asset.generatedID()))
        identifiers.push_back("generated " + *generated);
    if (const auto store = stringForm(asset.storeID()))
        identifiers.push_back("store " + *store);
    return identifiers;
}

/// Missing assets by their identifiers, in the order given.
class MissingAssets {
public:
    explicit MissingAssets(const std::vector<AssetPtr>& assets)
        : m_assets(assets), m_isTaken(assets.size(), false) {
        for (std::size_t index = 0; index < assets.size(); ++index) {
            for (std::string& identifier : identifiersOf(*assets[index]))
                m_indices[std::move(identifier)].indices.push_back(index);
        }
    }

    /// The first one of the orphan's identity, which no other orphan gets then; null for none.
    AssetPtr takeMatching(const PVAssetMetadata& orphan) {
        for (const std::string& identifier : identifiersOf(orphan)) {
            const auto found = m_indices.find(identifier);
            if (found == m_indices.end())
                continue;
            Candidates& candidates = found->second;
            while (candidates.first < candidates.indices.size()) {
                const std::size_t index = candidates.indices[candidates.first];
                if (!m_isTaken[index] && orphan.hasMatchingIdentity(*m_assets[index])) {
                    m_isTaken[index] = true;
                    return m_assets[index];
                }
                ++candidates.first;
            }
        }
        return nullptr;
    }

private:
    struct Candidates {
        std::vector<std::size_t> indices;
        std::size_t first = 0;  ///< those before it are taken, or match nobody
    };

    const std::vector<AssetPtr>& m_assets;
    std::vector<bool> m_isTaken;
    std::unordered_map<std::string, Candidates> m_indices;
};

}  // namespace

std::vector<MovedAsset> movedAssets(const std::vector<AssetPtr>& orphans,
                                    const std::vector<AssetPtr>& missing) {
    MissingAssets candidates(missing);
    std::vector<MovedAsset> moved;
    for (const AssetPtr& orphan : orphans) {
        if (AssetPtr match = candidates.takeMatching(*orphan))
            moved.push_back({orphan, std::move(match)});
    }
    return moved;
}

std::vector<URL> uninspectedURLs(const std::vector<URL>& urls, const std::vector<AssetPtr>& records,
                                 const std::vector<AssetPtr>& missing) {
    std::unordered_set<std::string> known;
    known.reserve(records.size() + missing.size());
    for (const std::vector<AssetPtr>* assets : {&records, &missing}) {
        for (const AssetPtr& asset : *assets) {
            if (const auto url = asset->url())
                known.insert(url->standardized().path());
        }
    }
    std::vector<URL> uninspected;
    for (const URL& url : urls) {
        if (!known.contains(url.standardized().path()))
            uninspected.push_back(url);
    }
    return uninspected;
}

}  // namespace parvel::cli
