// poppler-glib as an application uses it: a PDF document's information; with "cover" as the second
// argument also its first page drawn by cairo and written as PNG into memory.

#include <cairo.h>
#include <poppler.h>

#include <algorithm>

#include "bench/Runner.h"

namespace {

constexpr double kWidth = 340;
constexpr double kHeight = 380;

cairo_status_t append(void* text, const unsigned char* bytes, unsigned int count) {
    static_cast<std::string*>(text)->append(reinterpret_cast<const char*>(bytes), count);
    return CAIRO_STATUS_SUCCESS;
}

void drawCover(PopplerDocument* document) {
    PopplerPage* page = poppler_document_get_page(document, 0);
    if (!page)
        return;
    double width = 0;
    double height = 0;
    poppler_page_get_size(page, &width, &height);
    const double scale = std::min(kWidth / width, kHeight / height);
    cairo_surface_t* surface = cairo_image_surface_create(
        CAIRO_FORMAT_ARGB32, static_cast<int>(width * scale), static_cast<int>(height * scale));
    cairo_t* canvas = cairo_create(surface);
    cairo_set_source_rgb(canvas, 1, 1, 1);
    cairo_paint(canvas);
    cairo_scale(canvas, scale, scale);
    poppler_page_render(page, canvas);
    std::string file;
    cairo_surface_write_to_png_stream(surface, append, &file);
    cairo_destroy(canvas);
    cairo_surface_destroy(surface);
    g_object_unref(page);
}

}  // namespace

int main(int argumentCount, char** argumentWords) {
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    const bool withCover = arguments.has("cover");
    return parvel::bench::runOver(arguments, [&](const std::string& path) {
        gchar* uri = g_filename_to_uri(path.c_str(), nullptr, nullptr);
        PopplerDocument* document = poppler_document_new_from_file(uri, nullptr, nullptr);
        g_free(uri);
        if (!document)
            return false;
        g_free(poppler_document_get_author(document));
        g_free(poppler_document_get_subject(document));
        static_cast<void>(poppler_document_get_creation_date(document));
        static_cast<void>(poppler_document_get_modification_date(document));
        static_cast<void>(poppler_document_get_n_pages(document));
        if (withCover)
            drawCover(document);
        g_object_unref(document);
        return true;
    });
}
