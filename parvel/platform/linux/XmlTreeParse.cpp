#include "parvel/platform/linux/XmlTreeParse.h"

#include <libxml/SAX2.h>

#include <algorithm>
#include <utility>

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

std::optional<XmlTree> XmlTreeParse::run(const Data& bytes) {
    m_memory = bytes.size();
    if (!GuardedXmlParse::run(bytes, 0))
        return std::nullopt;
    m_tree.document.reset(std::exchange(parser()->myDoc, nullptr));
    return std::move(m_tree);
}

void XmlTreeParse::startElement(const StartTag& tag) {
    std::size_t bytes = kNodeBytes + tag.namespaces.size() / 2 * kNamespaceBytes;
    for (std::size_t pair = 0; pair < tag.namespaces.size(); pair += 2)
        bytes += lengthOf(tag.namespaces[pair + 1]);
    const auto way =
        static_cast<std::size_t>(parser()->nodeNr) + static_cast<std::size_t>(parser()->nsNr / 2);
    for (std::size_t slot = 0; slot < tag.attributes.size(); slot += 5) {
        m_namespaceSearch += tag.attributes[slot + 1] ? way : 0;
        const auto length =
            static_cast<std::size_t>(tag.attributes[slot + 4] - tag.attributes[slot + 3]);
        const bool isIdentifier = tag.attributes[slot + 1] == parser()->str_xml;
        bytes += kAttributeBytes + kNodeBytes + length + (isIdentifier ? kNodeBytes + length : 0);
        m_tree.scope.textBytes += length;
    }
    charge(1 + tag.namespaces.size() / 2 + tag.attributes.size() / 5 * 2, bytes);
    if (++m_elements > kMaximumElements || m_namespaceSearch > kMaximumNamespaceSearch)
        stop();
    if (isStopped())
        return;
    m_inText = false;

    // The values are final: without this libxml2 would look for references in them.
    parser()->replaceEntities = 1;
    xmlSAX2StartElementNs(parser(), tag.name, tag.prefix, tag.namespaceName,
                          static_cast<int>(tag.namespaces.size() / 2), tag.namespaces.data(),
                          static_cast<int>(tag.attributes.size() / 5), 0, tag.attributes.data());
    parser()->replaceEntities = 0;
    m_tree.scope.depth = std::max(m_tree.scope.depth, static_cast<std::size_t>(parser()->nodeNr));
}

void XmlTreeParse::endElement() {
    m_inText = false;
    xmlSAX2EndElementNs(parser(), nullptr, nullptr, nullptr);
}

void XmlTreeParse::text(std::string_view characters) {
    // A run of text comes in pieces, and its node grows by doubling.
    charge(m_inText ? 0 : 1, 2 * characters.size() + (m_inText ? 0 : kNodeBytes));
    m_tree.scope.textBytes += characters.size();
    m_inText = true;
    xmlSAX2Characters(parser(), reinterpret_cast<const xmlChar*>(characters.data()),
                      static_cast<int>(characters.size()));
}

void XmlTreeParse::comment(const xmlChar* text) {
    charge(1, kNodeBytes + kContentBytes + lengthOf(text));
    m_inText = false;
    xmlSAX2Comment(parser(), text);
}

void XmlTreeParse::processingInstruction(const xmlChar* target, const xmlChar* data) {
    charge(1, kNodeBytes + kContentBytes + lengthOf(data));
    m_inText = false;
    xmlSAX2ProcessingInstruction(parser(), target, data);
}

void XmlTreeParse::charge(std::size_t nodes, std::size_t bytes) {
    m_tree.scope.nodes += nodes;
    m_memory += bytes;
    const int names = xmlDictSize(parser()->dict);
    if (names > kMaximumNames ||
        m_memory + static_cast<std::size_t>(names) * kNameBytes > kMaximumMemory)
        stop();
}

}  // namespace parvel
