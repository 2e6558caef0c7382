#pragma once

#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>

#include "parvel/platform/XmlDocument.h"

namespace parvel::testing {

inline std::shared_ptr<const XmlDocument> parsedXML(std::string_view text) {
    auto document =
        XmlParser::host().parse(Data::copyOf(text), URL::fileURLWithPath("/document.xml"));
    if (!document)
        throw std::invalid_argument("not well-formed: " + std::string(text));
    return document;
}

/// An OPF document with the given content of its metadata and manifest elements, and with
/// attributes of its package element (each after a blank).
inline std::string opfText(std::string_view metadata, std::string_view manifest = "",
                           std::string_view attributes = "") {
    return R"(<package xmlns="http://www.idpf.org/2007/opf" version="3.0")" +
           std::string(attributes) + R"(><metadata xmlns:dc="http://purl.org/dc/elements/1.1/">)" +
           std::string(metadata) + "</metadata><manifest>" + std::string(manifest) +
           "</manifest></package>";
}

/// A container document that names the path first, with more of its rootfiles behind.
inline std::string containerText(std::string_view opfPath, std::string_view more = "") {
    return R"(<container xmlns="urn:oasis:names:tc:opendocument:xmlns:container" version="1.0">)"
           R"(<rootfiles><rootfile full-path=")" +
           std::string(opfPath) + R"("/>)" + std::string(more) + "</rootfiles></container>";
}

/// An XML property list of a dictionary with the given content.
inline std::string storeFileText(std::string_view entries) {
    return R"(<?xml version="1.0" encoding="UTF-8"?><plist version="1.0"><dict>)" +
           std::string(entries) + "</dict></plist>";
}

}  // namespace parvel::testing
