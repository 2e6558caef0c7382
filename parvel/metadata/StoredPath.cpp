#include "parvel/metadata/StoredPath.h"

#include "parvel/foundation/PVCasts.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/TextRules.h"

namespace parvel {

std::optional<URL> fileURLOfStoredPath(const Value* path) {
    const String* text = PVDynamicCast(classOf<String>, path);
    if (!text || text->empty())
        return std::nullopt;
    return URL::fileURLWithPath(*text);
}

std::string pathWithLowercasedExtension(std::string_view path) {
    const std::string_view extension = extensionOfPath(path);
    if (extension.empty())
        return std::string(path);
    std::string result;
    result.reserve(path.size());
    result.append(path.substr(0, static_cast<std::size_t>(extension.data() - path.data())));
    return result.append(Service<TextRules>::current().lowercased(extension));
}

}  // namespace parvel
