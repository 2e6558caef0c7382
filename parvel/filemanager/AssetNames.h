#pragma once

#include <optional>

#include "parvel/foundation/Value.h"
#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel {

/// What names a record gives to the file manager. A null record gives none.

[[nodiscard]] std::optional<String> lastComponentOf(const AssetPtr& asset);

/// Whether text can be the name of an item in a folder: not empty, `.` or `..`, no slash, no NUL.
[[nodiscard]] bool isOneComponent(const String& name);

/// The store ID, or else the generated ID, with the extension of the record's URL. None where that
/// ID can't be one path component: the departure from "any text" keeps an asset within its
/// directory.
[[nodiscard]] std::optional<String> assetIDFileName(const AssetPtr& asset);

/// The title, or the item's name, without what synchronised storage does not take, cut to 254
/// UTF-16 units less the extension's; the application's word for a name where nothing is left.
[[nodiscard]] std::optional<String> sanitizedFileName(const AssetPtr& asset);

/// A sanitised name that is too long for a file name, with whole code points dropped from its
/// stem's end until it fits with a count before its extension; any other name as it is.
[[nodiscard]] String fittingFileName(String name);

}  // namespace parvel
