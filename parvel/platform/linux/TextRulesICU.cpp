#include "parvel/platform/TextRules.h"

#include <unicode/bytestream.h>
#include <unicode/casemap.h>

#include <algorithm>
#include <limits>

namespace parvel {
namespace {

class TextRulesICU final : public TextRules {
public:
    std::string lowercased(std::string_view text) override {
        const bool isASCII = std::all_of(text.begin(), text.end(), [](char character) {
            return static_cast<unsigned char>(character) < 0x80;
        });
        constexpr auto kLongest = static_cast<std::size_t>(std::numeric_limits<int>::max());
        if (isASCII || text.size() > kLongest)
            return lowercasedASCII(text);

        std::string lower;
        lower.reserve(text.size());
        icu::StringByteSink<std::string> sink(&lower);
        UErrorCode status = U_ZERO_ERROR;
        icu::CaseMap::utf8ToLower("", 0, icu::StringPiece(text), sink, nullptr, status);
        return U_SUCCESS(status) ? lower : lowercasedASCII(text);
    }

private:
    static std::string lowercasedASCII(std::string_view text) {
        std::string lower(text);
        for (char& character : lower) {
            if (character >= 'A' && character <= 'Z')
                character = static_cast<char>(character + ('a' - 'A'));
        }
        return lower;
    }
};

}  // namespace

TextRules& TextRules::host() {
    static TextRulesICU rules;
    return rules;
}

}  // namespace parvel
