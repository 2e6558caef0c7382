#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <utility>
#include <vector>

#include "parvel/platform/MalformedInput.h"
#include "parvel/platform/TextRules.h"
#include "parvel/platform/linux/PropertyListForms.h"

// The binary form, all numbers big-endian:
//   "bplist00", the objects, the table of their offsets, a trailer of 32 bytes.
// An object is a marker byte (kind in the high four bits, size in the low four), then its content.
// Containers hold references, which are indexes into the table. Objects may be shared, so what is
// read is counted as it is visited, not as it is stored.

namespace parvel {
namespace {

constexpr std::size_t kHeaderSize = 8;
constexpr std::size_t kTrailerSize = 32;
constexpr double kLatestDate = 1e13;
/// What sharing may make of a list.
constexpr std::size_t kNodesPerByte = 16;
constexpr std::size_t kTextPerByte = 4;
constexpr std::size_t kSharedText = 1 << 20;

std::uint64_t bigEndian(Data::Bytes bytes) {
    std::uint64_t value = 0;
    for (const std::uint8_t byte : bytes)
        value = value << 8 | byte;
    return value;
}

/// A lone half of a surrogate pair becomes U+FFFD.
String textFromUTF16(Data::Bytes bytes) {
    String text;
    text.reserve(bytes.size());
    for (std::size_t i = 0; i < bytes.size(); i += 2) {
        auto unit = static_cast<std::uint32_t>(bigEndian(bytes.subspan(i, 2)));
        if (unit >= 0xD800 && unit < 0xDC00 && i + 2 < bytes.size()) {
            const auto low = static_cast<std::uint32_t>(bigEndian(bytes.subspan(i + 2, 2)));
            if (low >= 0xDC00 && low < 0xE000) {
                unit = 0x10000 + ((unit - 0xD800) << 10) + (low - 0xDC00);
                i += 2;
            }
        }
        appendUTF8(text, unit >= 0xD800 && unit < 0xE000 ? 0xFFFD : unit);
    }
    return text;
}

class BinaryPropertyList {
public:
    explicit BinaryPropertyList(Data::Bytes bytes)
        : m_bytes(bytes),
          m_nodesLeft(std::min(kMaximumPropertyListNodes, kNodesPerByte * bytes.size())),
          m_textLeft(kSharedText + kTextPerByte * bytes.size()) {}

    std::optional<Value> read() {
        if (!readTrailer())
            return std::nullopt;
        spendNodes(1);
        return object(m_top, 1);
    }

private:
    /// An object's marker and content, not yet of its full size.
    struct Object {
        unsigned kind = 0;
        std::uint64_t size = 0;
        Data::Bytes rest;  ///< what follows, up to the offset table
    };

    bool readTrailer();
    std::optional<Object> objectAt(std::uint64_t index) const;
    std::optional<Value> object(std::uint64_t index, std::size_t depth);
    std::optional<Value> simple(unsigned marker) const;
    std::optional<Value> integer(const Object& object) const;
    std::optional<Value> real(const Object& object) const;
    std::optional<Value> date(const Object& object) const;
    std::optional<Value> uid(const Object& object) const;
    std::optional<Value> data(const Object& object);
    std::optional<Value> text(const Object& object, std::size_t unitSize);
    std::optional<Value> array(const Object& object, std::size_t depth);
    std::optional<Value> dictionary(const Object& object, std::size_t depth);
    std::optional<String> key(std::uint64_t index);

    bool takeReferences(const Object& object, std::size_t perEntry);
    std::uint64_t reference(const Object& object, std::uint64_t position) const;
    void spendNodes(std::uint64_t count);
    void spendText(std::uint64_t size);

    Data::Bytes m_bytes;
    Data::Bytes m_objects;  ///< the header and the objects
    Data::Bytes m_offsets;
    std::size_t m_offsetSize = 0;
    std::size_t m_referenceSize = 0;
    std::uint64_t m_count = 0;
    std::uint64_t m_top = 0;
    std::uint64_t m_nodesLeft;
    std::uint64_t m_textLeft;
};

bool BinaryPropertyList::readTrailer() {
    if (m_bytes.size() < kHeaderSize + kTrailerSize)
        return false;
    const Data::Bytes trailer = m_bytes.last(kTrailerSize);
    m_offsetSize = trailer[6];
    m_referenceSize = trailer[7];
    m_count = bigEndian(trailer.subspan(8, 8));
    m_top = bigEndian(trailer.subspan(16, 8));
    const std::uint64_t table = bigEndian(trailer.subspan(24, 8));
    const auto isSize = [](std::size_t size) { return size >= 1 && size <= 8; };
    const std::size_t end = m_bytes.size() - kTrailerSize;
    if (!isSize(m_offsetSize) || !isSize(m_referenceSize) || table < kHeaderSize || table > end ||
        m_count > (end - table) / m_offsetSize)
        return false;
    m_objects = m_bytes.first(table);
    m_offsets = m_bytes.subspan(table, m_count * m_offsetSize);
    return true;
}

std::optional<BinaryPropertyList::Object> BinaryPropertyList::objectAt(std::uint64_t index) const {
    if (index >= m_count)
        return std::nullopt;
    const std::uint64_t offset = bigEndian(m_offsets.subspan(index * m_offsetSize, m_offsetSize));
    if (offset < kHeaderSize || offset >= m_objects.size())
        return std::nullopt;
    const unsigned marker = m_objects[offset];
    Object object{marker >> 4, marker & 0xF, m_objects.subspan(offset + 1)};
    // For data, texts and containers a size of 15 says that the size follows as an integer.
    const bool isCounted = (object.kind >= 4 && object.kind <= 6) || object.kind >= 0xA;
    if (!isCounted || object.size != 0xF)
        return object;
    if (object.rest.empty() || object.rest[0] < 0x10 || object.rest[0] > 0x13)
        return std::nullopt;
    const std::size_t width = std::size_t{1} << (object.rest[0] & 0xF);
    if (object.rest.size() < 1 + width)
        return std::nullopt;
    object.size = bigEndian(object.rest.subspan(1, width));
    object.rest = object.rest.subspan(1 + width);
    return object;
}

std::optional<Value> BinaryPropertyList::object(std::uint64_t index, std::size_t depth) {
    const std::optional<Object> found = objectAt(index);
    if (!found)
        return std::nullopt;
    switch (found->kind) {
        case 0x0:
            return simple(static_cast<unsigned>(found->size));
        case 0x1:
            return integer(*found);
        case 0x2:
            return real(*found);
        case 0x3:
            return date(*found);
        case 0x4:
            return data(*found);
        case 0x5:
            return text(*found, 1);
        case 0x6:
            return text(*found, 2);
        case 0x8:
            return uid(*found);
        case 0xA:
        case 0xB:
        case 0xC:
            return array(*found, depth);
        case 0xD:
            return dictionary(*found, depth);
        default:
            return std::nullopt;
    }
}

std::optional<Value> BinaryPropertyList::simple(unsigned marker) const {
    if (marker != 0x8 && marker != 0x9)
        return std::nullopt;
    return Number::boolean(marker == 0x9);
}

/// One, two and four bytes are unsigned, eight and sixteen signed.
std::optional<Value> BinaryPropertyList::integer(const Object& object) const {
    const std::size_t width = std::size_t{1} << object.size;
    if (object.size > 4 || object.rest.size() < width)
        return std::nullopt;
    if (width < 8)
        return Number::unsignedInteger(bigEndian(object.rest.first(width)));
    const std::uint64_t low = bigEndian(object.rest.subspan(width - 8, 8));
    const auto asSigned = static_cast<std::int64_t>(low);
    const std::uint64_t high =
        width == 8 ? (asSigned < 0 ? ~std::uint64_t{0} : 0) : bigEndian(object.rest.first(8));
    if (high == 0)
        return Number::unsignedInteger(low);
    if (high == ~std::uint64_t{0} && asSigned < 0)
        return Number::signedInteger(asSigned);
    return std::nullopt;
}

std::optional<Value> BinaryPropertyList::real(const Object& object) const {
    if (object.size == 2 && object.rest.size() >= 4)
        return Number::real(
            std::bit_cast<float>(static_cast<std::uint32_t>(bigEndian(object.rest.first(4)))));
    if (object.size == 3 && object.rest.size() >= 8)
        return Number::real(std::bit_cast<double>(bigEndian(object.rest.first(8))));
    return std::nullopt;
}

std::optional<Value> BinaryPropertyList::date(const Object& object) const {
    if (object.size != 3 || object.rest.size() < 8)
        return std::nullopt;
    const auto seconds = std::bit_cast<double>(bigEndian(object.rest.first(8)));
    if (!(std::abs(seconds) <= kLatestDate))
        return std::nullopt;
    return Date{seconds};
}

std::optional<Value> BinaryPropertyList::uid(const Object& object) const {
    const std::size_t width = object.size + 1;
    if (width > 8 || object.rest.size() < width)
        return std::nullopt;
    return Dictionary{{"CF$UID", Number::unsignedInteger(bigEndian(object.rest.first(width)))}};
}

std::optional<Value> BinaryPropertyList::data(const Object& object) {
    if (object.size > object.rest.size())
        return std::nullopt;
    spendText(object.size);
    return Data::copyOf(object.rest.first(object.size));
}

std::optional<Value> BinaryPropertyList::text(const Object& object, std::size_t unitSize) {
    if (object.size > object.rest.size() / unitSize)
        return std::nullopt;
    const Data::Bytes bytes = object.rest.first(object.size * unitSize);
    spendText(bytes.size());
    if (unitSize == 2)
        return textFromUTF16(bytes);
    const auto isNoASCII = [](std::uint8_t byte) { return byte >= 0x80; };
    if (std::any_of(bytes.begin(), bytes.end(), isNoASCII))
        return std::nullopt;
    return String(bytes.begin(), bytes.end());
}

std::optional<Value> BinaryPropertyList::array(const Object& object, std::size_t depth) {
    if (!takeReferences(object, 1))
        return std::nullopt;
    if (depth > kMaximumPropertyListDepth)
        throw MalformedInput("a property list nested too deep");
    std::vector<Value> values;
    values.reserve(object.size);
    for (std::uint64_t i = 0; i < object.size; ++i) {
        std::optional<Value> value = this->object(reference(object, i), depth + 1);
        if (!value)
            return std::nullopt;
        values.push_back(std::move(*value));
    }
    return Array(std::move(values));
}

/// The references of all keys stand before those of the values.
std::optional<Value> BinaryPropertyList::dictionary(const Object& object, std::size_t depth) {
    if (!takeReferences(object, 2))
        return std::nullopt;
    if (depth > kMaximumPropertyListDepth)
        throw MalformedInput("a property list nested too deep");
    std::vector<Dictionary::Entry> entries;
    entries.reserve(object.size);
    for (std::uint64_t i = 0; i < object.size; ++i) {
        std::optional<String> name = key(reference(object, i));
        if (!name)
            return std::nullopt;
        std::optional<Value> value = this->object(reference(object, object.size + i), depth + 1);
        if (!value)
            return std::nullopt;
        entries.push_back({std::move(*name), std::move(*value)});
    }
    return Dictionary(std::move(entries));
}

std::optional<String> BinaryPropertyList::key(std::uint64_t index) {
    const std::optional<Object> found = objectAt(index);
    if (!found || (found->kind != 0x5 && found->kind != 0x6))
        return std::nullopt;
    const std::optional<Value> value = text(*found, found->kind == 0x5 ? 1 : 2);
    return value ? std::optional<String>(*value->as<String>()) : std::nullopt;
}

/// Spends the nodes of all of them at once, before room is set aside: containers may share bytes,
/// so what each has room for must not be counted for each anew.
bool BinaryPropertyList::takeReferences(const Object& object, std::size_t perEntry) {
    if (object.size > object.rest.size() / (perEntry * m_referenceSize))
        return false;
    spendNodes(object.size * perEntry);
    return true;
}

std::uint64_t BinaryPropertyList::reference(const Object& object, std::uint64_t position) const {
    return bigEndian(object.rest.subspan(position * m_referenceSize, m_referenceSize));
}

void BinaryPropertyList::spendNodes(std::uint64_t count) {
    if (count > m_nodesLeft)
        throw MalformedInput("a property list of too many values");
    m_nodesLeft -= count;
}

void BinaryPropertyList::spendText(std::uint64_t size) {
    if (size > m_textLeft)
        throw MalformedInput("a property list of too much shared text");
    m_textLeft -= size;
}

}  // namespace

std::optional<Value> readBinaryPropertyList(Data::Bytes bytes) {
    return BinaryPropertyList(bytes).read();
}

}  // namespace parvel
