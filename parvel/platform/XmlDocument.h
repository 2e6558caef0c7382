#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/URL.h"

namespace parvel {

class XmlDocument;

/// A node of an XML document: a handle that keeps its document alive.
struct XmlNode {
    std::shared_ptr<const XmlDocument> document;
    const void* node = nullptr;  ///< the document's own; null is the document node
};

/// The first node of an XPath evaluation.
struct XPathResult {
    bool evaluated = false;        ///< false when the expression could not be evaluated
    std::optional<XmlNode> first;  ///< the first node in document order; none for no match
};

/// A parsed XML 1.0 document with namespaces. Reading one is for one thread at a time.
class XmlDocument : public std::enable_shared_from_this<XmlDocument> {
public:
    virtual ~XmlDocument() = default;

    /// Evaluates an XPath 1.0 expression with the node as its context. A prologue of
    /// `declare namespace p="name"; ` binds the prefixes. The result must be a node set; anything
    /// else, and an expression that does not evaluate, is a failure with a general error "corrupt".
    [[nodiscard]] virtual XPathResult evaluate(const void* context, std::string_view expression,
                                               ErrorOut error = nullptr) const = 0;
    /// The node's string value (XPath 1.0, 5).
    [[nodiscard]] virtual std::string stringValue(const void* node) const = 0;
    /// An attribute in no namespace of an element; none where it has no such attribute.
    [[nodiscard]] virtual std::optional<std::string> attribute(const void* element,
                                                               std::string_view name) const = 0;

    [[nodiscard]] XmlNode root() const { return {shared_from_this(), nullptr}; }
};

/// Parses XML. Nothing is fetched, no external entity is opened, declared internal entities read as
/// their text within a budget.
class XmlParser {
public:
    virtual ~XmlParser() = default;

    /// None, with a general error "corrupt" and the URL that is named for it, when the bytes are
    /// not well-formed, or exceed 200,000 elements or 256 attributes an element.
    [[nodiscard]] virtual std::shared_ptr<const XmlDocument> parse(const Data& bytes,
                                                                   const URL& url,
                                                                   ErrorOut error = nullptr) = 0;

    static XmlParser& host();
};

}  // namespace parvel
