#include "parvel/platform/linux/XPathTree.h"

#include <libxml/xpathInternals.h>

#include <utility>

namespace parvel {
namespace {

const xmlChar* xmlText(const std::string& text) {
    return reinterpret_cast<const xmlChar*>(text.c_str());
}

xmlNode* mutableNode(const xmlNode* node) {
    return const_cast<xmlNode*>(node);  // NOLINT(*-const-cast): libxml2 has no const
}

const xmlNode* nextElement(const xmlNode* node) {
    const auto first = [](const xmlNode* from) {
        while (from && from->type != XML_ELEMENT_NODE)
            from = from->next;
        return from;
    };
    if (const xmlNode* child = first(node->children))
        return child;
    while (node && node->type == XML_ELEMENT_NODE) {
        if (const xmlNode* sibling = first(node->next))
            return sibling;
        node = node->parent;
    }
    return nullptr;
}

}  // namespace

XPathTree::Result XPathTree::evaluate(const xmlNode* context, const XPathText& text) {
    const QuietXml quiet;
    Object result;
    if (prepare(text)) {
        m_context->node = mutableNode(context);
        result.reset(xmlXPathEval(xmlText(std::string(text.expression)), m_context.get()));
    }
    if (!result || result->type != XPATH_NODESET)
        return {};
    return {true, firstOf(std::move(result))};
}

const xmlNode* XPathTree::documentNode() const {
    return reinterpret_cast<const xmlNode*>(m_tree.document.get());
}

const xmlNode* XPathTree::elementAt(std::uint32_t index) const {
    const xmlNode* element = nextElement(documentNode());
    for (; element && index > 0; --index)
        element = nextElement(element);
    return element;
}

std::string XPathTree::stringValue(const xmlNode* node) {
    xmlChar* value = xmlXPathCastNodeToString(mutableNode(node));
    std::string result = value ? reinterpret_cast<const char*>(value) : "";
    xmlFree(value);
    return result;
}

const xmlAttr* XPathTree::attribute(const xmlNode* element, std::string_view name) {
    if (element->type != XML_ELEMENT_NODE)
        return nullptr;
    for (const xmlAttr* attribute = element->properties; attribute; attribute = attribute->next) {
        if (!attribute->ns && name == reinterpret_cast<const char*>(attribute->name))
            return attribute;
    }
    return nullptr;
}

/// Makes the context ready: its prefixes bound, its limit set.
bool XPathTree::prepare(const XPathText& text) {
    const std::size_t limit = xpathOperationLimit(text.expression, m_tree.scope);
    if (limit == 0)
        return false;
    if (!m_context)
        m_context.reset(xmlXPathNewContext(m_tree.document.get()));
    if (!m_context)
        return false;
    if (m_prologue != text.prologue) {
        m_prologue.clear();
        xmlXPathRegisteredNsCleanup(m_context.get());
        for (const auto& [prefix, name] : text.bindings) {
            if (xmlXPathRegisterNs(m_context.get(), xmlText(std::string(prefix)),
                                   xmlText(std::string(name))) != 0)
                return false;
        }
        m_prologue = text.prologue;
    }
    m_context->opLimit = limit;
    m_context->opCount = 0;
    return true;
}

/// libxml2 sorts the nodes of a result into document order.
const xmlNode* XPathTree::firstOf(Object result) {
    const xmlNodeSet* nodes = result->nodesetval;
    if (!nodes || nodes->nodeNr == 0)
        return nullptr;
    const xmlNode* first = nodes->nodeTab[0];
    if (first->type == XML_NAMESPACE_DECL)
        m_namespaceResults.push_back(std::move(result));
    return first;
}

}  // namespace parvel
