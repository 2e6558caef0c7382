#include "parvel/filemanager/AssetNames.h"

#include <algorithm>

#include "parvel/foundation/PVCasts.h"
#include "parvel/foundation/ValueReadings.h"
#include "parvel/metadata/AssetURL.h"
#include "parvel/platform/Localiser.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/TextRules.h"

namespace parvel {

namespace {

constexpr std::size_t kLongestSanitizedName = 254;  // UTF-16 units, without the dot
constexpr std::size_t kLongestFileName = 255;       // bytes
constexpr std::string_view kLongestCount = " 9999";

String withExtension(String stem, std::string_view extension) {
    if (!extension.empty())
        stem.append(".").append(extension);
    return stem;
}

}  // namespace

bool isOneComponent(const String& name) {
    return !name.empty() && name != "." && name != ".." &&
           name.find_first_of(std::string_view("/\0", 2)) == String::npos;
}

std::optional<String> lastComponentOf(const AssetPtr& asset) {
    const auto url = urlOf(asset);
    return url ? std::optional(String(url->lastPathComponent())) : std::nullopt;
}

std::optional<String> assetIDFileName(const AssetPtr& asset) {
    if (!asset)
        return std::nullopt;
    std::optional<String> stem;
    if (int64Reading(asset->storeID()) >= 1)
        stem = stringForm(asset->storeID());
    else if (const String* generated = PVDynamicCast(classOf<String>, asset->generatedID()))
        stem = *generated;
    if (!stem || !isOneComponent(*stem))
        return std::nullopt;
    const auto url = asset->url();
    return withExtension(*stem, url ? url->pathExtension() : std::string_view());
}

std::optional<String> sanitizedFileName(const AssetPtr& asset) {
    const auto name = lastComponentOf(asset);
    if (!name)
        return std::nullopt;
    const String extension(extensionOfPath(*name));
    const String title = asset->title().value_or("");
    const bool isTitled = !title.empty() && !extension.empty();

    TextRules& rules = Service<TextRules>::current();
    String stem = rules.withoutForbiddenNameCharacters(isTitled ? std::string_view(title)
                                                                : pathWithoutExtension(*name));
    stem = withCollapsedBlanks(stem);
    const std::size_t taken = utf16Length(withReplacedInvalidUTF8(extension));
    const std::size_t room = kLongestSanitizedName - std::min(taken, kLongestSanitizedName);
    if (utf16Length(stem) > room)
        stem = utf16Prefix(stem, room);
    if (stem.empty())
        stem = Service<Localiser>::current().text("DEFAULT_UBIQUITY_FILENAME", "unknown");
    return withExtension(std::move(stem), extension);
}

String fittingFileName(String name) {
    if (name.size() <= kLongestFileName)
        return name;
    const String extension(extensionOfPath(name));
    String stem(pathWithoutExtension(name));
    const std::size_t taken = kLongestCount.size() + 1 + extension.size();
    std::size_t room = kLongestFileName - std::min(taken, kLongestFileName);
    while (room > 0 && room < stem.size() &&
           (static_cast<unsigned char>(stem[room]) & 0xC0) == 0x80)
        --room;
    stem.resize(std::min(room, stem.size()));
    return withExtension(std::move(stem), extension);
}

}  // namespace parvel
