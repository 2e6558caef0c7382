#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "parvel/platform/ImageCodec.h"
#include "parvel/platform/PdfDocument.h"
#include "parvel/platform/Service.h"

namespace parvel::testing {

/// A page that keeps what it was asked to draw, and "draws" an image without pixels of that size.
struct FakePdfPage : PdfPage {
    double width = 612;
    double height = 792;
    int turned = 0;
    bool draws = true;
    std::vector<std::pair<std::uint32_t, std::uint32_t>>* drawn = nullptr;

    FakePdfPage() = default;
    FakePdfPage(double pageWidth, double pageHeight, int rotation = 0)
        : width(pageWidth), height(pageHeight), turned(rotation) {}

    [[nodiscard]] double cropBoxWidth() const override { return width; }
    [[nodiscard]] double cropBoxHeight() const override { return height; }
    [[nodiscard]] int rotation() const override { return turned; }
    [[nodiscard]] std::optional<Image> draw(std::uint32_t w, std::uint32_t h) override {
        if (drawn)
            drawn->emplace_back(w, h);
        return draws && w > 0 && h > 0 ? std::optional(Image{w, h, 4UL * w, nullptr})
                                       : std::nullopt;
    }
};

/// What the one document of `FakePdfs` holds.
struct FakePdfContent : PdfDocument {
    bool locked = false;
    std::optional<std::string> authorText;
    std::optional<std::string> subjectText;
    std::optional<Date> created;
    std::optional<Date> modified;
    std::uint32_t pages = 1;
    std::optional<FakePdfPage> page = FakePdfPage();

    [[nodiscard]] bool isLocked() const override { return locked; }
    [[nodiscard]] std::optional<std::string> author() const override { return authorText; }
    [[nodiscard]] std::optional<std::string> subject() const override { return subjectText; }
    [[nodiscard]] std::optional<Date> creationDate() const override { return created; }
    [[nodiscard]] std::optional<Date> modificationDate() const override { return modified; }
    [[nodiscard]] std::uint32_t pageCount() const override { return pages; }
    [[nodiscard]] std::unique_ptr<PdfPage> firstPage() override {
        return page ? std::make_unique<FakePdfPage>(*page) : nullptr;
    }
};

/// In force while it lives: every file holds the same bytes and the same document, and counts what
/// is done with it.
class FakePdfs : public PdfDocuments {
public:
    FakePdfContent content;
    std::string bytes = "the bytes of a document";
    std::optional<Error> openError;
    std::optional<Error> readError;
    std::optional<Error> documentError;
    int documentsBeforeError = 0;  ///< how many open before `documentError` is in force

    int filesOpened = 0;
    int filesRead = 0;
    int documentsOpened = 0;
    std::vector<std::pair<std::uint32_t, std::uint32_t>> drawn;

    std::unique_ptr<PdfFile> openFile(const URL&, ErrorOut error) override {
        if (openError)
            return fail(error, *openError);
        ++filesOpened;
        return std::make_unique<File>(*this);
    }
    std::unique_ptr<PdfDocument> openDocument(PdfFile&, ErrorOut error) override {
        if (documentError && documentsOpened >= documentsBeforeError)
            return fail(error, *documentError);
        ++documentsOpened;
        auto document = std::make_unique<FakePdfContent>(content);
        if (document->page)
            document->page->drawn = &drawn;
        return document;
    }

private:
    struct File : PdfFile {
        explicit File(FakePdfs& all) : pdfs(all) {}
        bool readAll(const std::function<void(Data::Bytes)>& take, ErrorOut error) override {
            ++pdfs.filesRead;
            const auto* first = reinterpret_cast<const std::uint8_t*>(pdfs.bytes.data());
            const std::size_t half = pdfs.bytes.size() / 2;
            take({first, half});
            if (pdfs.readError)
                return fail(error, *pdfs.readError);
            take({first + half, pdfs.bytes.size() - half});
            return true;
        }
        FakePdfs& pdfs;
    };

    Service<PdfDocuments>::Replacement m_replacement{*this};
};

/// In force while it lives: an image is encoded as the text of its size.
class FakeImageCodec : public ImageCodec {
public:
    bool encodes = true;

    std::optional<Image> decode(const Data&) override { return std::nullopt; }
    std::optional<Data> encodePNG(const Image& image) override {
        if (!encodes)
            return std::nullopt;
        return Data::copyOf(std::to_string(image.width) + "x" + std::to_string(image.height));
    }

private:
    Service<ImageCodec>::Replacement m_replacement{*this};
};

}  // namespace parvel::testing
