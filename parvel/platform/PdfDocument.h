#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/Date.h"
#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/Image.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// A page of a document, which it needs alive. For one thread.
class PdfPage {
public:
    virtual ~PdfPage() = default;

    /// The crop box's size in points, before any rotation; neither negative nor NaN, but it may be
    /// zero.
    [[nodiscard]] virtual double cropBoxWidth() const = 0;
    [[nodiscard]] virtual double cropBoxHeight() const = 0;
    /// Clockwise, in degrees; 0 for an angle that is no multiple of 90.
    [[nodiscard]] virtual int rotation() const = 0;

    /// The page on opaque white, exactly as large as asked: its crop box drawn as large as fits,
    /// turned by its rotation, its shape kept (to the pixel), centred. None when it can't be drawn
    /// within the limits of time and memory, or the size is 0 or over 16384 a side.
    [[nodiscard]] virtual std::optional<Image> draw(std::uint32_t width, std::uint32_t height) = 0;
};

/// A PDF document (ISO 32000) that was opened. A locked one has no texts, dates or pages. For one
/// thread.
class PdfDocument {
public:
    virtual ~PdfDocument() = default;

    /// Whether the document is encrypted and the empty password does not open it.
    [[nodiscard]] virtual bool isLocked() const = 0;
    /// The entry of the document information; none when it is missing or is longer than 64 KiB as
    /// UTF-8, empty when it is no text.
    [[nodiscard]] virtual std::optional<std::string> author() const = 0;
    [[nodiscard]] virtual std::optional<std::string> subject() const = 0;
    /// None when the entry is missing or is no date.
    [[nodiscard]] virtual std::optional<Date> creationDate() const = 0;
    [[nodiscard]] virtual std::optional<Date> modificationDate() const = 0;
    [[nodiscard]] virtual std::uint32_t pageCount() const = 0;
    /// Null when there is none, also where the page count says otherwise. One of which nothing
    /// could be learnt has no size and is not drawn.
    [[nodiscard]] virtual std::unique_ptr<PdfPage> firstPage() = 0;
};

/// A file that may hold a PDF document, opened once for all that is read of it. For one thread.
class PdfFile {
public:
    virtual ~PdfFile() = default;

    /// Hands over all bytes, in order and in pieces. False with an error of makeServiceError when
    /// the file can't be read to its end.
    [[nodiscard]] virtual bool readAll(const std::function<void(Data::Bytes)>& take,
                                       ErrorOut error = nullptr) = 0;
};

/// Opens PDF documents: `Service<PdfDocuments>::current()`. They are parsed and drawn in a confined
/// process, so that a hostile one can do no more than fail to open.
class PdfDocuments {
public:
    virtual ~PdfDocuments() = default;

    /// Opens a file for reading, links followed. Null with an error of makeServiceError for what
    /// can't be opened; what is no regular file counts as corrupt, but for a folder (EISDIR).
    [[nodiscard]] virtual std::unique_ptr<PdfFile> openFile(const URL& url,
                                                            ErrorOut error = nullptr) = 0;
    /// Opens the document in the file; the file is no longer needed afterwards. Null for what is no
    /// document that can be read within the limits, with the general error of a corrupt file and
    /// the URL. Where the confined process could not be had, the error's failure reason says so.
    [[nodiscard]] virtual std::unique_ptr<PdfDocument> openDocument(PdfFile& file,
                                                                    ErrorOut error = nullptr) = 0;

    /// Both steps.
    [[nodiscard]] std::unique_ptr<PdfDocument> open(const URL& url, ErrorOut error = nullptr) {
        const std::unique_ptr<PdfFile> file = openFile(url, error);
        return file ? openDocument(*file, error) : nullptr;
    }

    static PdfDocuments& host();
};

}  // namespace parvel
