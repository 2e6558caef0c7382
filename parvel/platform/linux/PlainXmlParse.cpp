#include "parvel/platform/linux/PlainXmlParse.h"

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

constexpr std::size_t kMostAttributes = 32;
constexpr std::size_t kMostBindings = 32;
constexpr std::size_t kMostOpenElements = 200;
constexpr std::size_t kLongestName = 1000;

constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";
constexpr std::string_view kXmlPrefix = "xml";
constexpr std::string_view kXmlNamespace = "http://www.w3.org/XML/1998/namespace";
constexpr std::string_view kDeclarationsNamespace = "http://www.w3.org/2000/xmlns/";

/// What an ASCII character may stand for; one of several kinds has the bits of them all.
using CharacterKinds = std::uint8_t;
constexpr CharacterKinds kNameStart = 1;
constexpr CharacterKinds kNamePart = 2;
constexpr CharacterKinds kBlank = 4;
constexpr CharacterKinds kTextPart = 8;         ///< means itself in text
constexpr CharacterKinds kValuePart = 16;       ///< means itself in quotes of either kind
constexpr CharacterKinds kNamespacePart = 32;   ///< of a namespace's name that libxml2 likes
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
    if (isPrintable && !isOneOf(c, "<&\"'"))
        kinds |= kValuePart;
    if (isLetter || isDigit || isOneOf(c, "-._~:/?#@!$'()*+,;=%"))
        kinds |= kNamespacePart;
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

/// Whether libxml2 takes the name without a word, as it stands.
bool isPlainNamespace(std::string_view name) {
    return !name.empty() && behindAll(kNamespacePart, name.begin(), name.end()) == name.end() &&
           name != kXmlNamespace && name != kDeclarationsNamespace;
}

}  // namespace

bool PlainXmlParse::run(std::string_view document) {
    if (document.size() > kLargestDocument)
        return false;
    m_at = document.data();
    m_end = m_at + document.size();
    return takeProlog() && takeStartTag() && takeContent() && takeMisc() && atEnd();
}

bool PlainXmlParse::takeProlog() {
    take(kByteOrderMark);
    if (take("<?xml") && !takeDeclaration())
        return false;
    if (!takeMisc())
        return false;
    return !take("<!DOCTYPE") || (takeDoctype() && takeMisc());
}

/// What follows upon `<?xml`.
bool PlainXmlParse::takeDeclaration() {
    const auto takeOneOf = [this](std::initializer_list<std::string_view> values) {
        std::string_view value;
        return takeAssignment(value) &&
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
bool PlainXmlParse::takeDoctype() {
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

/// White space and comments outside of the root element.
bool PlainXmlParse::takeMisc() {
    takeSpace();
    while (take("<!--")) {
        if (!takeComment())
            return false;
        takeSpace();
    }
    return true;
}

/// What follows upon `<!--`.
bool PlainXmlParse::takeComment() {
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

/// What follows upon the root's start tag, up to the end of the root.
bool PlainXmlParse::takeContent() {
    while (!m_open.empty()) {
        if (m_isRefused || !takeCharacters())
            return false;
        bool isTaken = false;
        if (take("</"))
            isTaken = takeEndTag();
        else if (take("<!--"))
            isTaken = takeComment();
        else
            isTaken = takeStartTag();
        if (!isTaken)
            return false;
    }
    return !m_isRefused;
}

bool PlainXmlParse::takeStartTag() {
    StartTag tag;
    if (!take('<'))
        return false;
    const char* const begin = m_at;
    if (!takeName(tag.name))
        return false;
    const Open open{since(begin), m_bindings.size()};

    m_attributes.clear();
    while (takeSpace() && !atEnd() && *m_at != '>' && *m_at != '/') {
        if (!takeAttribute(open))
            return false;
    }
    const bool isEmpty = take('/');
    if (!take('>') || m_open.size() == kMostOpenElements || !bindNames(tag))
        return false;

    m_open.push_back(open);
    tag.attributes = m_attributes;
    startElement(tag);
    if (isEmpty)
        close();
    return true;
}

bool PlainXmlParse::takeAttribute(const Open& element) {
    Name name;
    if (!takeName(name))
        return false;
    if (name.prefix == "xmlns")
        return takeNamespace(name.local, element);
    if (name.prefix.empty() && name.local == "xmlns")
        return takeNamespace({}, element);

    std::string_view value;
    if (m_attributes.size() == kMostAttributes || !takeAssignment(value))
        return false;
    m_attributes.push_back({name, {}, value});
    return true;
}

/// The value of a declaration.
bool PlainXmlParse::takeNamespace(std::string_view prefix, const Open& element) {
    std::string_view name;
    if (m_bindings.size() == kMostBindings || prefix.starts_with("xml") || !takeAssignment(name) ||
        !isPlainNamespace(name))
        return false;
    for (std::size_t index = element.outerBindings; index < m_bindings.size(); ++index) {
        if (m_bindings[index].prefix == prefix)
            return false;
    }
    m_bindings.push_back({prefix, name});
    return true;
}

/// Gives the names of the tag their namespaces, once all its declarations are known.
bool PlainXmlParse::bindNames(StartTag& tag) {
    if (tag.name.prefix == kXmlPrefix || !findNamespace(tag.name.prefix, tag.namespaceName))
        return false;
    for (Attribute& attribute : m_attributes) {
        // The default namespace is not for attributes.
        const std::string_view prefix = attribute.name.prefix;
        if (!prefix.empty() && !findNamespace(prefix, attribute.namespaceName))
            return false;
        for (const Attribute* other = m_attributes.data(); other != &attribute; ++other) {
            if (other->name.local == attribute.name.local &&
                other->namespaceName == attribute.namespaceName)
                return false;
        }
    }
    return true;
}

bool PlainXmlParse::findNamespace(std::string_view prefix, std::string_view& namespaceName) const {
    for (std::size_t index = m_bindings.size(); index > 0; --index) {
        if (m_bindings[index - 1].prefix == prefix) {
            namespaceName = m_bindings[index - 1].namespaceName;
            return true;
        }
    }
    if (prefix == kXmlPrefix)
        namespaceName = kXmlNamespace;
    return prefix.empty() || prefix == kXmlPrefix;
}

/// What follows upon `</`.
bool PlainXmlParse::takeEndTag() {
    if (!take(m_open.back().name))
        return false;
    takeSpace();
    if (!take('>'))
        return false;
    close();
    return true;
}

void PlainXmlParse::close() {
    m_bindings.resize(m_open.back().outerBindings);
    m_open.pop_back();
    endElement();
}

/// Text up to the next tag or comment.
bool PlainXmlParse::takeCharacters() {
    const char* begin = m_at;
    const auto report = [this, &begin] {
        if (m_at != begin)
            text(since(begin));
    };
    for (;;) {
        m_at = behindAll(kTextPart, m_at, m_end);
        if (atEnd())
            return false;
        if (*m_at == '<') {
            report();
            return true;
        }
        if (*m_at == '&') {
            report();
            m_decoded.clear();
            if (!takeReference(m_decoded))
                return false;
            text(m_decoded);
            begin = m_at;
        } else if (*m_at == '\r') {
            report();
            begin = ++m_at;
            if (atEnd() || *m_at != '\n')
                return false;
        } else if (*m_at == ']') {
            if (take("]]>"))
                return false;
            ++m_at;
        } else if (!takeUnusualCharacter()) {
            return false;
        }
    }
}

/// A character that is not ASCII.
bool PlainXmlParse::takeUnusualCharacter() {
    const std::string_view rest(m_at, static_cast<std::size_t>(m_end - m_at));
    const std::size_t length = utf8SequenceLength(rest);
    if (length < 2 || rest.starts_with("\xEF\xBF\xBE") || rest.starts_with("\xEF\xBF\xBF"))
        return false;
    m_at += length;
    return true;
}

bool PlainXmlParse::takeName(Name& name) {
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

bool PlainXmlParse::takeAssignment(std::string_view& value) {
    takeSpace();
    if (!take('='))
        return false;
    takeSpace();
    return takeValue(value);
}

bool PlainXmlParse::takeValue(std::string_view& value) {
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
bool PlainXmlParse::takeDecodedValue(const char* begin, char quote, std::string_view& value) {
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

/// A reference to a character or to a predefined entity.
bool PlainXmlParse::takeReference(std::string& decoded) {
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

bool PlainXmlParse::take(char expected) {
    if (atEnd() || *m_at != expected)
        return false;
    ++m_at;
    return true;
}

bool PlainXmlParse::take(std::string_view expected) {
    if (static_cast<std::size_t>(m_end - m_at) < expected.size() ||
        std::memcmp(m_at, expected.data(), expected.size()) != 0)
        return false;
    m_at += expected.size();
    return true;
}

/// Whether there was any.
bool PlainXmlParse::takeSpace() {
    const char* const begin = m_at;
    m_at = behindAll(kBlank, m_at, m_end);
    return m_at != begin;
}

}  // namespace parvel
