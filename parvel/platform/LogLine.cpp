#include "parvel/platform/LogSink.h"
#include "parvel/platform/TextRules.h"

namespace parvel {

std::string LogLine::message() const {
    std::string message;
    message.reserve(text.size());
    std::size_t used = 0;
    for (std::size_t i = 0; i < text.size();) {
        const std::string_view rest = text.substr(i);
        const std::size_t length = placeholderLength(rest);
        if (rest.starts_with("%%")) {
            message += '%';
            i += 2;
        } else if (length > 0 && used < arguments.size()) {
            message += arguments[used].describe(arguments[used].object);
            ++used;
            i += length;
        } else {
            message += text[i++];
        }
    }
    return isValidUTF8(message) ? message : withReplacedInvalidUTF8(message);
}

}  // namespace parvel
