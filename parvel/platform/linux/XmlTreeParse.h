#pragma once

#include <cstddef>
#include <memory>
#include <optional>

#include "parvel/platform/linux/GuardedXmlParse.h"
#include "parvel/platform/linux/XPathExpression.h"

namespace parvel {

struct FreeXmlTree {
    void operator()(xmlDoc* document) const { xmlFreeDoc(document); }
};

struct XmlTree {
    std::unique_ptr<xmlDoc, FreeXmlTree> document;
    XPathScope scope;
};

/// Builds a tree of at most 200,000 elements. The bytes and the tree together stay within a fixed
/// amount of memory; the parse stops before the tree would exceed it.
class XmlTreeParse : private GuardedXmlParse {
public:
    [[nodiscard]] std::optional<XmlTree> run(const Data& bytes);

private:
    void startElement(const StartTag& tag) override;
    void endElement() override;
    void text(std::string_view characters) override;
    void comment(const xmlChar* text) override;
    void processingInstruction(const xmlChar* target, const xmlChar* data) override;

    void charge(std::size_t nodes, std::size_t bytes);

    XmlTree m_tree;
    std::size_t m_memory = 0;
    std::size_t m_elements = 0;
    std::size_t m_namespaceSearch = 0;
    bool m_inText = false;
};

}  // namespace parvel
