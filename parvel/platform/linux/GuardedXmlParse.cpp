#include "parvel/platform/linux/GuardedXmlParse.h"

#include <libxml/SAX2.h>
#include <libxml/parserInternals.h>

#include <algorithm>
#include <cstring>

namespace parvel {
namespace {

constexpr std::size_t kMaximumAttributes = 256;
constexpr int kMaximumNamespacesInScope = 128;
/// In slots of five an attribute, and well above kMaximumAttributes: the array grows by doubling.
constexpr int kMaximumAttributeSlots = 3000;
/// No tag of one this long can hold enough attributes to take long.
constexpr std::size_t kSmallDocument = 16 << 10;
constexpr std::size_t kMaximumDoctypeBytes = 64 << 10;
constexpr std::size_t kMaximumParameterEntityBytes = 64 << 10;
constexpr std::size_t kMaximumEntityBytes = 16 << 20;
constexpr std::size_t kCostOfReference = 64;
constexpr int kMaximumEntityDepth = 40;

void ignoreError(void*, xmlErrorPtr) {}
void ignoreMessage(void*, const char*, ...) {}

std::size_t lengthOf(const xmlEntity* entity) {
    return entity && entity->length > 0 ? static_cast<std::size_t>(entity->length) : 0;
}

bool holdsReference(const xmlChar* begin, const xmlChar* end) {
    return std::memchr(begin, '&', static_cast<std::size_t>(end - begin)) != nullptr;
}

const xmlNode* nextInTree(const xmlNode* node, const void* top) {
    if (node->type == XML_ELEMENT_NODE && node->children)
        return node->children;
    while (!node->next) {
        node = node->parent;
        if (!node || node == top)
            return nullptr;
    }
    return node->next;
}

/// Makes the entity's children its text alone, as one node, so that further references cost no
/// further parse.
const xmlChar* flattenedText(xmlDoc* document, xmlEntity* entity) {
    if (entity->children && entity->children->type == XML_TEXT_NODE && !entity->children->next)
        return entity->children->content;
    std::string text;
    for (const xmlNode* node = entity->children; node; node = nextInTree(node, entity)) {
        const bool isText = node->type == XML_TEXT_NODE || node->type == XML_CDATA_SECTION_NODE;
        if (isText && node->content)
            text += reinterpret_cast<const char*>(node->content);
    }
    xmlFreeNodeList(entity->children);
    xmlNode* node = xmlNewDocTextLen(document, reinterpret_cast<const xmlChar*>(text.data()),
                                     static_cast<int>(text.size()));
    entity->children = entity->last = node;
    if (!node)
        return nullptr;
    node->parent = reinterpret_cast<xmlNode*>(entity);
    entity->owner = 1;
    return node->content;
}

}  // namespace

void FreeParserContext::operator()(xmlParserCtxt* context) const {
    if (context->myDoc)
        xmlFreeDoc(context->myDoc);
    xmlFreeParserCtxt(context);
}

// libxml2 keeps these for each thread. Deliberate: some of its complaints go to the generic handler
// alone, whatever the parser's options say.
QuietXml::QuietXml()
    : m_structured(xmlStructuredError),
      m_structuredContext(xmlStructuredErrorContext),
      m_generic(xmlGenericError),
      m_genericContext(xmlGenericErrorContext) {
    xmlSetStructuredErrorFunc(nullptr, ignoreError);
    xmlSetGenericErrorFunc(nullptr, ignoreMessage);
}

QuietXml::~QuietXml() {
    xmlSetStructuredErrorFunc(m_structuredContext, m_structured);
    xmlSetGenericErrorFunc(m_genericContext, m_generic);
}

/// What libxml2 calls. Within an entity's first parse the context is one of the parser's own, and
/// the tree made there is the entity's.
struct GuardedXmlParse::Callbacks {
    static GuardedXmlParse& guard(void* context) {
        return *static_cast<GuardedXmlParse*>(static_cast<xmlParserCtxt*>(context)->_private);
    }
    static bool inEntity(void* context) { return context != guard(context).parser(); }

    /// Once the encoding is known, a document that needs no decoding lies in the parser's buffer
    /// as far as it goes. Without this the parser would ask for more at nearly every token.
    static void startDocument(void* context) {
        xmlSAX2StartDocument(context);
        xmlParserInputBuffer* buffer = guard(context).parser()->input->buf;
        if (guard(context).m_isWhole && buffer && !buffer->encoder)
            buffer->readcallback = nullptr;
    }

    static void startElement(void* context, const xmlChar* name, const xmlChar* prefix,
                             const xmlChar* namespaceName, int namespaceCount,
                             const xmlChar** namespaces, int attributeCount, int,
                             const xmlChar** attributes) {
        GuardedXmlParse& self = guard(context);
        const auto pairs = static_cast<std::size_t>(namespaceCount) * 2;
        const auto slots = static_cast<std::size_t>(attributeCount) * 5;
        const bool tooMany = pairs / 2 + slots / 5 > kMaximumAttributes ||
                             self.parser()->nsNr / 2 > kMaximumNamespacesInScope;
        if (tooMany)
            return self.stop();
        if (inEntity(context))
            return xmlSAX2StartElementNs(context, name, prefix, namespaceName, namespaceCount,
                                         namespaces, attributeCount, 0, attributes);
        self.deliver([&] {
            const auto values = self.replacingReferences({attributes, slots});
            if (!self.m_stopped)
                self.startElement({name, prefix, namespaceName, {namespaces, pairs}, values});
        });
    }

    static void endElement(void* context, const xmlChar* name, const xmlChar* prefix,
                           const xmlChar* namespaceName) {
        if (inEntity(context))
            return xmlSAX2EndElementNs(context, name, prefix, namespaceName);
        guard(context).deliver([&] { guard(context).endElement(); });
    }

    static void characters(void* context, const xmlChar* text, int length) {
        if (inEntity(context))
            return xmlSAX2Characters(context, text, length);
        guard(context).deliver([&] {
            guard(context).text(
                {reinterpret_cast<const char*>(text), static_cast<std::size_t>(length)});
        });
    }

    static void comment(void* context, const xmlChar* text) {
        if (!inEntity(context))
            guard(context).deliver([&] { guard(context).comment(text); });
    }

    static void processingInstruction(void* context, const xmlChar* target, const xmlChar* data) {
        if (!inEntity(context))
            guard(context).deliver([&] { guard(context).processingInstruction(target, data); });
    }

    static xmlEntity* getEntity(void* context, const xmlChar* name) {
        GuardedXmlParse& self = guard(context);
        xmlEntity* entity = xmlSAX2GetEntity(context, name);
        const bool tooDeep = static_cast<xmlParserCtxt*>(context)->depth > kMaximumEntityDepth;
        if (tooDeep || !self.charge(self.m_entityBytes, kCostOfReference + lengthOf(entity),
                                    kMaximumEntityBytes)) {
            // Null alone has the parser look the entity up by itself.
            self.stop();
            xmlStopParser(static_cast<xmlParserCtxt*>(context));
            return nullptr;
        }
        // An entity that only attribute values have used so far still lacks its tree; this has the
        // parser make it.
        const bool inContent = static_cast<xmlParserCtxt*>(context)->instate == XML_PARSER_CONTENT;
        if (entity && inContent && !entity->children)
            entity->checked = 0;
        return entity;
    }

    static xmlEntity* getParameterEntity(void* context, const xmlChar* name) {
        GuardedXmlParse& self = guard(context);
        xmlEntity* entity = xmlSAX2GetParameterEntity(context, name);
        const std::size_t cost = kCostOfReference + lengthOf(entity);
        return self.charge(self.m_parameterEntityBytes, cost, kMaximumParameterEntityBytes)
                   ? entity
                   : nullptr;
    }

    static void reference(void* context, const xmlChar* name) {
        GuardedXmlParse& self = guard(context);
        xmlDoc* document = static_cast<xmlParserCtxt*>(context)->myDoc;
        self.deliver([&] {
            xmlEntity* entity = xmlGetDocEntity(document, name);
            if (!entity || entity->etype != XML_INTERNAL_GENERAL_ENTITY)
                return;
            const xmlChar* text = flattenedText(document, entity);
            const int length = xmlStrlen(text);
            if (length > 0 && self.charge(self.m_entityBytes, static_cast<std::size_t>(length),
                                          kMaximumEntityBytes))
                characters(context, text, length);
        });
    }

    static int read(void* self, char* buffer, int size) {
        return static_cast<GuardedXmlParse*>(self)->read(buffer, size);
    }

    static xmlSAXHandler handler() {
        xmlSAXHandler sax{};
        sax.initialized = XML_SAX2_MAGIC;
        sax.startDocument = startDocument;
        sax.endDocument = xmlSAX2EndDocument;
        sax.internalSubset = xmlSAX2InternalSubset;
        sax.entityDecl = xmlSAX2EntityDecl;
        sax.getEntity = getEntity;
        sax.getParameterEntity = getParameterEntity;
        sax.reference = reference;
        sax.startElementNs = startElement;
        sax.endElementNs = endElement;
        sax.characters = sax.ignorableWhitespace = sax.cdataBlock = characters;
        sax.comment = comment;
        sax.processingInstruction = processingInstruction;
        return sax;
    }
};

GuardedXmlParse::GuardedXmlParse() {
    [[maybe_unused]] static const bool initialized = (xmlInitParser(), true);
    m_parser.reset(xmlNewParserCtxt());
    if (!m_parser)
        throw std::bad_alloc();
    m_parser->_private = this;
    *m_parser->sax = Callbacks::handler();
}

bool GuardedXmlParse::run(const Data& bytes, int options) {
    const QuietXml quiet;
    options |= XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING | XML_PARSE_COMPACT;
    m_ranges = bytes.ranges();
    xmlDoc* document = nullptr;
    m_isWhole = m_ranges.size() == 1 && bytes.size() <= kSmallDocument;
    if (m_isWhole) {
        const auto* text = reinterpret_cast<const char*>(m_ranges[0].data());
        document = xmlCtxtReadMemory(parser(), text, static_cast<int>(bytes.size()), nullptr,
                                     nullptr, options);
    } else {
        document =
            xmlCtxtReadIO(parser(), Callbacks::read, nullptr, this, nullptr, nullptr, options);
    }
    parser()->myDoc = document;
    if (m_thrown)
        std::rethrow_exception(m_thrown);
    return document && parser()->wellFormed && !m_stopped;
}

/// Hands an event on. An exception must not pass through the parser, so it waits until that is
/// done.
template <class Handler>
void GuardedXmlParse::deliver(Handler&& handler) {
    if (m_stopped)
        return;
    try {
        handler();
    } catch (const std::exception&) {
        m_thrown = std::current_exception();
        stop();
    }
}

int GuardedXmlParse::read(char* buffer, int size) {
    if (m_stopped || !withinReadingBudgets(size))
        return -1;
    while (m_nextRange < m_ranges.size() && m_ranges[m_nextRange].empty())
        ++m_nextRange;
    if (m_nextRange == m_ranges.size())
        return 0;
    Data::Bytes& range = m_ranges[m_nextRange];
    const std::size_t count = std::min(range.size(), static_cast<std::size_t>(size));
    std::memcpy(buffer, range.data(), count);
    range = range.subspan(count);
    return static_cast<int>(count);
}

/// What the parser has gathered of a construct that it has not reported yet.
bool GuardedXmlParse::withinReadingBudgets(int size) {
    if (parser()->inSubset)
        m_doctypeBytes += static_cast<std::size_t>(size);
    m_stopped = parser()->maxatts > kMaximumAttributeSlots ||
                parser()->nsNr / 2 > 2 * kMaximumNamespacesInScope ||
                m_doctypeBytes > kMaximumDoctypeBytes;
    return !m_stopped && (parser()->wellFormed || m_ranges.empty());
}

bool GuardedXmlParse::charge(std::size_t& spent, std::size_t cost, std::size_t limit) {
    spent += cost;
    if (spent > limit)
        stop();
    return !m_stopped;
}

/// The parser leaves `&name;` and `&#38;` in the values that it reports, and owns the array of
/// them.
std::span<const xmlChar*> GuardedXmlParse::replacingReferences(
    std::span<const xmlChar*> attributes) {
    m_attributes.clear();
    m_values.clear();
    for (std::size_t slot = 0; slot < attributes.size(); slot += 5) {
        const xmlChar* begin = attributes[slot + 3];
        const xmlChar* end = attributes[slot + 4];
        if (!holdsReference(begin, end))
            continue;
        if (m_attributes.empty()) {
            m_attributes.assign(attributes.begin(), attributes.end());
            m_values.reserve(attributes.size() / 5);  // so that none moves
        }
        const std::string& value = m_values.emplace_back(replacingReferences(begin, end));
        if (m_stopped)
            return {};  // the parser has freed the values
        m_attributes[slot + 3] = reinterpret_cast<const xmlChar*>(value.data());
        m_attributes[slot + 4] = m_attributes[slot + 3] + value.size();
    }
    return m_attributes.empty() ? attributes : std::span(m_attributes);
}

std::string GuardedXmlParse::replacingReferences(const xmlChar* begin, const xmlChar* end) {
    std::string value;
    while (begin != end && !m_stopped) {
        const xmlChar* reference = std::find(begin, end, '&');
        value.append(begin, reference);
        begin = std::find(reference, end, ';');
        begin += begin != end;
        xmlChar* text = xmlStringLenDecodeEntities(
            parser(), reference, static_cast<int>(begin - reference), XML_SUBSTITUTE_REF, 0, 0, 0);
        for (const xmlChar* c = text; c && *c; ++c)
            value += *c == '\t' || *c == '\n' || *c == '\r' ? ' ' : static_cast<char>(*c);
        xmlFree(text);
    }
    return value;
}

}  // namespace parvel
