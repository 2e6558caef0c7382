#include "parvel/platform/XmlDocument.h"

#include <malloc.h>

#include <utility>

#include "parvel/foundation/Error.h"
#include "parvel/platform/linux/LocationPath.h"
#include "parvel/platform/linux/XPathTree.h"
#include "parvel/platform/linux/XmlElementTree.h"

namespace parvel {
namespace {

constexpr std::size_t kManyNodes = 100'000;

/// A plain location path is followed through the list of elements. Any other expression has
/// libxml2's own tree built from the same bytes, once; the nodes that it finds belong to that tree.
class HostXmlDocument final : public XmlDocument {
public:
    HostXmlDocument(const Data& bytes, XmlElementTree elements)
        : m_bytes(bytes), m_elements(std::move(elements)) {}
    ~HostXmlDocument() override;

    XPathResult evaluate(const void* context, std::string_view expression,
                         ErrorOut error) const override;
    std::string stringValue(const void* node) const override;
    std::optional<std::string> attribute(const void* element, std::string_view name) const override;

private:
    using Element = XmlElementTree::Element;
    using Attribute = XmlElementTree::Attribute;

    XPathTree::Result evaluateInTree(const void* context, const XPathText& text) const;
    const xmlNode* treeNodeFrom(const void* node) const;

    Data m_bytes;
    std::optional<XmlElementTree> m_elements;
    mutable XPathSplitter m_splitter;
    mutable std::optional<XPathTree> m_tree;
};

/// The allocator keeps the many small pieces of a large tree; they are given back, for a cover may
/// be read next.
HostXmlDocument::~HostXmlDocument() {
    const bool isLarge = m_elements->scope().nodes > kManyNodes;
    m_tree.reset();
    m_elements.reset();
    if (isLarge)
        malloc_trim(0);
}

XPathResult HostXmlDocument::evaluate(const void* context, std::string_view expression,
                                      ErrorOut error) const {
    const XPathText& text = m_splitter.split(expression);
    const Element* element = m_elements->elementAt(context);
    const void* first = nullptr;
    bool evaluated = false;
    if (element || !context) {
        if (const auto path = LocationPath::parse(text.expression, text.bindings)) {
            first = path->firstIn(*m_elements, element);
            evaluated = true;
        }
    }
    if (!evaluated) {
        const XPathTree::Result result = evaluateInTree(context, text);
        first = result.first;
        evaluated = result.evaluated;
    }
    if (!evaluated) {
        assign(error, makeFileError(PVFileErrorCode::Corrupt, std::nullopt));
        return {};
    }
    if (!first)
        return {true, std::nullopt};
    return {true, XmlNode{shared_from_this(), first}};
}

std::string HostXmlDocument::stringValue(const void* node) const {
    if (!node)
        return std::string(m_elements->text());
    if (const Element* element = m_elements->elementAt(node))
        return std::string(m_elements->text(*element));
    if (const Attribute* attribute = m_elements->attributeAt(node))
        return std::string(attribute->value);
    return XPathTree::stringValue(static_cast<const xmlNode*>(node));
}

std::optional<std::string> HostXmlDocument::attribute(const void* element,
                                                      std::string_view name) const {
    if (const Element* own = m_elements->elementAt(element)) {
        const Attribute* found = m_elements->attribute(*own, name);
        return found ? std::optional<std::string>(found->value) : std::nullopt;
    }
    if (!element || m_elements->attributeAt(element))
        return std::nullopt;
    const xmlAttr* found = XPathTree::attribute(static_cast<const xmlNode*>(element), name);
    if (!found)
        return std::nullopt;
    return XPathTree::stringValue(reinterpret_cast<const xmlNode*>(found));
}

XPathTree::Result HostXmlDocument::evaluateInTree(const void* context,
                                                  const XPathText& text) const {
    if (!m_tree) {
        std::optional<XmlTree> tree = XmlTreeParse(m_bytes).run();
        if (!tree)
            return {};
        m_tree.emplace(std::move(*tree));
    }
    const xmlNode* node = treeNodeFrom(context);
    return node ? m_tree->evaluate(node, text) : XPathTree::Result{};
}

const xmlNode* HostXmlDocument::treeNodeFrom(const void* node) const {
    if (!node)
        return m_tree->documentNode();
    if (const Element* element = m_elements->elementAt(node))
        return m_tree->elementAt(m_elements->indexOf(*element));
    if (const Attribute* attribute = m_elements->attributeAt(node)) {
        const Element& owner = m_elements->ownerOf(*attribute);
        const xmlAttr* found =
            XPathTree::attribute(m_tree->elementAt(m_elements->indexOf(owner)), attribute->name);
        return reinterpret_cast<const xmlNode*>(found);
    }
    return static_cast<const xmlNode*>(node);
}

class HostXmlParser final : public XmlParser {
public:
    std::shared_ptr<const XmlDocument> parse(const Data& bytes, const URL& url,
                                             ErrorOut error) override {
        std::optional<XmlElementTree> elements = XmlElementTree::parse(bytes);
        if (!elements)
            return fail(error, makeFileError(PVFileErrorCode::Corrupt, url));
        return std::make_shared<const HostXmlDocument>(bytes, std::move(*elements));
    }
};

}  // namespace

XmlParser& XmlParser::host() {
    static HostXmlParser parser;
    return parser;
}

}  // namespace parvel
