#include "parvel/inspection/OPFDocument.h"

#include <cstddef>
#include <string>

#include "parvel/foundation/PVParvelLog.h"
#include "parvel/platform/TextRules.h"

namespace parvel {

namespace {

std::optional<String> textForXPath(const XmlNode& node, std::string_view expression,
                                   std::string_view declarations, ErrorOut error) {
    const std::optional<XmlNode> match =
        parvel_elementForXPath_namespaceDeclarations_error(node, expression, declarations, error);
    if (!match)
        return std::nullopt;
    return match->document->stringValue(match->node);
}

std::optional<String> opfTextForXPath(const XmlNode& node, std::string_view expression,
                                      ErrorOut error) {
    return textForXPath(node, expression, opfDeclarations, error);
}

std::optional<String> opfAttributeForXPath(const XmlNode& node, std::string_view expression,
                                           std::string_view attribute, ErrorOut error) {
    const std::optional<XmlNode> match = parvel_elementForXPath_namespaceDeclarations_error(
        node, expression, opfDeclarations, error);
    if (!match)
        return std::nullopt;
    return match->document->attribute(match->node, attribute);
}

bool isValidIdentifier(std::string_view identifier) {
    constexpr std::size_t longest = 64;
    const std::size_t length = utf16Length(identifier);
    return length >= 1 && length <= longest &&
           identifier.find_first_of("/:") == std::string_view::npos;
}

}  // namespace

std::optional<XmlNode> parvel_elementForXPath_namespaceDeclarations_error(
    const XmlNode& node, std::string_view expression, std::string_view declarations,
    ErrorOut error) {
    std::string query;
    query.reserve(declarations.size() + expression.size());
    query.append(declarations).append(expression);

    XPathResult result = node.document->evaluate(node.node, query, error);
    if (!result.evaluated) {
        PVParvelLog().info("Failed to get element from xpath: %@", expression);
        return std::nullopt;
    }
    return std::move(result.first);
}

std::optional<XmlNode> parvel_opf_metadataElement(const XmlNode& opf, ErrorOut error) {
    return parvel_elementForXPath_namespaceDeclarations_error(opf, "/o:package[1]/o:metadata[1]",
                                                              opfDeclarations, error);
}

std::optional<XmlNode> parvel_opf_manifest(const XmlNode& opf, ErrorOut error) {
    return parvel_elementForXPath_namespaceDeclarations_error(opf, "/o:package[1]/o:manifest[1]",
                                                              opfDeclarations, error);
}

std::optional<String> parvel_opf_metadata_identifier(const XmlNode& metadata, ErrorOut error) {
    return opfTextForXPath(metadata, "dc:identifier[1]", error);
}

std::optional<String> parvel_opf_metadata_producer(const XmlNode& metadata, ErrorOut error) {
    return opfTextForXPath(metadata, "dc:contributor[@id='pvp']", error);
}

std::optional<String> parvel_opf_metadata_creator(const XmlNode& metadata, ErrorOut error) {
    return opfTextForXPath(metadata, "dc:creator[1]", error);
}

std::optional<String> parvel_opf_metadata_title(const XmlNode& metadata, ErrorOut error) {
    return opfTextForXPath(metadata, "dc:title[1]", error);
}

std::optional<String> parvel_opf_metadata_subject(const XmlNode& metadata, ErrorOut error) {
    return opfTextForXPath(metadata, "dc:subject[1]", error);
}

std::optional<String> parvel_opf_metadata_description(const XmlNode& metadata, ErrorOut error) {
    return opfTextForXPath(metadata, "dc:description[1]", error);
}

std::optional<String> parvel_opf_metadata_format(const XmlNode& metadata, ErrorOut error) {
    // Deliberate: no prefix, so only a `meta` in no namespace matches.
    return opfTextForXPath(metadata, "meta[@property='folium:format']", error);
}

std::optional<String> parvel_opf_metadata_coverId(const XmlNode& metadata, ErrorOut error) {
    return opfAttributeForXPath(metadata, R"(o:meta[@name="cover"])", "content", error);
}

std::optional<String> parvel_opf_manifest_coverHrefWithId_error(const XmlNode& manifest,
                                                                const std::optional<String>& id,
                                                                ErrorOut error) {
    // Deliberate: the id as it is.
    const std::string_view sought = id && !id->empty() ? std::string_view(*id) : "cover";
    const std::string expression = R"(o:item[@id=")" + std::string(sought) + R"("])";
    return opfAttributeForXPath(manifest, expression, "href", error);
}

std::optional<String> parvel_containerxml_opfPathWithError(const XmlNode& container,
                                                           ErrorOut error) {
    return textForXPath(container, "/c:container[1]/c:rootfiles[1]/c:rootfile[1]/@full-path",
                        containerDeclarations, error);
}

std::optional<String> parvel_validatedUniqueIdentifierFromOPFNode_metadataNode_error(
    const XmlNode& opf, const XmlNode& metadata, ErrorOut error) {
    std::string expression = "dc:identifier[1]";
    const std::optional<String> id = opfTextForXPath(opf, "/o:package/@unique-identifier", error);
    if (id && !id->empty()) {
        PVParvelLog().debug("UniqueIdentifier: using EPub identifier method");
        // Deliberate: the id as it is.
        expression = "dc:identifier[@id='" + *id + "']";
    }

    std::optional<String> identifier = opfTextForXPath(metadata, expression, error);
    if (!identifier || !isValidIdentifier(*identifier))
        return std::nullopt;
    return identifier;
}

}  // namespace parvel
