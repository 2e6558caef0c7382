// The least that a zipped book costs: one open, the directory from the file's tail, the container
// document and the package document inflated, both checked for well-formedness and namespaces, the
// package document's MD5, the extended attributes. It builds nothing and checks little else.

#include <fcntl.h>
#include <libdeflate.h>
#include <libxml/parser.h>
#include <openssl/evp.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cstdint>
#include <memory>
#include <string_view>

#include "bench/Runner.h"

namespace {

constexpr std::size_t kTailLength = 4096;
constexpr std::size_t kEndLength = 22;
constexpr std::size_t kRecordLength = 46;
constexpr std::size_t kLocalLength = 30;
constexpr std::size_t kLocalExtraAllowance = 128;

std::uint32_t get(const std::uint8_t* bytes, int count) {
    std::uint32_t value = 0;
    for (int i = count - 1; i >= 0; --i)
        value = value << 8 | bytes[i];
    return value;
}

struct Entry {
    std::uint32_t method = 0;
    std::uint32_t crc = 0;
    std::uint32_t stored = 0;
    std::uint32_t size = 0;
    std::uint32_t offset = 0;
    std::uint32_t nameLength = 0;
};

struct Archive {
    int file = -1;
    std::vector<std::uint8_t> directory;
    libdeflate_decompressor* inflater = nullptr;

    bool find(std::string_view name, Entry& entry) const {
        for (std::size_t at = 0; at + kRecordLength <= directory.size();) {
            const std::uint8_t* record = directory.data() + at;
            const std::uint32_t length = get(record + 28, 2);
            if (std::string_view(reinterpret_cast<const char*>(record) + kRecordLength, length) ==
                name) {
                entry = {get(record + 10, 2), get(record + 16, 4), get(record + 20, 4),
                         get(record + 24, 4), get(record + 42, 4), length};
                return true;
            }
            at += kRecordLength + length + get(record + 30, 2) + get(record + 32, 2);
        }
        return false;
    }

    bool read(const Entry& entry, std::string& content) const {
        const std::size_t wanted =
            kLocalLength + entry.nameLength + kLocalExtraAllowance + entry.stored;
        const auto piece = std::make_unique_for_overwrite<std::uint8_t[]>(wanted);
        if (pread(file, piece.get(), wanted, entry.offset) < static_cast<ssize_t>(kLocalLength))
            return false;
        const std::uint8_t* data =
            piece.get() + kLocalLength + get(piece.get() + 26, 2) + get(piece.get() + 28, 2);
        content.resize(entry.size);
        if (entry.method == 0)
            std::memcpy(content.data(), data, entry.size);
        else if (libdeflate_deflate_decompress(inflater, data, entry.stored, content.data(),
                                               entry.size, nullptr) != LIBDEFLATE_SUCCESS)
            return false;
        return libdeflate_crc32(0, content.data(), content.size()) == entry.crc;
    }
};

std::string s_packagePath;

void startElement(void*, const xmlChar* name, const xmlChar*, const xmlChar*, int, const xmlChar**,
                  int count, int, const xmlChar** attributes) {
    if (std::strcmp(reinterpret_cast<const char*>(name), "rootfile") != 0)
        return;
    for (int i = 0; i < count; ++i) {
        if (std::strcmp(reinterpret_cast<const char*>(attributes[i * 5]), "full-path") == 0)
            s_packagePath.assign(reinterpret_cast<const char*>(attributes[i * 5 + 3]),
                                 reinterpret_cast<const char*>(attributes[i * 5 + 4]));
    }
}

bool check(const std::string& document) {
    xmlSAXHandler handler{};
    handler.initialized = XML_SAX2_MAGIC;
    handler.startElementNs = startElement;
    return xmlSAXUserParseMemory(&handler, nullptr, document.data(),
                                 static_cast<int>(document.size())) == 0;
}

void readAttributes(int file) {
    char names[4096];
    char value[4096];
    const ssize_t length = flistxattr(file, names, sizeof names);
    for (ssize_t at = 0; at < length; at += static_cast<ssize_t>(std::strlen(names + at)) + 1)
        static_cast<void>(!fgetxattr(file, names + at, value, sizeof value));
}

bool readBook(const std::string& path) {
    Archive archive;
    archive.file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    struct stat status {};
    if (archive.file < 0 || fstat(archive.file, &status) != 0)
        return false;
    readAttributes(archive.file);
    const auto size = static_cast<std::size_t>(status.st_size);
    std::vector<std::uint8_t> tail(std::min(size, kTailLength));
    bool read =
        pread(archive.file, tail.data(), tail.size(), static_cast<off_t>(size - tail.size())) ==
            static_cast<ssize_t>(tail.size()) &&
        tail.size() >= kEndLength;
    if (read) {
        const std::uint8_t* end = tail.data() + tail.size() - kEndLength;
        const std::size_t length = get(end + 12, 4);
        archive.directory.resize(length);
        if (length + kEndLength <= tail.size())
            std::memcpy(archive.directory.data(), end - length, length);
        else
            read = pread(archive.file, archive.directory.data(), length, get(end + 16, 4)) ==
                   static_cast<ssize_t>(length);
    }
    static libdeflate_decompressor* const inflater = libdeflate_alloc_decompressor();
    archive.inflater = inflater;
    Entry entry;
    std::string document;
    s_packagePath.clear();
    read = read && archive.find("META-INF/container.xml", entry) && archive.read(entry, document) &&
           check(document) && archive.find(s_packagePath, entry) && archive.read(entry, document) &&
           check(document);
    unsigned char digest[EVP_MAX_MD_SIZE];
    static EVP_MD* const md5 = EVP_MD_fetch(nullptr, "MD5", nullptr);
    EVP_Digest(document.data(), document.size(), digest, nullptr, md5, nullptr);
    close(archive.file);
    return read;
}

}  // namespace

int main(int argumentCount, char** arguments) {
    return parvel::bench::runOver(argumentCount, arguments, readBook);
}
