#pragma once

#include <cstdint>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/Value.h"
#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel {

/// The writing side of the asset's attributes; the file manager's operations of these names stand
/// on it.

/// Writes identity, title, author, genre and the explicit mark once: true, with nothing written,
/// where the file carries an identity already. -1002 without a URL, -1006 without an asset ID. An
/// identity that can't be read leaves its error in the slot, beside a writing that succeeds too.
/// Deliberate.
[[nodiscard]] bool setAttributesForAsset(const AssetPtr& asset, ErrorOut error);

/// Writes those of title, author, genre and the explicit mark that differ. False without an error
/// when there is nothing to write. -1002 without a URL; -1006 where the attributes can't be read,
/// the record has no asset ID, or the file carries another identity. A true explicit mark is never
/// cleared.
[[nodiscard]] bool updateAttributesForAsset(const AssetPtr& asset, ErrorOut error);

/// Writes texts by attribute name in the order of the names, the identity last. False without an
/// error for no URL or nothing to write. The first failure ends it; what was written before stays.
[[nodiscard]] bool writeAttributes(const Dictionary& attributes, const std::optional<URL>& url,
                                   ErrorOut error);

/// Gives every visible file in a package mode 0600 and returns the sum of their allocated sizes; of
/// a single file, its own allocated size, with its mode unchanged. 0 with a log line when a query
/// fails. The error is written in every case, and is one only when the directory query failed.
/// Deliberate.
[[nodiscard]] std::uint64_t fixPermissionsAndCalculateAllocatedSize(const URL& url, ErrorOut error);

}  // namespace parvel
