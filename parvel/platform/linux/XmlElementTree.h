#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <libxml/tree.h>

#include "parvel/platform/linux/XmlTreeBudget.h"

namespace parvel {

/// A document's elements, attributes and text in three lists, in document order: a third of what
/// libxml2's tree costs to build, and all that a plain location path needs.
class XmlElementTree {
public:
    /// The names and the namespaces are kept by the tree. A null namespace is none.
    struct Attribute {
        const xmlChar* name;
        const xmlChar* namespaceName;
        std::uint32_t valueBegin;
        std::uint32_t valueEnd;
    };
    struct Element {
        const xmlChar* name;
        const xmlChar* namespaceName;
        std::uint32_t end = 0;  ///< the index behind its last descendant
        std::uint32_t attributesBegin;
        std::uint32_t attributesEnd = 0;
        std::uint32_t textBegin;
        std::uint32_t textEnd = 0;
    };

    /// None when the bytes are not well-formed or exceed the budget of a tree.
    [[nodiscard]] static std::optional<XmlElementTree> parse(const Data& bytes);

    [[nodiscard]] const std::vector<Element>& elements() const { return m_elements; }
    [[nodiscard]] const XPathScope& scope() const { return m_scope; }

    /// The element or attribute behind a handle; null where it is no such node of this tree.
    [[nodiscard]] const Element* elementAt(const void* node) const;
    [[nodiscard]] const Attribute* attributeAt(const void* node) const;

    [[nodiscard]] std::uint32_t indexOf(const Element& element) const;
    [[nodiscard]] const Element& ownerOf(const Attribute& attribute) const;
    /// An attribute in no namespace; null where the element has none of that name.
    [[nodiscard]] const Attribute* attribute(const Element& element, std::string_view name) const;
    [[nodiscard]] std::string_view value(const Attribute& attribute) const;
    /// The text of the element and all its descendants.
    [[nodiscard]] std::string_view text(const Element& element) const;
    [[nodiscard]] std::string_view text() const { return m_text; }

private:
    class Parse;
    struct FreeNames {
        void operator()(xmlDict* names) const { xmlDictFree(names); }
    };

    std::vector<Element> m_elements;
    std::vector<Attribute> m_attributes;
    std::string m_values;
    std::string m_text;
    std::unique_ptr<xmlDict, FreeNames> m_names;  ///< what the names point into
    XPathScope m_scope;
};

}  // namespace parvel
