#pragma once

#include <memory>
#include <optional>
#include <utility>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/URL.h"
#include "parvel/foundation/Value.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace parvel {

class _PVAggregatedAssetMetadata;

/// The raw bytes that a packaged book's metadata is made from. The packaged book reader makes it
/// for one read; the aggregate keeps it for the package hash.
class _PVAggregatedAssetData : public std::enable_shared_from_this<_PVAggregatedAssetData> {
public:
    /// None: a holder without its package document can't exist. Deliberate.
    static std::shared_ptr<_PVAggregatedAssetData> init();
    /// `path` is the OPF's, relative to the package's root, as the container document has it.
    static std::shared_ptr<_PVAggregatedAssetData> initWithURL_opfData_path(URL url, Data opfData,
                                                                            String path);

    [[nodiscard]] const URL& url() const { return m_url; }
    [[nodiscard]] const Data& opf() const { return m_opf; }
    [[nodiscard]] const String& opfPath() const { return m_opfPath; }
    /// The store metadata file's bytes, where the package has one.
    [[nodiscard]] const std::optional<Data>& bazaarMetadata() const { return m_bazaarMetadata; }
    void setBazaarMetadata(std::optional<Data> bytes) { m_bazaarMetadata = std::move(bytes); }

    /// Parses both sources. None when the OPF is unusable, however good the store file is; a broken
    /// store file counts as absent. The OPF's cover is looked for only where the store file names
    /// none.
    std::shared_ptr<_PVAggregatedAssetMetadata> metadataWithPreloadedMetadata_includeCover_error(
        const AssetPtr& preloadedMetadata, bool includeCover, ErrorOut error = nullptr);

    /// The OPF alone as a partial record; with `cover` also the path of its cover image. Books made
    /// by the reading application's own tools take their generated ID from it. None when it is no
    /// XML or has no metadata element. Errors are the XML service's, one of a lookup that came to
    /// nothing included.
    [[nodiscard]] MutableAssetPtr _opfMetadataWithCover_error(bool cover,
                                                              ErrorOut error = nullptr) const;

private:
    _PVAggregatedAssetData(URL url, Data opf, String opfPath)
        : m_url(std::move(url)), m_opf(std::move(opf)), m_opfPath(std::move(opfPath)) {}

    URL m_url;
    Data m_opf;
    String m_opfPath;
    std::optional<Data> m_bazaarMetadata;
};

}  // namespace parvel
