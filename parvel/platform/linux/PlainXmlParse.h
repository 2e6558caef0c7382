#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "parvel/platform/linux/PlainXmlScanner.h"

namespace parvel {

/// One parse of XML of the plain kind that nearly all documents of books are of, several times
/// faster than libxml2's: UTF-8 with names in ASCII, declared namespaces, no entities but the
/// predefined ones, no processing instructions, no CDATA sections, no internal subset, and nothing
/// in such numbers that a budget of GuardedXmlParse could come into play.
///
/// What it accepts libxml2 accepts, and reports alike. Whatever else a document holds makes it no
/// plain one, well-formed or not: libxml2 tells which.
class PlainXmlParse {
public:
    using Name = PlainXmlScanner::Name;
    struct Attribute {
        Name name;
        std::string_view namespaceName;  ///< empty for none
        std::string_view value;
    };
    /// Declarations of namespaces are not among the attributes.
    struct StartTag {
        Name name;
        std::string_view namespaceName;  ///< empty for none
        std::span<const Attribute> attributes;
    };

    /// In bytes.
    static constexpr std::size_t kLargestDocument = 256 << 10;

    PlainXmlParse(const PlainXmlParse&) = delete;
    PlainXmlParse& operator=(const PlainXmlParse&) = delete;
    virtual ~PlainXmlParse() = default;

    /// False when the document is no plain one or was refused: what was reported then counts for
    /// nothing. Texts that are reported lie in the document or among the values.
    [[nodiscard]] bool run(std::string_view document);

protected:
    PlainXmlParse() = default;

    /// Ends the parse: the derived class doesn't take the document for a plain one.
    void refuse() { m_isRefused = true; }
    /// What holds the values that don't stand in the document as they read.
    [[nodiscard]] TextArena takeValues() { return m_scanner.takeValues(); }

    virtual void startElement(const StartTag& tag) = 0;
    virtual void endElement() = 0;
    /// A piece of the innermost open element's text; valid until this returns.
    virtual void text(std::string_view characters) = 0;

private:
    struct Binding {
        std::string_view prefix;
        std::string_view namespaceName;
    };
    struct Open {
        std::string_view name;      ///< as it stands in the tag
        std::size_t outerBindings;  ///< in scope around the element
    };

    bool takeContent();
    bool takeStartTag();
    bool takeAttribute(const Open& element);
    bool takeNamespace(std::string_view prefix, const Open& element);
    bool takeEndTag();
    bool takeCharacters();

    bool bindNames(StartTag& tag);
    bool findNamespace(std::string_view prefix, std::string_view& namespaceName) const;
    void close();

    PlainXmlScanner m_scanner;
    std::vector<Open> m_open;
    std::vector<Binding> m_bindings;
    std::vector<Attribute> m_attributes;  ///< of the tag being read
    std::string m_decoded;
    bool m_isRefused = false;
};

}  // namespace parvel
