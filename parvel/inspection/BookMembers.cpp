#include "parvel/inspection/BookMembers.h"

#include <algorithm>

#include "parvel/platform/FileReader.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"

namespace parvel {

namespace {

constexpr std::uint64_t mostBytes = 2 * budget::packageDocument;
/// What a failed read counts for, since the reading itself may have taken a while.
constexpr std::uint64_t failedRead = 1ULL << 20;

bool hasScheme(std::string_view reference) {
    const std::size_t end = reference.find_first_of(":/?#");
    return end != std::string_view::npos && reference[end] == ':';
}

}  // namespace

BookMembers::BookMembers(const URL& book)
    : m_book(book),
      m_isDirectory(Service<ResourceQueries>::current().isDirectory(book).value_or(false)),
      m_archive(m_isDirectory ? nullptr : Service<ZipReader>::current().open(book)),
      m_budget(m_isDirectory || m_archive ? mostBytes : 0) {}

std::optional<Data> BookMembers::read(std::string_view path) {
    if (path.empty() || isExhausted())
        return std::nullopt;
    const std::uint64_t limit = std::min(m_budget, budget::packageDocument);
    std::optional<Data> bytes = m_isDirectory
                                    ? Service<FileReader>::current().readMember(m_book, path, limit)
                                    : m_archive->readEntry(path, limit);
    m_budget -= std::min(m_budget, bytes ? std::uint64_t{bytes->size()} : failedRead);
    return bytes;
}

std::shared_ptr<const XmlDocument> BookMembers::parse(std::string_view path) {
    const std::optional<Data> bytes = read(path);
    return bytes ? Service<XmlParser>::current().parse(*bytes, m_book) : nullptr;
}

std::string memberForReference(std::string_view reference, std::string_view fromMember) {
    reference = reference.substr(0, reference.find_first_of("#?"));
    if (reference.empty() || hasScheme(reference) || reference.starts_with("//"))
        return {};
    const bool isFromRoot = reference.starts_with('/');
    const std::string folder =
        pathAppending("/", isFromRoot ? "" : pathWithoutLastComponent(fromMember));

    // Many books have names in them that are not escaped as they should be.
    const std::optional<URL> escaped = URL::fromString(
        URL::fileURLWithPath(folder).absoluteString() + "/" + std::string(reference));
    const URL target =
        escaped ? *escaped : URL::fileURLWithPath(folder + "/" + std::string(reference));
    return target.standardized().path().substr(1);
}

}  // namespace parvel
