#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "parvel/foundation/Error.h"
#include "parvel/foundation/Value.h"
#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel::cli {

/// What came of one PATH.
struct Result {
    std::string path;  ///< as given
    PVAssetType assetType = PVAssetTypeUnknown;
    std::optional<String> assetID;
    std::shared_ptr<const Dictionary> record;  ///< null is none
    std::string_view recordKey = "record";     ///< what stands in its place has a key of its own
    std::optional<Error> error;
    std::vector<Dictionary::Entry> fields;  ///< what the command adds to the keys of every result
    bool needsRecord = true;                ///< whether it is a failure that there is no record
    bool isUndone = false;                  ///< a record came, but not all that it says was written
    std::string_view nothing = "no metadata";  ///< what a failure without an error is called
    std::string reason;   ///< what the log said about a failure, in words for a person
    std::string advice;   ///< what to do about a failure, where the command knows
    std::string outcome;  ///< what was done, in words for a person, where that is the result's text

    [[nodiscard]] bool succeeded() const { return (record || !needsRecord) && !error && !isUndone; }
};

/// "epub", "folium", "pdf", "m4a" or "unknown".
std::string_view assetTypeName(PVAssetType type);

/// The URL of a PATH: made absolute where it is relative, otherwise as typed. The empty PATH stays
/// empty, since it names nothing.
URL urlOfPath(std::string_view path);

/// The URL of a path that an option says. Throws UsageError for the empty one: it would name the
/// working directory, and a shell variable that is not set is no wish for that.
URL urlOfOption(std::string_view option, std::string_view path);

/// The result of the PATH before anything was done with it.
Result resultForPath(std::string_view path);

/// Puts the record into the result as the given representation of it.
void setRecord(Result& result, const AssetPtr& record, PVAssetMetadataFlavor flavor);

}  // namespace parvel::cli
