#include "parvel/platform/TextRules.h"

#include <unicode/bytestream.h>
#include <unicode/casemap.h>
#include <unicode/uniset.h>
#include <unicode/unistr.h>

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

    std::string withoutForbiddenNameCharacters(std::string_view text) override {
        const icu::UnicodeSet& forbidden = forbiddenNameCharacters();
        const icu::UnicodeString characters = icu::UnicodeString::fromUTF8(
            icu::StringPiece(text.data(), static_cast<int32_t>(text.size())));
        icu::UnicodeString kept;
        for (int32_t at = 0; at < characters.length(); at = characters.moveIndex32(at, 1)) {
            const UChar32 character = characters.char32At(at);
            if (!forbidden.contains(character))
                kept.append(character);
        }
        std::string result;
        return kept.toUTF8String(result);
    }

private:
    /// Built once: what is illegal in text, punctuation, control and format characters, and twelve
    /// by name. The hyphen-minus is added and, with the low line, taken out again. Deliberate.
    static const icu::UnicodeSet& forbiddenNameCharacters() {
        static const icu::UnicodeSet set = [] {
            UErrorCode status = U_ZERO_ERROR;
            icu::UnicodeSet made(UNICODE_STRING_SIMPLE("[[:Cn:][:P:][:Cc:][:Cf:]]"), status);
            made.addAll(UNICODE_STRING_SIMPLE("/\\?%*|\"<>:-#"));
            made.removeAll(UNICODE_STRING_SIMPLE("_-"));
            made.freeze();
            return made;
        }();
        return set;
    }

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
