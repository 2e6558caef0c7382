#include "parvel/metadata/StoredPath.h"

#include <algorithm>

#include "parvel/foundation/PVCasts.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/TextRules.h"

namespace parvel {

namespace {

bool mayHaveLowerCase(char character) {
    return (character >= 'A' && character <= 'Z') || static_cast<unsigned char>(character) >= 0x80;
}

}  // namespace

std::optional<URL> fileURLOfStoredPath(const Value* path) {
    const String* text = PVDynamicCast(classOf<String>, path);
    if (!text || text->empty())
        return std::nullopt;
    return URL::fileURLWithPath(*text);
}

std::string pathWithLowercasedExtension(std::string_view path) {
    std::string result(path);
    const std::string_view extension = extensionOfPath(path);
    if (std::none_of(extension.begin(), extension.end(), mayHaveLowerCase))
        return result;

    const auto start = static_cast<std::size_t>(extension.data() - path.data());
    result.replace(start, extension.size(), Service<TextRules>::current().lowercased(extension));
    return result;
}

}  // namespace parvel
