#include "parvel/platform/linux/PlainXmlScanner.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <initializer_list>
#include <utility>

#include "parvel/platform/TextRules.h"

namespace parvel {
namespace {

constexpr std::size_t kLongestName = 1000;

constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";

/// What an ASCII character may stand for; one of several kinds has the bits of them all.
using CharacterKinds = std::uint8_t;
constexpr CharacterKinds kNameStart = 1;
constexpr CharacterKinds kNamePart = 2;
constexpr CharacterKinds kBlank = 4;
constexpr CharacterKinds kTextPart = 8;         ///< means itself in text
constexpr CharacterKinds kTextEnd = 16;         ///< is something of its own within text
constexpr CharacterKinds kValuePart = 32;       ///< means itself in quotes of either kind
constexpr CharacterKinds kIdentifierPart = 64;  ///< of what identifies an external subset

constexpr bool isOneOf(char character, std::string_view characters) {
    return characters.find(character) != std::string_view::npos;
}

constexpr CharacterKinds kindsOf(char c) {
    const bool isLetter = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
    const bool isDigit = c >= '0' && c <= '9';
    const bool isPrintable = c >= ' ' && c <= '~';
    CharacterKinds kinds = 0;
    if (isLetter || c == '_')
        kinds |= kNameStart;
    if (isLetter || isDigit || isOneOf(c, "_-."))
        kinds |= kNamePart;
    if (isOneOf(c, " \t\n\r"))
        kinds |= kBlank;
    if ((isPrintable && !isOneOf(c, "<&]")) || isOneOf(c, "\t\n"))
        kinds |= kTextPart;
    if (isOneOf(c, "<&\r"))
        kinds |= kTextEnd;
    if (isPrintable && !isOneOf(c, "<&\"'"))
        kinds |= kValuePart;
    if (isLetter || isDigit || isOneOf(c, " -/.:,()+_"))
        kinds |= kIdentifierPart;
    return kinds;
}

constexpr std::array<CharacterKinds, 256> kKinds = [] {
    std::array<CharacterKinds, 256> kinds{};
    for (unsigned c = 0; c < 0x80; ++c)
        kinds[c] = kindsOf(static_cast<char>(c));
    return kinds;
}();

bool isOf(CharacterKinds kind, char character) {
    return (kKinds[static_cast<std::uint8_t>(character)] & kind) != 0;
}

const char* behindAll(CharacterKinds kind, const char* at, const char* end) {
    while (at != end && isOf(kind, *at))
        ++at;
    return at;
}

bool isCharacter(std::uint32_t codePoint) {
    if (codePoint < ' ')
        return codePoint == '\t' || codePoint == '\n' || codePoint == '\r';
    const bool isSurrogate = codePoint >= 0xD800 && codePoint <= 0xDFFF;
    return !isSurrogate && codePoint != 0xFFFE && codePoint != 0xFFFF && codePoint <= 0x10FFFF;
}

bool isQuote(char character) {
    return character == '"' || character == '\'';
}

}  // namespace

bool PlainXmlScanner::takeProlog() {
    take(kByteOrderMark);
    if (take("<?xml") && !takeDeclaration())
        return false;
    if (!takeMisc())
        return false;
    return !take("<!DOCTYPE") || (takeDoctype() && takeMisc());
}

/// What follows upon `<?xml`.
bool PlainXmlScanner::takeDeclaration() {
    const auto takeOneOf = [this](std::initializer_list<std::string_view> values) {
        std::string_view value;
        // It stands there as it reads: a declaration holds no references.
        return takeAssignment(value) && value.data() + value.size() + 1 == m_at &&
               std::find(values.begin(), values.end(), value) != values.end();
    };
    if (!takeSpace() || !take("version") || !takeOneOf({"1.0"}))
        return false;
    bool isSpaced = takeSpace();
    if (isSpaced && take("encoding")) {
        if (!takeOneOf({"UTF-8", "utf-8"}))
            return false;
        isSpaced = takeSpace();
    }
    if (isSpaced && take("standalone")) {
        if (!takeOneOf({"yes", "no"}))
            return false;
        takeSpace();
    }
    return take("?>");
}

/// What follows upon `<!DOCTYPE`, where that declares nothing but an external subset, which is
/// never read.
bool PlainXmlScanner::takeDoctype() {
    const auto takeLiteral = [this] {
        if (!takeSpace() || !take('"'))
            return false;
        const char* const begin = m_at;
        m_at = behindAll(kIdentifierPart, m_at, m_end);
        return since(begin).size() <= kLongestName && take('"');
    };
    Name name;
    if (!takeSpace() || !takeName(name))
        return false;
    takeSpace();
    if (take("PUBLIC") && (!takeLiteral() || !takeLiteral()))
        return false;
    takeSpace();
    return take('>');
}

bool PlainXmlScanner::takeMisc() {
    takeSpace();
    while (take("<!--")) {
        if (!takeComment())
            return false;
        takeSpace();
    }
    return true;
}

bool PlainXmlScanner::takeComment() {
    while (!take("--")) {
        if (atEnd())
            return false;
        const bool isUsual = isOf(kTextPart, *m_at) || isOneOf(*m_at, "<&]\r");
        if (!isUsual && !takeUnusualCharacter())
            return false;
        m_at += isUsual ? 1 : 0;
    }
    return take('>');
}

bool PlainXmlScanner::takeSpace() {
    const char* const begin = m_at;
    m_at = behindAll(kBlank, m_at, m_end);
    return m_at != begin;
}

bool PlainXmlScanner::takeName(Name& name) {
    const auto takePart = [this](std::string_view& part) {
        const char* const begin = m_at;
        if (atEnd() || !isOf(kNameStart, *m_at))
            return false;
        m_at = behindAll(kNamePart, m_at, m_end);
        part = since(begin);
        return part.size() <= kLongestName;
    };
    if (!takePart(name.local))
        return false;
    if (!take(':'))
        return true;
    name.prefix = name.local;
    return takePart(name.local);
}

bool PlainXmlScanner::takeAssignment(std::string_view& value) {
    takeSpace();
    if (!take('='))
        return false;
    takeSpace();
    if (atEnd() || !isQuote(*m_at))
        return false;
    const char quote = *m_at++;
    const char* const begin = m_at;
    for (;;) {
        m_at = behindAll(kValuePart, m_at, m_end);
        if (atEnd())
            return false;
        if (*m_at == quote) {
            value = since(begin);
            ++m_at;
            return true;
        }
        if (isQuote(*m_at))
            ++m_at;
        else if (!takeUnusualCharacter())
            return takeDecodedValue(begin, quote, value);
    }
}

/// The rest of a value whose first characters mean themselves, up to the quote that ends it.
bool PlainXmlScanner::takeDecodedValue(const char* begin, char quote, std::string_view& value) {
    m_decoded.assign(begin, m_at);
    for (;;) {
        if (atEnd())
            return false;
        if (take(quote)) {
            value = m_values.keep(m_decoded);
            return true;
        }
        const char* const next = m_at;
        if (*m_at == '&') {
            if (!takeReference(m_decoded))
                return false;
        } else if (take("\r\n") || take('\n') || take('\t')) {
            m_decoded += ' ';
        } else if (isOf(kValuePart, *m_at) || isQuote(*m_at)) {
            m_decoded += *m_at++;
        } else if (takeUnusualCharacter()) {
            m_decoded += since(next);
        } else {
            return false;
        }
    }
}

bool PlainXmlScanner::takeText(std::string_view& text) {
    const char* const begin = m_at;
    for (;;) {
        m_at = behindAll(kTextPart, m_at, m_end);
        if (atEnd())
            return false;
        if (isOf(kTextEnd, *m_at)) {
            text = since(begin);
            return true;
        }
        if (*m_at == ']') {
            if (take("]]>"))
                return false;
            ++m_at;
        } else if (!takeUnusualCharacter()) {
            return false;
        }
    }
}

bool PlainXmlScanner::takeReference(std::string& decoded) {
    static constexpr std::array<std::pair<std::string_view, char>, 5> entities{
        {{"&amp;", '&'}, {"&lt;", '<'}, {"&gt;", '>'}, {"&quot;", '"'}, {"&apos;", '\''}}};
    for (const auto& [reference, character] : entities) {
        if (take(reference)) {
            decoded += character;
            return true;
        }
    }
    const int base = take("&#x") ? 16 : 10;
    if (base == 10 && !take("&#"))
        return false;
    std::uint32_t codePoint = 0;
    const auto [end, error] = std::from_chars(m_at, m_end, codePoint, base);
    m_at = end;
    if (error != std::errc() || !isCharacter(codePoint) || !take(';'))
        return false;
    appendUTF8(decoded, codePoint);
    return true;
}

/// A character that is not ASCII.
bool PlainXmlScanner::takeUnusualCharacter() {
    const std::string_view rest(m_at, static_cast<std::size_t>(m_end - m_at));
    const std::size_t length = utf8SequenceLength(rest);
    if (length < 2 || rest.starts_with("\xEF\xBF\xBE") || rest.starts_with("\xEF\xBF\xBF"))
        return false;
    m_at += length;
    return true;
}

}  // namespace parvel
