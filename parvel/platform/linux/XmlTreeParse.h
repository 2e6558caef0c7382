#pragma once

#include <memory>
#include <optional>

#include "parvel/platform/linux/XmlTreeBudget.h"

namespace parvel {

struct FreeXmlTree {
    void operator()(xmlDoc* document) const { xmlFreeDoc(document); }
};

struct XmlTree {
    std::unique_ptr<xmlDoc, FreeXmlTree> document;
    XPathScope scope;
};

/// Builds libxml2's tree of a document, within the budget of a tree.
class XmlTreeParse : private GuardedXmlParse {
public:
    explicit XmlTreeParse(const Data& bytes) : m_bytes(bytes), m_budget(bytes.size()) {}

    [[nodiscard]] std::optional<XmlTree> run();

private:
    void startElement(const StartTag& tag) override;
    void endElement() override;
    void text(std::string_view characters) override;
    void comment(const xmlChar* text) override;
    void processingInstruction(const xmlChar* target, const xmlChar* data) override;

    const Data& m_bytes;
    XmlTreeBudget m_budget;
};

}  // namespace parvel
