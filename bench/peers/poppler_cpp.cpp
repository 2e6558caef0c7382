// poppler-cpp with a plain PNG encoder: a PDF document's information; with "cover" also its first
// page drawn to fit the cover's box and written as PNG into memory.

#include <png.h>
#include <poppler-document.h>
#include <poppler-page-renderer.h>
#include <poppler-page.h>

#include <algorithm>
#include <memory>

#include "bench/Runner.h"

namespace {

constexpr double kWidth = 340;
constexpr double kHeight = 380;

void writePNG(const poppler::image& drawn) {
    png_image image{};
    image.version = PNG_IMAGE_VERSION;
    image.width = static_cast<png_uint_32>(drawn.width());
    image.height = static_cast<png_uint_32>(drawn.height());
    image.format = PNG_FORMAT_BGRA;
    png_alloc_size_t size = PNG_IMAGE_PNG_SIZE_MAX(image);
    const auto file = std::make_unique_for_overwrite<unsigned char[]>(size);
    png_image_write_to_memory(&image, file.get(), &size, 0, drawn.const_data(),
                              drawn.bytes_per_row(), nullptr);
}

void drawCover(const poppler::document& document) {
    const std::unique_ptr<poppler::page> page(document.create_page(0));
    if (!page)
        return;
    const poppler::rectf box = page->page_rect(poppler::crop_box);
    const double resolution = 72 * std::min(kWidth / box.width(), kHeight / box.height());
    poppler::page_renderer renderer;
    renderer.set_render_hints(poppler::page_renderer::antialiasing |
                              poppler::page_renderer::text_antialiasing);
    const poppler::image drawn = renderer.render_page(page.get(), resolution, resolution);
    if (drawn.is_valid())
        writePNG(drawn);
}

}  // namespace

int main(int argumentCount, char** argumentWords) {
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    const bool withCover = arguments.has("cover");
    poppler::set_debug_error_function([](const std::string&, void*) {}, nullptr);
    return parvel::bench::runOver(arguments, [&](const std::string& path) {
        const std::unique_ptr<poppler::document> document(poppler::document::load_from_file(path));
        if (!document || document->is_locked())
            return document != nullptr;
        for (const char* key : {"Author", "Subject", "CreationDate", "ModDate"})
            static_cast<void>(document->info_key(key));
        if (document->pages() > 0 && withCover)
            drawCover(*document);
        return true;
    });
}
