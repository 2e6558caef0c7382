#pragma once

#include <functional>
#include <string>
#include <vector>

#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "tests/faults/TestLibrary.h"

namespace parvel::testing {

/// A record with an identity and a few texts of an item of the library.
[[nodiscard]] MutableAssetPtr assetAt(const TestLibrary& library, const std::string& place);

/// What more must hold of an item that is stamped: where it has its identity it has all else, so
/// that a set that was cut short is written again.
[[nodiscard]] std::function<std::string(const TestLibrary& library)> identityComesLast(
    const std::string& at);

/// The layout with an item more.
[[nodiscard]] Layout with(Layout layout, const std::string& place, const std::string& item);
/// The layout with each of the items at the place.
[[nodiscard]] std::vector<Layout> withEach(const Layout& layout, const std::string& place,
                                           const std::vector<std::string>& items);
/// What an item can look like while it is being made.
[[nodiscard]] std::vector<std::string> stagesOf(const std::string& item);

}  // namespace parvel::testing
