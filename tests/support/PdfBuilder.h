#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace parvel::testing {

/// Builds PDF documents: `PdfBuilder{}.information("/Author (Ann)").page("").bytes()`. What is
/// given is put in as it stands.
class PdfBuilder {
public:
    /// The entries of the document information.
    PdfBuilder& information(std::string_view entries) {
        m_information = entries;
        return *this;
    }
    /// Entries of the root of the page tree, which pages inherit.
    PdfBuilder& inherited(std::string_view entries) {
        m_inherited = entries;
        return *this;
    }
    /// Entries of the trailer.
    PdfBuilder& trailer(std::string_view entries) {
        m_trailer = entries;
        return *this;
    }
    PdfBuilder& page(std::string_view entries, std::string_view content = "") {
        m_pages.push_back({std::string(entries), std::string(content)});
        return *this;
    }
    /// What the page tree says of the number of pages, true or not.
    PdfBuilder& count(std::string_view number) {
        m_count = number;
        return *this;
    }

    [[nodiscard]] std::string bytes() const {
        std::string kids;
        for (std::size_t i = 0; i < m_pages.size(); ++i)
            kids += std::to_string(firstPage + 2 * i) + " 0 R ";
        const std::string count = m_count.empty() ? std::to_string(m_pages.size()) : m_count;
        std::vector<std::string> objects{
            "<< /Type /Catalog /Pages 2 0 R >>",
            "<< /Type /Pages /Kids [" + kids + "] /Count " + count + " " + m_inherited + " >>",
            "<< " + m_information + " >>"};
        for (const Page& page : m_pages) {
            objects.push_back("<< /Type /Page /Parent 2 0 R /Contents " +
                              std::to_string(objects.size() + 2) + " 0 R " + page.entries + " >>");
            objects.push_back("<< /Length " + std::to_string(page.content.size()) +
                              " >>\nstream\n" + page.content + "\nendstream");
        }
        return written(objects);
    }

private:
    struct Page {
        std::string entries;
        std::string content;
    };
    static constexpr std::size_t firstPage = 4;

    [[nodiscard]] std::string written(const std::vector<std::string>& objects) const {
        std::string text = "%PDF-1.7\n";
        std::string table = "0000000000 65535 f \n";
        for (std::size_t i = 0; i < objects.size(); ++i) {
            const std::string offset = std::to_string(text.size());
            table += std::string(10 - offset.size(), '0') + offset + " 00000 n \n";
            text += std::to_string(i + 1) + " 0 obj\n" + objects[i] + "\nendobj\n";
        }
        const std::string size = std::to_string(objects.size() + 1);
        return text + "xref\n0 " + size + "\n" + table + "trailer\n<< /Size " + size +
               " /Root 1 0 R /Info 3 0 R " + m_trailer + " >>\nstartxref\n" +
               std::to_string(text.size()) + "\n%%EOF\n";
    }

    std::string m_information;
    std::string m_inherited = "/MediaBox [0 0 612 792]";
    std::string m_trailer;
    std::string m_count;
    std::vector<Page> m_pages;
};

/// Draws a filled rectangle: `filled("1 0 0", "0 0 10 10")`.
inline std::string filled(std::string_view colour, std::string_view rectangle) {
    return std::string(colour) + " rg " + std::string(rectangle) + " re f\n";
}

}  // namespace parvel::testing
