#include "reader/Document.h"

#include <poppler-document.h>
#include <poppler-global.h>
#include <poppler-page-renderer.h>
#include <poppler-page.h>

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstring>
#include <optional>
#include <utility>

#include "reader/HostFiles.h"
#include "reader/Input.h"
#include "reader/MemoryFile.h"
#include "reader/PdfDate.h"
#include "reader/PdfText.h"

namespace parvel::reader {

namespace {

constexpr int pixelSize = 4;

constexpr std::string_view smallestDocument =
    "%PDF-1.4\n1 0 obj<</Type/Catalog/Pages 2 0 R>>endobj "
    "2 0 obj<</Type/Pages/Kids[]/Count 0>>endobj trailer<</Root 1 0 R>>";

/// The part of the bitmap that the page covers. Its shape is the page's but for a fraction of a
/// pixel on one axis, which is stretched to whole pixels: no edge is left half covered.
struct Placement {
    int x = 0;
    int y = 0;
    int width = 0;
    int height = 0;
};

/// As large as fits, centred.
Placement placePage(double pageWidth, double pageHeight, int width, int height) {
    constexpr double roundingError = 1e-6;
    const double scale = std::min(width / pageWidth, height / pageHeight);
    const auto pixels = [&](double length, int most) {
        const double exact = std::ceil(length * scale - roundingError);
        return std::clamp(exact, 1.0, static_cast<double>(most));
    };
    Placement placement;
    placement.width = static_cast<int>(pixels(pageWidth, width));
    placement.height = static_cast<int>(pixels(pageHeight, height));
    placement.x = (width - placement.width) / 2;
    placement.y = (height - placement.height) / 2;
    return placement;
}

int degreesOf(const poppler::page& page) {
    switch (page.orientation()) {
        case poppler::page::landscape:
            return 90;
        case poppler::page::upside_down:
            return 180;
        case poppler::page::seascape:
            return 270;
        case poppler::page::portrait:
            break;
    }
    return 0;
}

/// The entry as UTF-8; none when it is missing or too long.
std::optional<std::string> textOf(const poppler::document& document,
                                  const std::vector<std::string>& keys, const char* key) {
    if (std::find(keys.begin(), keys.end(), key) == keys.end())
        return std::nullopt;
    const poppler::ustring units = document.info_key(key);
    std::string text = utf8OfPdfText(std::u16string(units.begin(), units.end()));
    return text.size() <= longestText ? std::optional(std::move(text)) : std::nullopt;
}

void addText(Answer& answer, std::uint32_t& size, const std::optional<std::string>& text) {
    if (!text)
        return;
    size = static_cast<std::uint32_t>(text->size());
    answer.text += *text;
}

void addDate(std::uint32_t& isThere, double& seconds, const std::optional<std::string>& text) {
    const std::optional<double> date = text ? secondsOfPdfDate(*text) : std::nullopt;
    isThere = date ? 1 : 0;
    seconds = date.value_or(0);
}

Answer informationOf(const poppler::document& document) {
    Answer answer;
    Reply& reply = answer.reply;
    reply.outcome = Outcome::Done;
    reply.isLocked = document.is_locked() ? 1 : 0;
    if (document.is_locked())
        return answer;
    const std::vector<std::string> keys = document.info_keys();
    addText(answer, reply.authorSize, textOf(document, keys, "Author"));
    addText(answer, reply.subjectSize, textOf(document, keys, "Subject"));
    addDate(reply.hasCreationDate, reply.creationDate, textOf(document, keys, "CreationDate"));
    addDate(reply.hasModificationDate, reply.modificationDate, textOf(document, keys, "ModDate"));
    reply.pageCount = static_cast<std::uint32_t>(std::max(document.pages(), 0));
    return answer;
}

/// The page as large as its place; not valid when it can't be drawn.
poppler::image drawnPage(const poppler::page& page, double pageWidth, double pageHeight,
                         const Placement& placement) {
    constexpr double pointsAnInch = 72;
    poppler::page_renderer renderer;
    renderer.set_render_hints(poppler::page_renderer::antialiasing |
                              poppler::page_renderer::text_antialiasing);
    poppler::image image = renderer.render_page(&page, pointsAnInch * placement.width / pageWidth,
                                                pointsAnInch * placement.height / pageHeight, 0, 0,
                                                placement.width, placement.height);
    const bool isAsWanted = image.width() == placement.width &&
                            image.height() == placement.height &&
                            image.bytes_per_row() == placement.width * pixelSize &&
                            image.format() == poppler::image::format_argb32;
    return isAsWanted ? image : poppler::image();
}

std::span<const std::uint8_t> bytesOf(const poppler::image& image) {
    return {reinterpret_cast<const std::uint8_t*>(image.const_data()),
            static_cast<std::size_t>(image.bytes_per_row()) * image.height()};
}

/// The drawn page in its place of an opaque white bitmap.
std::vector<std::uint8_t> placedOnWhite(const poppler::image& drawn, const Placement& placement,
                                        const Reply& bitmap) {
    std::vector<std::uint8_t> pixels(bitmap.size, 0xFF);
    const std::span<const std::uint8_t> from = bytesOf(drawn);
    const auto rowSize = static_cast<std::size_t>(drawn.bytes_per_row());
    std::size_t to = std::size_t{bitmap.stride} * placement.y + placement.x * pixelSize;
    for (std::size_t row = 0; row < from.size(); row += rowSize, to += bitmap.stride)
        std::memcpy(pixels.data() + to, from.data() + row, rowSize);
    return pixels;
}

}  // namespace

Document::Document() {
    poppler::set_debug_error_function([](const std::string&, void*) {}, nullptr);
    m_held.reset(poppler::document::load_from_raw_data(smallestDocument.data(),
                                                       static_cast<int>(smallestDocument.size())));
}

Document::~Document() = default;

Answer Document::open(const Received& received) {
    close();
    if (received.request.size > longestMapped) {
        const OfferedFile file(received.input.get());
        m_document.reset(poppler::document::load_from_file(file.path()));
    } else {
        m_input = std::make_unique<Input>(received);
        const std::span<const std::uint8_t> bytes = m_input->bytes();
        if (!bytes.empty())
            m_document.reset(poppler::document::load_from_raw_data(
                reinterpret_cast<const char*>(bytes.data()), static_cast<int>(bytes.size())));
    }
    if (m_document)
        return informationOf(*m_document);
    close();
    return refusal();
}

void Document::close() {
    m_document.reset();
    m_input.reset();
}

std::uint64_t Document::mappedSize() const {
    return m_input ? Input::mappedSize(m_input->bytes().size()) : 0;
}

Answer Document::describePage() const {
    Answer answer;
    answer.reply.outcome = Outcome::Done;
    if (const std::unique_ptr<poppler::page> page = firstPage()) {
        const poppler::rectf box = page->page_rect(poppler::crop_box);
        answer.reply.hasFirstPage = 1;
        answer.reply.cropBoxWidth = box.width();
        answer.reply.cropBoxHeight = box.height();
        answer.reply.rotation = degreesOf(*page);
    }
    return answer;
}

Answer Document::drawPage(const Request& request) const {
    const std::unique_ptr<poppler::page> page = firstPage();
    if (!page || request.width == 0 || request.height == 0 ||
        std::max(request.width, request.height) > longestDrawnSide)
        return refusal();
    const poppler::rectf box = page->page_rect(poppler::crop_box);
    double pageWidth = box.width();
    double pageHeight = box.height();
    if (degreesOf(*page) % 180 != 0)
        std::swap(pageWidth, pageHeight);
    if (!(pageWidth > 0 && pageHeight > 0))
        return refusal();

    Answer answer;
    Reply& reply = answer.reply;
    reply.width = request.width;
    reply.height = request.height;
    reply.stride = request.width * pixelSize;
    reply.size = std::uint64_t{reply.stride} * reply.height;
    if (reply.size > addressSpace)
        return refusal();
    const Placement placement = placePage(pageWidth, pageHeight, static_cast<int>(request.width),
                                          static_cast<int>(request.height));
    const poppler::image drawn = drawnPage(*page, pageWidth, pageHeight, placement);
    if (!drawn.is_valid())
        return refusal();
    if (bytesOf(drawn).size() == reply.size)
        answer.file = sealedFileOf(bytesOf(drawn));
    else
        answer.file = sealedFileOf(placedOnWhite(drawn, placement, reply));
    reply.outcome = answer.file ? Outcome::Done : Outcome::Refused;
    return answer;
}

std::unique_ptr<poppler::page> Document::firstPage() const {
    if (!m_document || m_document->is_locked() || m_document->pages() < 1)
        return nullptr;
    return std::unique_ptr<poppler::page>(m_document->create_page(0));
}

}  // namespace parvel::reader
