#include "parvel/platform/linux/XmlTreeParse.h"

#include <libxml/SAX2.h>

#include <utility>

namespace parvel {

std::optional<XmlTree> XmlTreeParse::run() {
    if (!GuardedXmlParse::run(m_bytes, 0))
        return std::nullopt;
    XmlTree tree;
    tree.document.reset(std::exchange(parser()->myDoc, nullptr));
    tree.scope = m_budget.scope();
    return tree;
}

void XmlTreeParse::startElement(const StartTag& tag) {
    if (!m_budget.startElement(*parser(), tag))
        return stop();
    // The values are final: without this libxml2 would look for references in them.
    parser()->replaceEntities = 1;
    xmlSAX2StartElementNs(parser(), tag.name, tag.prefix, tag.namespaceName,
                          static_cast<int>(tag.namespaces.size() / 2), tag.namespaces.data(),
                          static_cast<int>(tag.attributes.size() / 5), 0, tag.attributes.data());
    parser()->replaceEntities = 0;
}

void XmlTreeParse::endElement() {
    m_budget.endElement();
    xmlSAX2EndElementNs(parser(), nullptr, nullptr, nullptr);
}

void XmlTreeParse::text(std::string_view characters) {
    if (!m_budget.text(*parser(), characters))
        return stop();
    xmlSAX2Characters(parser(), reinterpret_cast<const xmlChar*>(characters.data()),
                      static_cast<int>(characters.size()));
}

void XmlTreeParse::comment(const xmlChar* text) {
    if (!m_budget.remark(*parser(), text))
        return stop();
    xmlSAX2Comment(parser(), text);
}

void XmlTreeParse::processingInstruction(const xmlChar* target, const xmlChar* data) {
    if (!m_budget.remark(*parser(), data))
        return stop();
    xmlSAX2ProcessingInstruction(parser(), target, data);
}

}  // namespace parvel
