#pragma once

#include <optional>
#include <string_view>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/Value.h"
#include "parvel/platform/XmlDocument.h"

/// Lookups on the nodes of a package's two documents: the container document (OCF 3.0, 3.5.2.1) and
/// the package document, OPF 2.0. Each gives the first match, or its text, and none where there is
/// no match, which is no error. An expression that does not evaluate gives none with the XML
/// service's error, and is logged.
namespace parvel {

/// The prefixes of the expressions below, as a prologue.
inline constexpr std::string_view opfDeclarations =
    R"(declare namespace dc="http://purl.org/dc/elements/1.1/"; declare namespace o="http://www.idpf.org/2007/opf"; )";
inline constexpr std::string_view containerDeclarations =
    R"(declare namespace c="urn:oasis:names:tc:opendocument:xmlns:container"; )";

/// The first node that the expression gives with the node as its context.
std::optional<XmlNode> parvel_elementForXPath_namespaceDeclarations_error(
    const XmlNode& node, std::string_view expression, std::string_view declarations,
    ErrorOut error = nullptr);

// On the OPF document.

std::optional<XmlNode> parvel_opf_metadataElement(const XmlNode& opf, ErrorOut error = nullptr);
std::optional<XmlNode> parvel_opf_manifest(const XmlNode& opf, ErrorOut error = nullptr);

// On its metadata element.

std::optional<String> parvel_opf_metadata_identifier(const XmlNode& metadata,
                                                     ErrorOut error = nullptr);
/// The contributor whose id is "pvp"; no other one counts.
std::optional<String> parvel_opf_metadata_producer(const XmlNode& metadata,
                                                   ErrorOut error = nullptr);
std::optional<String> parvel_opf_metadata_creator(const XmlNode& metadata,
                                                  ErrorOut error = nullptr);
std::optional<String> parvel_opf_metadata_title(const XmlNode& metadata, ErrorOut error = nullptr);
std::optional<String> parvel_opf_metadata_subject(const XmlNode& metadata,
                                                  ErrorOut error = nullptr);
std::optional<String> parvel_opf_metadata_description(const XmlNode& metadata,
                                                      ErrorOut error = nullptr);
/// Of a `meta` element in no namespace alone, unlike the cover's. Deliberate.
std::optional<String> parvel_opf_metadata_format(const XmlNode& metadata, ErrorOut error = nullptr);
/// The manifest id of the cover image.
std::optional<String> parvel_opf_metadata_coverId(const XmlNode& metadata,
                                                  ErrorOut error = nullptr);

// On its manifest element.

/// The href of the item with the id, or of the item "cover" where the id is absent or empty. The id
/// goes into the expression as it is, so one with a quote breaks it. Deliberate.
std::optional<String> parvel_opf_manifest_coverHrefWithId_error(const XmlNode& manifest,
                                                                const std::optional<String>& id,
                                                                ErrorOut error = nullptr);

// On the container document.

/// The OPF document's path, relative to the package's root.
std::optional<String> parvel_containerxml_opfPathWithError(const XmlNode& container,
                                                           ErrorOut error = nullptr);

// On the OPF document and its metadata element.

/// The identifier that the document says is its unique one; the first, where it says nothing. None
/// unless it has 1 to 64 UTF-16 units and neither a slash nor a colon, for it becomes part of file
/// names. The id goes into the expression as it is. Deliberate.
std::optional<String> parvel_validatedUniqueIdentifierFromOPFNode_metadataNode_error(
    const XmlNode& opf, const XmlNode& metadata, ErrorOut error = nullptr);

}  // namespace parvel
