#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace parvel::testing {

/// A number as big-endian bytes.
inline std::string bigEndianBytes(std::uint64_t value, std::size_t size) {
    std::string bytes(size, '\0');
    for (std::size_t i = size; i-- > 0; value >>= 8)
        bytes[i] = static_cast<char>(value);
    return bytes;
}

/// A binary property list out of its objects' bytes. References have four bytes. The first object
/// is the top one.
struct BinaryPropertyListBuilder {
    std::vector<std::string> objects = {};
    std::uint64_t top = 0;
    std::size_t offsetSize = 4;
    std::size_t referenceSize = 4;

    /// Adds an object; its index is the number of those added before it.
    BinaryPropertyListBuilder& add(std::string_view object) {
        objects.emplace_back(object);
        return *this;
    }
    /// A list or dictionary of up to 2^32 references; `kind` is 0xA0 for a list, 0xD0 for a
    /// dictionary, whose count is that of its keys.
    BinaryPropertyListBuilder& addContainer(unsigned kind, std::uint64_t count,
                                            const std::vector<std::uint64_t>& references) {
        std::string object(1, static_cast<char>(kind | 0xF));
        object += '\x12' + bigEndianBytes(count, 4);
        for (const std::uint64_t reference : references)
            object += bigEndianBytes(reference, referenceSize);
        return add(object);
    }

    [[nodiscard]] std::string bytes() const {
        std::string text = "bplist00";
        std::string offsets;
        for (const std::string& object : objects) {
            offsets += bigEndianBytes(text.size(), offsetSize);
            text += object;
        }
        const std::size_t table = text.size();
        return text + offsets + std::string(6, '\0') + static_cast<char>(offsetSize) +
               static_cast<char>(referenceSize) + bigEndianBytes(objects.size(), 8) +
               bigEndianBytes(top, 8) + bigEndianBytes(table, 8);
    }
};

}  // namespace parvel::testing
