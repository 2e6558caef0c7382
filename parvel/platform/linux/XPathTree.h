#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <libxml/xpath.h>

#include "parvel/platform/linux/XmlTreeParse.h"

namespace parvel {

/// libxml2's tree of a document, for any XPath 1.0 expression.
class XPathTree {
public:
    explicit XPathTree(XmlTree tree) : m_tree(std::move(tree)) {}

    struct Result {
        bool evaluated = false;
        const xmlNode* first = nullptr;  ///< in document order; null for no match
    };
    [[nodiscard]] Result evaluate(const xmlNode* context, const XPathText& text);

    [[nodiscard]] const xmlNode* documentNode() const;
    /// The element of that index in document order.
    [[nodiscard]] const xmlNode* elementAt(std::uint32_t index) const;

    [[nodiscard]] static std::string stringValue(const xmlNode* node);
    /// The attribute in no namespace; null where the node has none of that name.
    [[nodiscard]] static const xmlAttr* attribute(const xmlNode* element, std::string_view name);

private:
    struct FreeContext {
        void operator()(xmlXPathContext* context) const { xmlXPathFreeContext(context); }
    };
    struct FreeObject {
        void operator()(xmlXPathObject* object) const { xmlXPathFreeObject(object); }
    };
    using Object = std::unique_ptr<xmlXPathObject, FreeObject>;

    bool prepare(const XPathText& text);
    const xmlNode* firstOf(Object result);

    XmlTree m_tree;
    std::unique_ptr<xmlXPathContext, FreeContext> m_context;
    std::string m_prologue;  ///< whose prefixes are bound in the context
    /// What holds the namespace nodes that were handed out: they are no part of the tree.
    std::vector<Object> m_namespaceResults;
};

}  // namespace parvel
