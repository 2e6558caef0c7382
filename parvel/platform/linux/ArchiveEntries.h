#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string_view>
#include <vector>

#include "parvel/foundation/Data.h"
#include "parvel/platform/linux/LibzipArchive.h"
#include "parvel/platform/linux/PlainZip.h"
#include "parvel/platform/linux/ZipWindow.h"

namespace parvel::host {

/// All entries of an archive, in its directory's order. A plain archive's are listed and delivered
/// without libzip, in fewer and longer reads; wherever a doubt comes up, and for what is inflated
/// in pieces, libzip answers. Either way gives the same.
class ArchiveEntries {
public:
    using Sink = LibzipArchive::Sink;

    /// Borrows the descriptor. Null when the file is no archive, or one whose directory takes more
    /// than the budget, and where the opening is interrupted.
    [[nodiscard]] static std::unique_ptr<ArchiveEntries> open(
        int file, std::uint64_t fileSize, std::uint64_t budget,
        LibzipSource::Interruption interruption);

    [[nodiscard]] std::uint64_t count() const;
    /// The name as it is stored, good as long as this; none where there is none.
    [[nodiscard]] std::optional<std::string_view> name(std::uint64_t index) const;
    [[nodiscard]] bool describe(std::uint64_t index, ZipEntry& entry) const;
    /// Gives the content of an entry that can be delivered, in pieces of at most 8 MiB, with no
    /// more of it in memory. 0, the sink's answer, the errno value of a failed read, or EBADMSG for
    /// content that is not of the size and checksum that the entry claims.
    [[nodiscard]] int deliver(std::uint64_t index, const ZipEntry& entry, const Sink& sink);

private:
    ArchiveEntries(int file, std::uint64_t fileSize, std::uint64_t budget,
                   LibzipSource::Interruption interruption);

    [[nodiscard]] bool openFully();
    [[nodiscard]] std::optional<int> deliverPlainly(const PlainZip::Listed& listed,
                                                    const Sink& sink);
    [[nodiscard]] std::uint64_t readAhead(const PlainZip::Listed& first) const;
    [[nodiscard]] std::optional<int> deliverStored(const ZipEntry& entry, std::uint64_t ahead,
                                                   const Sink& sink);
    [[nodiscard]] std::optional<int> deliverInflated(const PlainZip::Listed& listed,
                                                     std::uint64_t ahead, const Sink& sink);

    int m_file;
    std::uint64_t m_fileSize;
    std::uint64_t m_budget;
    LibzipSource::Interruption m_interruption;

    std::unique_ptr<PlainZip> m_plain;
    std::vector<PlainZip::Listed> m_listed;
    bool m_isListed = false;  ///< rather than asked of libzip
    bool m_isSure = false;    ///< of what was listed, no doubt having come up
    ZipWindow m_window;
    std::unique_ptr<std::uint8_t[]> m_room;  ///< for what is inflated, one entry after the other
    std::size_t m_roomSize = 0;
    std::unique_ptr<LibzipArchive> m_full;
};

}  // namespace parvel::host
