#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace parvel {

/// An expression with its prologue of `declare namespace p="name"; ` taken apart. The views are
/// into the text that was split.
struct XPathText {
    using Bindings = std::vector<std::pair<std::string_view, std::string_view>>;

    std::string_view prologue;
    Bindings bindings;  ///< prefix and name
    std::string_view expression;
};

[[nodiscard]] XPathText splitPrologue(std::string_view text);

/// Splits the texts that a document is asked for, most of which have the prologue of the one
/// before.
class XPathSplitter {
public:
    /// Valid until the next text is split.
    const XPathText& split(std::string_view text);

private:
    std::string m_prologue;
    XPathText m_text;
};

/// What an evaluation may cost over a document.
struct XPathScope {
    std::size_t nodes = 0;
    std::size_t textBytes = 0;
    std::size_t depth = 0;
};

/// How many of libxml2's operations the evaluation may take; 0 when it may not begin. Parts of an
/// expression can come out of a book, and a step of one may cost as much as the document is long.
/// Child and attribute steps whose predicates are positions or tests of attributes take linear
/// time, so they are free; anything else is held to a fixed amount of work.
[[nodiscard]] std::size_t xpathOperationLimit(std::string_view expression, const XPathScope& scope);

}  // namespace parvel
