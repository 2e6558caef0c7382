#pragma once

#include <cstddef>
#include <string_view>

#include "parvel/platform/linux/GuardedXmlParse.h"
#include "parvel/platform/linux/XPathExpression.h"

namespace parvel {

/// What the tree of a document may take: at most 200,000 elements, and a fixed amount of memory for
/// the bytes and libxml2's tree of them together. Counted as the parser reports, before anything is
/// built; each call tells whether the document is still within.
class XmlTreeBudget {
public:
    explicit XmlTreeBudget(std::size_t documentBytes) : m_memory(documentBytes) {}

    [[nodiscard]] bool startElement(const xmlParserCtxt& parser,
                                    const GuardedXmlParse::StartTag& tag);
    void endElement() { m_inText = false; }
    [[nodiscard]] bool text(const xmlParserCtxt& parser, std::string_view characters);
    /// A comment or a processing instruction.
    [[nodiscard]] bool remark(const xmlParserCtxt& parser, const xmlChar* content);

    [[nodiscard]] const XPathScope& scope() const { return m_scope; }

private:
    bool charge(const xmlParserCtxt& parser, std::size_t nodes, std::size_t bytes);

    XPathScope m_scope;
    std::size_t m_memory;
    std::size_t m_elements = 0;
    std::size_t m_namespaceSearch = 0;
    bool m_inText = false;
};

}  // namespace parvel
