#include "parvel/foundation/Data.h"

#include <algorithm>
#include <cstring>
#include <utility>

namespace parvel {
namespace {

Data::Bytes bytesOf(std::string_view text) {
    return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
}

}  // namespace

Data Data::copyOf(Bytes bytes) {
    if (bytes.empty())
        return {};
    std::shared_ptr<std::uint8_t[]> copy =
        std::make_shared_for_overwrite<std::uint8_t[]>(bytes.size());
    std::memcpy(copy.get(), bytes.data(), bytes.size());

    Data data;
    data.m_first = {std::move(copy), bytes.size()};
    data.m_size = bytes.size();
    return data;
}

Data Data::copyOf(std::string_view text) {
    return copyOf(bytesOf(text));
}

Data Data::adopt(std::unique_ptr<std::uint8_t[]> buffer, std::size_t size) {
    if (size == 0)
        return {};
    Data data;
    data.m_first = {std::move(buffer), size};
    data.m_size = size;
    return data;
}

Data Data::joining(std::span<const Data> parts) {
    Data joined;
    const auto append = [&joined](const Range& range) {
        if (range.size == 0)
            return;
        if (joined.empty())
            joined.m_first = range;
        else
            joined.m_rest.push_back(range);
        joined.m_size += range.size;
    };
    for (const Data& part : parts) {
        append(part.m_first);
        std::for_each(part.m_rest.begin(), part.m_rest.end(), append);
    }
    return joined;
}

std::vector<Data::Bytes> Data::ranges() const {
    std::vector<Bytes> ranges;
    if (empty())
        return ranges;
    ranges.reserve(1 + m_rest.size());
    ranges.emplace_back(m_first.bytes.get(), m_first.size);
    for (const Range& range : m_rest)
        ranges.emplace_back(range.bytes.get(), range.size);
    return ranges;
}

Data::Bytes Data::contiguous(std::vector<std::uint8_t>& storage) const {
    if (m_rest.empty())
        return {m_first.bytes.get(), m_first.size};
    storage.clear();
    storage.reserve(m_size);
    for (Bytes range : ranges())
        storage.insert(storage.end(), range.begin(), range.end());
    return storage;
}

std::string_view Data::text(std::vector<std::uint8_t>& storage) const {
    const Bytes bytes = contiguous(storage);
    return {reinterpret_cast<const char*>(bytes.data()), bytes.size()};
}

std::size_t Data::hash() const {
    constexpr std::size_t kHashedBytes = 256;  // the head tells documents apart well enough
    std::uint64_t hash = 14695981039346656037U ^ m_size;
    std::size_t left = kHashedBytes;
    for (Bytes range : ranges()) {
        for (std::uint8_t byte : range.first(std::min(left, range.size())))
            hash = (hash ^ byte) * 1099511628211U;
        left -= std::min(left, range.size());
        if (left == 0)
            break;
    }
    return hash;
}

bool operator==(const Data& left, const Data& right) {
    if (left.m_size != right.m_size)
        return false;
    const std::vector<Data::Bytes> leftRanges = left.ranges();
    const std::vector<Data::Bytes> rightRanges = right.ranges();
    auto nextLeft = leftRanges.begin();
    auto nextRight = rightRanges.begin();
    Data::Bytes a;
    Data::Bytes b;
    for (std::size_t compared = 0; compared < left.m_size;) {
        if (a.empty())
            a = *nextLeft++;
        if (b.empty())
            b = *nextRight++;
        const std::size_t length = std::min(a.size(), b.size());
        if (a.data() != b.data() && std::memcmp(a.data(), b.data(), length) != 0)
            return false;
        a = a.subspan(length);
        b = b.subspan(length);
        compared += length;
    }
    return true;
}

}  // namespace parvel
