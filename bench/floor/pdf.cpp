// The least that a PDF document costs with the same PDF library in the same process, its state kept
// from document to document: one open, the extended attributes, the information, the pages, and the
// file's MD5 where no identity is stored; with "cover" as the second argument also the first page
// drawn and written as PNG.

#include <fcntl.h>
#include <openssl/evp.h>
#include <poppler-document.h>
#include <poppler-page-renderer.h>
#include <poppler-page.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <memory>
#include <string_view>

#include "bench/Runner.h"
#include "bench/floor/Attributes.h"
#include "parvel/foundation/ImageFiles.h"

namespace {

constexpr double coverWidth = 340;
constexpr double coverHeight = 380;
constexpr std::string_view keptDocument =
    "%PDF-1.4\n1 0 obj<</Type/Catalog/Pages 2 0 R>>endobj "
    "2 0 obj<</Type/Pages/Kids[]/Count 0>>endobj trailer<</Root 1 0 R>>";

using Document = std::unique_ptr<poppler::document>;

void drawCover(const poppler::document& document) {
    const std::unique_ptr<poppler::page> page(document.create_page(0));
    if (!page)
        return;
    const poppler::rectf box = page->page_rect(poppler::crop_box);
    const double scale = std::min(coverWidth / box.width(), coverHeight / box.height());
    poppler::page_renderer renderer;
    renderer.set_render_hints(poppler::page_renderer::antialiasing |
                              poppler::page_renderer::text_antialiasing);
    poppler::image drawn = renderer.render_page(page.get(), 72 * scale, 72 * scale, 0, 0,
                                                static_cast<int>(box.width() * scale),
                                                static_cast<int>(box.height() * scale));
    if (!drawn.is_valid())
        return;
    const auto* pixels = reinterpret_cast<const std::uint8_t*>(drawn.const_data());
    static_cast<void>(parvel::pngDataFromImage({static_cast<std::uint32_t>(drawn.width()),
                                                static_cast<std::uint32_t>(drawn.height()),
                                                static_cast<std::size_t>(drawn.bytes_per_row()),
                                                {pixels, [](const std::uint8_t*) {}}}));
}

bool readDocument(const char* bytes, std::size_t size, bool withCover) {
    const Document document(poppler::document::load_from_raw_data(bytes, static_cast<int>(size)));
    if (!document || document->is_locked())
        return document != nullptr;
    for (const char* key : {"Author", "Subject", "CreationDate", "ModDate"})
        static_cast<void>(document->info_key(key));
    if (document->pages() > 0 && withCover)
        drawCover(*document);
    return true;
}

bool readFile(const std::string& path, bool withCover) {
    const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    struct stat status {};
    if (file < 0 || fstat(file, &status) != 0)
        return false;
    const bool hasIdentity = parvel::bench::readAttributes(file);
    const auto size = static_cast<std::size_t>(status.st_size);
    void* bytes = mmap(nullptr, size, PROT_READ, MAP_PRIVATE, file, 0);
    close(file);
    if (bytes == MAP_FAILED)
        return false;
    unsigned char digest[EVP_MAX_MD_SIZE];
    if (!hasIdentity)
        static_cast<void>(EVP_Digest(bytes, size, digest, nullptr, EVP_md5(), nullptr));
    const bool isRead = readDocument(static_cast<const char*>(bytes), size, withCover);
    munmap(bytes, size);
    return isRead;
}

}  // namespace

int main(int argumentCount, char** argumentWords) {
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    const bool withCover = arguments.has("cover");
    poppler::set_debug_error_function([](const std::string&, void*) {}, nullptr);
    const Document kept(poppler::document::load_from_raw_data(
        keptDocument.data(), static_cast<int>(keptDocument.size())));
    return parvel::bench::runOver(
        arguments, [&](const std::string& path) { return readFile(path, withCover); });
}
