#pragma once

#include <libxml/parser.h>
#include <openssl/evp.h>

#include <cstring>
#include <string>

namespace parvel::bench {

/// Checks that a document is well-formed, its namespaces too. The path that a container document
/// names for its package document is put in `packagePath`.
inline bool checkDocument(const std::string& document, std::string& packagePath) {
    xmlSAXHandler handler{};
    handler.initialized = XML_SAX2_MAGIC;
    handler.startElementNs = [](void* path, const xmlChar* name, const xmlChar*, const xmlChar*,
                                int, const xmlChar**, int count, int, const xmlChar** attributes) {
        auto& found = *static_cast<std::string*>(path);
        if (!found.empty() || std::strcmp(reinterpret_cast<const char*>(name), "rootfile") != 0)
            return;
        for (int i = 0; i < count; ++i) {
            const auto* attribute = reinterpret_cast<const char* const*>(attributes + i * 5);
            if (std::strcmp(attribute[0], "full-path") == 0)
                found.assign(attribute[3], attribute[4]);
        }
    };
    return xmlSAXUserParseMemory(&handler, &packagePath, document.data(),
                                 static_cast<int>(document.size())) == 0;
}

inline void digestDocument(const std::string& document) {
    unsigned char digest[EVP_MAX_MD_SIZE];
    static EVP_MD* const md5 = EVP_MD_fetch(nullptr, "MD5", nullptr);
    EVP_Digest(document.data(), document.size(), digest, nullptr, md5, nullptr);
}

/// The documents of a book, got by their paths by `read`: the container document, the package
/// document, which is digested, and the store metadata file where there is one.
template <class Read>
bool readDocuments(Read&& read) {
    std::string document;
    std::string path;
    if (!read("META-INF/container.xml", document) || !checkDocument(document, path) ||
        !read(path, document) || !checkDocument(document, path))
        return false;
    digestDocument(document);
    return !read("BazaarMetadata.plist", document) || checkDocument(document, path);
}

}  // namespace parvel::bench
