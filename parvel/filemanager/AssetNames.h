#pragma once

#include <optional>

#include "parvel/foundation/Value.h"
#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel {

// The names that a record gives to its item; none for a null record.

/// The name that the item has; none without a URL.
[[nodiscard]] std::optional<String> lastComponentOf(const AssetPtr& asset);

/// Whether text can be the name of an item in a folder: not empty, `.` or `..`, no slash, no NUL.
[[nodiscard]] bool isOneComponent(const String& name);

/// The store ID, or else the generated ID, with the extension of the record's URL, if it has one.
/// None where that ID can't be one path component: no ID leads out of the directory that it names
/// an asset in.
[[nodiscard]] std::optional<String> assetIDFileName(const AssetPtr& asset);

/// The title, or the item's name, without what synchronised storage does not take, cut to 254
/// UTF-16 units less the extension's; the application's word for a name where nothing is left.
[[nodiscard]] std::optional<String> sanitizedFileName(const AssetPtr& asset);

/// A sanitised name that is too long for a file name, with whole code points dropped from its
/// stem's end until it fits with a count before its extension; any other name as it is.
[[nodiscard]] String fittingFileName(String name);

}  // namespace parvel
