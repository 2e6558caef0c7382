#include <libxml/xpath.h>
#include <libxml/xpathInternals.h>
#include <malloc.h>

#include <utility>
#include <vector>

#include "parvel/foundation/Error.h"
#include "parvel/platform/XmlDocument.h"
#include "parvel/platform/linux/XPathExpression.h"
#include "parvel/platform/linux/XmlTreeParse.h"

namespace parvel {
namespace {

constexpr std::size_t kManyNodes = 100'000;

struct FreeXPathContext {
    void operator()(xmlXPathContext* context) const { xmlXPathFreeContext(context); }
};

struct FreeXPathObject {
    void operator()(xmlXPathObject* object) const { xmlXPathFreeObject(object); }
};

using XPathObject = std::unique_ptr<xmlXPathObject, FreeXPathObject>;

const xmlChar* xmlText(const std::string& text) {
    return reinterpret_cast<const xmlChar*>(text.c_str());
}

class Libxml2Document final : public XmlDocument {
public:
    explicit Libxml2Document(XmlTree tree) : m_tree(std::move(tree)) {}
    ~Libxml2Document() override;

    XPathResult evaluate(const void* context, std::string_view expression,
                         ErrorOut error) const override;
    std::string stringValue(const void* node) const override;
    std::optional<std::string> attribute(const void* element, std::string_view name) const override;

private:
    xmlNode* nodeFrom(const void* node) const;
    bool prepare(const XPathText& text) const;
    const xmlNode* firstOf(XPathObject result) const;

    XmlTree m_tree;
    mutable std::unique_ptr<xmlXPathContext, FreeXPathContext> m_context;
    mutable std::string m_prologue;  ///< whose prefixes are bound in the context
    /// What holds the namespace nodes that were handed out: they are no part of the tree.
    mutable std::vector<XPathObject> m_namespaceResults;
};

/// The allocator keeps the many small pieces of a large tree; they are given back, for a cover may
/// be read next.
Libxml2Document::~Libxml2Document() {
    const bool isLarge = m_tree.scope.nodes > kManyNodes;
    m_namespaceResults.clear();
    m_context.reset();
    m_tree.document.reset();
    if (isLarge)
        malloc_trim(0);
}

XPathResult Libxml2Document::evaluate(const void* context, std::string_view expression,
                                      ErrorOut error) const {
    const QuietXml quiet;
    const XPathText text = splitPrologue(expression);
    XPathObject result;
    if (prepare(text)) {
        m_context->node = nodeFrom(context);
        result.reset(xmlXPathEval(xmlText(text.expression), m_context.get()));
    }
    if (!result || result->type != XPATH_NODESET) {
        assign(error, makeFileError(PVFileErrorCode::Corrupt, std::nullopt));
        return {};
    }
    const xmlNode* first = firstOf(std::move(result));
    if (!first)
        return {true, std::nullopt};
    return {true, XmlNode{shared_from_this(), first}};
}

std::string Libxml2Document::stringValue(const void* node) const {
    xmlChar* value = xmlXPathCastNodeToString(nodeFrom(node));
    std::string result = value ? reinterpret_cast<const char*>(value) : "";
    xmlFree(value);
    return result;
}

std::optional<std::string> Libxml2Document::attribute(const void* element,
                                                      std::string_view name) const {
    const xmlNode* node = nodeFrom(element);
    if (node->type != XML_ELEMENT_NODE)
        return std::nullopt;
    for (const xmlAttr* attribute = node->properties; attribute; attribute = attribute->next) {
        if (!attribute->ns && name == reinterpret_cast<const char*>(attribute->name))
            return stringValue(attribute);
    }
    return std::nullopt;
}

xmlNode* Libxml2Document::nodeFrom(const void* node) const {
    if (!node)
        return reinterpret_cast<xmlNode*>(m_tree.document.get());
    void* const handle = const_cast<void*>(node);  // NOLINT(*-const-cast): libxml2 has no const
    return static_cast<xmlNode*>(handle);
}

/// Makes the context ready: its prefixes bound, its limit set.
bool Libxml2Document::prepare(const XPathText& text) const {
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
const xmlNode* Libxml2Document::firstOf(XPathObject result) const {
    const xmlNodeSet* nodes = result->nodesetval;
    if (!nodes || nodes->nodeNr == 0)
        return nullptr;
    const xmlNode* first = nodes->nodeTab[0];
    if (first->type == XML_NAMESPACE_DECL)
        m_namespaceResults.push_back(std::move(result));
    return first;
}

class Libxml2Parser final : public XmlParser {
public:
    std::shared_ptr<const XmlDocument> parse(const Data& bytes, const URL& url,
                                             ErrorOut error) override {
        std::optional<XmlTree> tree = XmlTreeParse().run(bytes);
        if (!tree)
            return fail(error, makeFileError(PVFileErrorCode::Corrupt, url));
        return std::make_shared<const Libxml2Document>(std::move(*tree));
    }
};

}  // namespace

XmlParser& XmlParser::host() {
    static Libxml2Parser parser;
    return parser;
}

}  // namespace parvel
