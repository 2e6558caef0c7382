#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/URL.h"
#include "parvel/platform/XmlDocument.h"
#include "parvel/platform/ZipArchive.h"

namespace parvel {

/// The members of a packaged book, zipped or expanded, for a search among them. What all its reads
/// may take together is bounded: afterwards every member counts as missing.
class BookMembers {
public:
    explicit BookMembers(const URL& book);

    /// None for a member that is missing or can't be delivered whole.
    [[nodiscard]] std::optional<Data> read(std::string_view path);
    /// The member as an XML document; null also where it is none.
    [[nodiscard]] std::shared_ptr<const XmlDocument> parse(std::string_view path);

    [[nodiscard]] bool isExhausted() const { return m_budget == 0; }

private:
    URL m_book;
    bool m_isDirectory;
    std::unique_ptr<ZipArchive> m_archive;
    std::uint64_t m_budget;
};

/// The path of the member that a reference (RFC 3986) in another one means, without its fragment.
/// It stays below the book's root, whatever the reference says. Empty where it names no member.
std::string memberForReference(std::string_view reference, std::string_view fromMember);

}  // namespace parvel
