#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace parvel::testing {

/// One entry of a built archive. What is set here is what the archive says, true or not.
struct ZipEntryPlan {
    std::string name = {};
    std::string content = {};
    bool deflate = false;

    std::optional<std::string> rawData = {};  ///< in place of the stored or deflated content
    std::optional<std::uint16_t> method = {};
    std::uint16_t flags = 0;
    std::optional<std::uint32_t> crc = {};
    std::optional<std::uint64_t> compressedSize = {};
    std::optional<std::uint64_t> size = {};
    std::optional<std::uint64_t> offset = {};
    std::uint16_t madeBy = 0x031E;  ///< Unix, 3.0
    std::uint32_t externalAttributes = 0100644U << 16;
    std::string extra = {};                     ///< in the directory
    std::string localExtra = {};                ///< in the local header
    std::string comment = {};                   ///< in the directory
    std::optional<std::string> localName = {};  ///< in the local header alone
    bool descriptor = false;                    ///< sizes and checksum behind the data
    bool zip64 = false;                         ///< sizes in a zip64 extra field
};

/// Builds zip archives byte by byte, well-formed unless told to lie:
/// `ZipBuilder{}.stored("mimetype", "application/epub+zip").deflated("a/b", text).bytes()`.
class ZipBuilder {
public:
    ZipBuilder& stored(std::string_view name, std::string_view content);
    ZipBuilder& deflated(std::string_view name, std::string_view content);
    /// A symbolic link, as Info-ZIP stores it.
    ZipBuilder& link(std::string_view name, std::string_view target);
    ZipBuilder& entry(ZipEntryPlan plan);

    ZipBuilder& comment(std::string_view text);
    /// Bytes before the first entry; the offsets do not count them unless `adjusted`.
    ZipBuilder& prefix(std::string_view junk, bool adjusted = false);
    /// Bytes behind the end record.
    ZipBuilder& trailer(std::string_view junk);
    /// Adds the zip64 end record and its locator.
    ZipBuilder& zip64();
    /// The number of entries that the end record tells.
    ZipBuilder& count(std::uint64_t entries);
    /// What the end record's directory size and offset are off the truth.
    ZipBuilder& directorySizeError(std::int64_t error);
    ZipBuilder& directoryOffsetError(std::int64_t error);
    ZipBuilder& diskNumber(std::uint16_t disk);

    [[nodiscard]] std::string bytes() const;

private:
    std::vector<ZipEntryPlan> m_entries;
    std::string m_comment;
    std::string m_prefix;
    bool m_prefixAdjusted = false;
    std::string m_trailer;
    bool m_zip64 = false;
    std::optional<std::uint64_t> m_count;
    std::int64_t m_sizeError = 0;
    std::int64_t m_offsetError = 0;
    std::uint16_t m_disk = 0;
};

/// The bytes as a raw deflate stream.
[[nodiscard]] std::string deflatedBytes(std::string_view bytes);
[[nodiscard]] std::uint32_t crc32Of(std::string_view bytes);

}  // namespace parvel::testing
