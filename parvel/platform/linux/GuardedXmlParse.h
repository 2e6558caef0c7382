#pragma once

#include <cstddef>
#include <exception>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include <libxml/parser.h>

#include "parvel/foundation/Data.h"

namespace parvel {

struct FreeParserContext {
    void operator()(xmlParserCtxt* context) const;
};

/// Keeps what libxml2 has to say on this thread from the application's handlers and from standard
/// error, as long as it lives.
class QuietXml {
public:
    QuietXml();
    ~QuietXml();
    QuietXml(const QuietXml&) = delete;
    QuietXml& operator=(const QuietXml&) = delete;

private:
    xmlStructuredErrorFunc m_structured;
    void* m_structuredContext;
    xmlGenericErrorFunc m_generic;
    void* m_genericContext;
};

/// One parse of hostile XML by libxml2, held within budgets while it runs: what exceeds one stops
/// the parser. A derived class takes what the parser reports, in document order.
///
/// The bytes are handed to the parser in small pieces. That keeps memory low, and it is where a
/// start tag of very many attributes is stopped: libxml2 takes quadratic time over them before it
/// reports the tag. The same holds for what a document type declaration may list.
///
/// Declared internal entities are reported as their text; markup in them is left out. External
/// entities are empty; nothing is opened.
class GuardedXmlParse {
public:
    /// The attributes as libxml2 lays them out, five pointers each: local name, prefix, namespace
    /// name, begin and end of the value. DTD defaults are among them.
    struct StartTag {
        const xmlChar* name;
        const xmlChar* prefix;
        const xmlChar* namespaceName;
        std::span<const xmlChar*> namespaces;  ///< prefix and name of each
        std::span<const xmlChar*> attributes;
    };

    GuardedXmlParse(const GuardedXmlParse&) = delete;
    GuardedXmlParse& operator=(const GuardedXmlParse&) = delete;
    virtual ~GuardedXmlParse() = default;

    /// True when the document is well-formed and stayed within the budgets. What a handler throws
    /// passes out.
    [[nodiscard]] bool run(const Data& bytes, int options);

protected:
    GuardedXmlParse();

    [[nodiscard]] xmlParserCtxt* parser() const { return m_parser.get(); }
    /// Ends the parse without success; no further event is reported. The parser goes on over the
    /// bytes that it has: what it reported stays valid until the handler returns.
    void stop() { m_stopped = true; }
    [[nodiscard]] bool isStopped() const { return m_stopped; }

    virtual void startElement(const StartTag& tag) = 0;
    virtual void endElement() = 0;
    virtual void text(std::string_view characters) = 0;
    virtual void comment(const xmlChar*) {}
    virtual void processingInstruction(const xmlChar*, const xmlChar*) {}

private:
    struct Callbacks;

    int read(char* buffer, int size);
    bool withinReadingBudgets(int size);
    bool charge(std::size_t& spent, std::size_t cost, std::size_t limit);
    std::span<const xmlChar*> replacingReferences(std::span<const xmlChar*> attributes);
    std::string replacingReferences(const xmlChar* begin, const xmlChar* end);
    template <class Handler>
    void deliver(Handler&& handler);

    std::unique_ptr<xmlParserCtxt, FreeParserContext> m_parser;
    std::vector<Data::Bytes> m_ranges;  ///< what has not been read yet
    std::size_t m_nextRange = 0;
    std::size_t m_doctypeBytes = 0;
    std::size_t m_entityBytes = 0;
    std::size_t m_parameterEntityBytes = 0;
    /// Of the tag being reported, where a value of it held references.
    std::vector<const xmlChar*> m_attributes;
    std::vector<std::string> m_values;
    bool m_isWhole = false;  ///< whether the parser gets the document in one piece
    bool m_stopped = false;
    std::exception_ptr m_thrown;
};

}  // namespace parvel
