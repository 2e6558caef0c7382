#pragma once

#include <memory>

#include "reader/Channel.h"

namespace poppler {
class document;
class page;
}  // namespace poppler

namespace parvel::reader {

class Input;

/// The PDF document that is open, if any, and what is asked of it. A locked one is asked for
/// nothing but that: it would bring the PDF library down.
class Document {
public:
    /// Makes the PDF library ready, which opens files of the host: before the walls go up. It stays
    /// so for the process's life.
    Document();
    ~Document();
    Document(const Document&) = delete;
    Document& operator=(const Document&) = delete;

    /// Refused for what is no document.
    [[nodiscard]] Answer open(const Received& received);
    void close();
    /// How many bytes of the address space the open document is mapped into.
    [[nodiscard]] std::uint64_t mappedSize() const;
    [[nodiscard]] Answer describePage() const;
    /// Refused when there is no page to draw.
    [[nodiscard]] Answer drawPage(const Request& request) const;

private:
    [[nodiscard]] std::unique_ptr<poppler::page> firstPage() const;

    std::unique_ptr<poppler::document> m_held;  ///< keeps the PDF library's state
    std::unique_ptr<Input> m_input;
    std::unique_ptr<poppler::document> m_document;
};

}  // namespace parvel::reader
