#include "parvel/platform/linux/PlainXmlParse.h"

namespace parvel {
namespace {

constexpr std::size_t kMostAttributes = 32;
constexpr std::size_t kMostBindings = 32;
constexpr std::size_t kMostOpenElements = 200;
/// Of each of these; few documents have more.
constexpr std::size_t kUsualCount = 8;

constexpr std::string_view kXmlPrefix = "xml";
constexpr std::string_view kDeclarationsPrefix = "xmlns";
constexpr std::string_view kXmlNamespace = "http://www.w3.org/XML/1998/namespace";
constexpr std::string_view kDeclarationsNamespace = "http://www.w3.org/2000/xmlns/";

/// Whether the value that declares a namespace is its name to libxml2, too, which leaves a
/// reference to an ampersand in it as it is.
bool isPlainNamespace(std::string_view name) {
    return !name.empty() && name.find('&') == std::string_view::npos && name != kXmlNamespace &&
           name != kDeclarationsNamespace;
}

}  // namespace

bool PlainXmlParse::run(std::string_view document) {
    if (document.size() > kLargestDocument)
        return false;
    m_scanner = PlainXmlScanner(document);
    m_open.reserve(kUsualCount);
    m_bindings.reserve(kUsualCount);
    m_attributes.reserve(kUsualCount);
    return m_scanner.takeProlog() && takeStartTag() && takeContent() && m_scanner.takeMisc() &&
           m_scanner.atEnd();
}

/// What follows upon the root's start tag, up to the end of the root.
bool PlainXmlParse::takeContent() {
    while (!m_open.empty()) {
        if (m_isRefused || !takeCharacters())
            return false;
        bool isTaken = false;
        if (m_scanner.take("</"))
            isTaken = takeEndTag();
        else if (m_scanner.take("<!--"))
            isTaken = m_scanner.takeComment();
        else
            isTaken = takeStartTag();
        if (!isTaken)
            return false;
    }
    return !m_isRefused;
}

bool PlainXmlParse::takeStartTag() {
    StartTag tag;
    if (!m_scanner.take('<'))
        return false;
    const char* const begin = m_scanner.at();
    if (!m_scanner.takeName(tag.name))
        return false;
    const Open open{m_scanner.since(begin), m_bindings.size()};

    m_attributes.clear();
    while (m_scanner.takeSpace() && !m_scanner.isAt('>') && !m_scanner.isAt('/')) {
        if (!takeAttribute(open))
            return false;
    }
    const bool isEmpty = m_scanner.take('/');
    if (!m_scanner.take('>') || m_open.size() == kMostOpenElements || !bindNames(tag))
        return false;

    m_open.push_back(open);
    tag.attributes = m_attributes;
    startElement(tag);
    if (isEmpty && !m_isRefused)
        close();
    return true;
}

/// Read in place: a copy would have to wait for what has just been written.
bool PlainXmlParse::takeAttribute(const Open& element) {
    if (m_attributes.size() == kMostAttributes)
        return false;
    auto& [name, namespaceName, value] = m_attributes.emplace_back();
    if (!m_scanner.takeName(name))
        return false;
    const bool isPrefixed = name.prefix == kDeclarationsPrefix;
    if (!isPrefixed && (!name.prefix.empty() || name.local != kDeclarationsPrefix))
        return m_scanner.takeAssignment(value);

    const std::string_view prefix = isPrefixed ? name.local : std::string_view();
    m_attributes.pop_back();
    return takeNamespace(prefix, element);
}

/// The value of a declaration.
bool PlainXmlParse::takeNamespace(std::string_view prefix, const Open& element) {
    std::string_view name;
    if (m_bindings.size() == kMostBindings || prefix.starts_with("xml") ||
        !m_scanner.takeAssignment(name) || !isPlainNamespace(name))
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
    if (!m_scanner.take(m_open.back().name))
        return false;
    m_scanner.takeSpace();
    if (!m_scanner.take('>'))
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
    for (;;) {
        std::string_view characters;
        if (m_isRefused || !m_scanner.takeText(characters))
            return false;
        if (!characters.empty())
            text(characters);
        if (m_scanner.isAt('<'))
            return true;
        if (m_scanner.take('\r')) {
            if (!m_scanner.isAt('\n'))
                return false;
            continue;
        }
        m_decoded.clear();
        if (!m_scanner.takeReference(m_decoded))
            return false;
        text(m_decoded);
    }
}

}  // namespace parvel
