#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <libxml/tree.h>

#include "parvel/foundation/Data.h"
#include "parvel/platform/linux/TextArena.h"
#include "parvel/platform/linux/XmlTreeBudget.h"

namespace parvel {

/// A document's elements, attributes and text in three lists, in document order: a third of what
/// libxml2's tree costs to build, and all that a plain location path needs.
class XmlElementTree {
public:
    /// The texts are kept by the tree. An empty namespace is none.
    struct Attribute {
        std::string_view name;
        std::string_view namespaceName;
        std::string_view value;
    };
    struct Element {
        std::string_view name;
        std::string_view namespaceName;
        std::uint32_t end = 0;  ///< the index behind its last descendant
        std::uint32_t attributesBegin = 0;
        std::uint32_t attributesEnd = 0;
        std::uint32_t textBegin = 0;
        std::uint32_t textEnd = 0;
    };

    /// None when the bytes are not well-formed or exceed the budget of a tree.
    [[nodiscard]] static std::optional<XmlElementTree> parse(const Data& bytes);
    /// The same of a document of the plain kind; none for any other.
    [[nodiscard]] static std::optional<XmlElementTree> parsePlain(const Data& bytes);
    /// The same of any document, by libxml2.
    [[nodiscard]] static std::optional<XmlElementTree> parseGuarded(const Data& bytes);

    [[nodiscard]] const std::vector<Element>& elements() const { return m_elements; }
    [[nodiscard]] const std::vector<Attribute>& attributes() const { return m_attributes; }
    [[nodiscard]] const XPathScope& scope() const { return m_scope; }

    /// The element or attribute behind a handle; null where it is no such node of this tree.
    [[nodiscard]] const Element* elementAt(const void* node) const;
    [[nodiscard]] const Attribute* attributeAt(const void* node) const;

    [[nodiscard]] std::uint32_t indexOf(const Element& element) const;
    [[nodiscard]] const Element& ownerOf(const Attribute& attribute) const;
    /// An attribute in no namespace; null where the element has none of that name.
    [[nodiscard]] const Attribute* attribute(const Element& element, std::string_view name) const;
    /// The text of the element and all its descendants.
    [[nodiscard]] std::string_view text(const Element& element) const;
    [[nodiscard]] std::string_view text() const { return m_text; }

private:
    class Builder;
    class GuardedParse;
    class PlainParse;
    struct FreeNames {
        void operator()(xmlDict* names) const { xmlDictFree(names); }
    };

    std::vector<Element> m_elements;
    std::vector<Attribute> m_attributes;
    std::string m_text;
    XPathScope m_scope;

    // What holds the names and values.
    Data m_bytes;
    std::vector<std::uint8_t> m_joinedBytes;  ///< where the bytes lie in several ranges
    TextArena m_values;
    std::unique_ptr<xmlDict, FreeNames> m_names;
};

}  // namespace parvel
