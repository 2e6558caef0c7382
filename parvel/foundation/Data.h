#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string_view>
#include <vector>

#include "parvel/foundation/PVExport.h"

namespace parvel {

/// Immutable bytes in one or more ranges. Copies share the bytes. They are owned in memory and
/// never mapped from a file, so nobody can cut them short. What was moved from is only to be
/// assigned to or destroyed.
class PV_EXPORT Data {
public:
    using Bytes = std::span<const std::uint8_t>;

    /// No bytes: one empty range.
    Data() = default;

    static Data copyOf(Bytes bytes);
    static Data copyOf(std::string_view text);
    /// Takes over a buffer that holds at least `size` bytes.
    static Data adopt(std::unique_ptr<std::uint8_t[]> buffer, std::size_t size);
    /// The bytes of all parts in order, each part's ranges kept as they are and shared.
    static Data joining(std::span<const Data> parts);

    [[nodiscard]] std::size_t size() const { return m_size; }
    [[nodiscard]] bool empty() const { return m_size == 0; }

    /// The ranges in order; empty for no bytes.
    [[nodiscard]] std::vector<Bytes> ranges() const;
    /// All bytes as one range, good while this object and `storage` are: data of several ranges is
    /// copied into `storage` at each call.
    [[nodiscard]] Bytes contiguous(std::vector<std::uint8_t>& storage) const;
    /// The same as text, in no encoding.
    [[nodiscard]] std::string_view text(std::vector<std::uint8_t>& storage) const;

    /// Of the size and the first bytes.
    [[nodiscard]] std::size_t hash() const;
    /// Equal bytes, however they are cut into ranges.
    PV_EXPORT friend bool operator==(const Data& left, const Data& right);

private:
    struct Range {
        std::shared_ptr<const std::uint8_t[]> bytes;
        std::size_t size = 0;
    };

    Range m_first;  ///< the only range in nearly all cases, so held without a list
    std::vector<Range> m_rest;
    std::size_t m_size = 0;
};

}  // namespace parvel
