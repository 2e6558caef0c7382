#pragma once

#include <memory>
#include <optional>
#include <utility>

#include "parvel/foundation/URL.h"
#include "parvel/inspection/_PVAggregatedAssetData.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel {

/// A packaged book's metadata as its sources have it, and the rule that makes one record of them.
/// Made for one read.
class _PVAggregatedAssetMetadata {
public:
    static std::shared_ptr<_PVAggregatedAssetMetadata> initWithURL_opfMetadata_aggregateData(
        URL url, MutableAssetPtr opfMetadata,
        std::shared_ptr<const _PVAggregatedAssetData> aggregateData);

    [[nodiscard]] const URL& url() const { return m_url; }
    [[nodiscard]] const MutableAssetPtr& opfMetadata() const { return m_opfMetadata; }
    [[nodiscard]] const std::shared_ptr<const _PVAggregatedAssetData>& aggregateData() const {
        return m_aggregateData;
    }
    /// The store metadata file's record, where there is one.
    [[nodiscard]] const AssetPtr& bazaarMetadata() const { return m_bazaarMetadata; }
    void setBazaarMetadata(AssetPtr metadata) { m_bazaarMetadata = std::move(metadata); }
    /// What the asset's extended attributes hold.
    [[nodiscard]] const AssetPtr& preloadedMetadata() const { return m_preloadedMetadata; }
    void setPreloadedMetadata(AssetPtr metadata) { m_preloadedMetadata = std::move(metadata); }
    [[nodiscard]] const std::optional<Data>& coverImageData() const { return m_coverImageData; }
    void setCoverImageData(std::optional<Data> data) { m_coverImageData = std::move(data); }

    /// One new record, never none. Entries of a later source go over those of an earlier one: the
    /// OPF, the store file unless it is a preview's, package hash and generated ID, the cover, the
    /// extended attributes.
    [[nodiscard]] MutableAssetPtr combinedMetadata() const;

    /// Sets the package hash to the OPF's MD5 where the record has none. Without a store ID, sets
    /// the preview flag and makes the hash the generated ID, which books of the reading
    /// application's own tools and previews get only when they have no other. With one, removes the
    /// generated ID.
    void _populatePackageHashOnMetadata(PVMutableAssetMetadata& metadata) const;

private:
    _PVAggregatedAssetMetadata(URL url, MutableAssetPtr opfMetadata,
                               std::shared_ptr<const _PVAggregatedAssetData> aggregateData)
        : m_url(std::move(url)),
          m_opfMetadata(std::move(opfMetadata)),
          m_aggregateData(std::move(aggregateData)) {}

    [[nodiscard]] bool isPreview() const {
        return m_bazaarMetadata && m_bazaarMetadata->isPreview();
    }

    URL m_url;
    MutableAssetPtr m_opfMetadata;
    std::shared_ptr<const _PVAggregatedAssetData> m_aggregateData;
    AssetPtr m_bazaarMetadata;
    AssetPtr m_preloadedMetadata;
    std::optional<Data> m_coverImageData;
};

}  // namespace parvel
