#include "parvel/platform/linux/XmlTreeBudget.h"

#include <algorithm>

namespace parvel {
namespace {

constexpr std::size_t kMaximumElements = 200'000;
/// Of elements, attributes and prefixes, each counted once: libxml2 takes quadratic time over very
/// many different names.
constexpr int kMaximumNames = 50'000;
/// Of bytes and tree together. A book's store metadata file is held beside them.
constexpr std::size_t kMaximumMemory = 160 << 20;
/// libxml2 seeks the namespace of each prefixed attribute from its element up to the root.
constexpr std::size_t kMaximumNamespaceSearch = 50'000'000;
/// What libxml2 and the allocator take for one.
constexpr std::size_t kNodeBytes = 128;
constexpr std::size_t kContentBytes = 32;  ///< besides the content's own length
constexpr std::size_t kAttributeBytes = 112;
constexpr std::size_t kNamespaceBytes = 96;
constexpr std::size_t kNameBytes = 56;

std::size_t lengthOf(const xmlChar* text) {
    return static_cast<std::size_t>(xmlStrlen(text));
}

}  // namespace

bool XmlTreeBudget::startElement(const xmlParserCtxt& parser,
                                 const GuardedXmlParse::StartTag& tag) {
    std::size_t bytes = kNodeBytes + tag.namespaces.size() / 2 * kNamespaceBytes;
    for (std::size_t pair = 0; pair < tag.namespaces.size(); pair += 2)
        bytes += lengthOf(tag.namespaces[pair + 1]);
    const auto way =
        static_cast<std::size_t>(parser.nameNr) + static_cast<std::size_t>(parser.nsNr / 2);
    for (std::size_t slot = 0; slot < tag.attributes.size(); slot += 5) {
        m_namespaceSearch += tag.attributes[slot + 1] ? way : 0;
        const auto length =
            static_cast<std::size_t>(tag.attributes[slot + 4] - tag.attributes[slot + 3]);
        const bool isIdentifier = tag.attributes[slot + 1] == parser.str_xml;
        bytes += kAttributeBytes + kNodeBytes + length + (isIdentifier ? kNodeBytes + length : 0);
        m_scope.textBytes += length;
    }
    m_inText = false;
    m_scope.depth = std::max(m_scope.depth, static_cast<std::size_t>(parser.nameNr) + 1);
    return charge(parser, 1 + tag.namespaces.size() / 2 + tag.attributes.size() / 5 * 2, bytes) &&
           ++m_elements <= kMaximumElements && m_namespaceSearch <= kMaximumNamespaceSearch;
}

bool XmlTreeBudget::text(const xmlParserCtxt& parser, std::string_view characters) {
    // A run of text comes in pieces, and its node grows by doubling.
    const std::size_t bytes = 2 * characters.size() + (m_inText ? 0 : kNodeBytes);
    const std::size_t nodes = m_inText ? 0 : 1;
    m_scope.textBytes += characters.size();
    m_inText = true;
    return charge(parser, nodes, bytes);
}

bool XmlTreeBudget::remark(const xmlParserCtxt& parser, const xmlChar* content) {
    m_inText = false;
    return charge(parser, 1, kNodeBytes + kContentBytes + lengthOf(content));
}

bool XmlTreeBudget::charge(const xmlParserCtxt& parser, std::size_t nodes, std::size_t bytes) {
    m_scope.nodes += nodes;
    m_memory += bytes;
    const int names = xmlDictSize(parser.dict);
    return names <= kMaximumNames &&
           m_memory + static_cast<std::size_t>(names) * kNameBytes <= kMaximumMemory;
}

}  // namespace parvel
