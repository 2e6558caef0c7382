#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "parvel/platform/linux/XmlElementTree.h"

namespace parvel {

/// A plain location path of XPath 1.0: child steps by name, each with predicates that are positions
/// (`[1]`) or tests of an attribute in no namespace (`[@id="x"]`), and at the end perhaps a step to
/// such an attribute. These take linear time over a tree of elements.
class LocationPath {
public:
    using Bindings = std::vector<std::pair<std::string_view, std::string_view>>;

    /// None for any other expression. What it returns has views into both texts.
    [[nodiscard]] static std::optional<LocationPath> parse(std::string_view expression,
                                                           const Bindings& bindings);

    /// The first node in document order, an element or an attribute of the tree; null for none. A
    /// null context is the document.
    [[nodiscard]] const void* firstIn(const XmlElementTree& tree,
                                      const XmlElementTree::Element* context) const;

private:
    static constexpr std::size_t maximumPredicates = 2;
    struct Predicate {
        std::uint32_t position = 0;  ///< from 1; 0 for a test of an attribute
        std::string_view attribute;
        std::string_view value;
    };
    struct Step {
        bool isAttribute = false;
        std::string_view namespaceName;
        std::string_view name;
        std::array<Predicate, maximumPredicates> predicates;
        std::size_t predicateCount = 0;
    };
    class Search;
    class Reader;

    bool m_isAbsolute = false;
    std::vector<Step> m_steps;
};

}  // namespace parvel
