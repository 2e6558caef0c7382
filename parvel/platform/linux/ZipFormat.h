#pragma once

#include <cstddef>
#include <cstdint>

/// The parts of the zip format (APPNOTE 6.3) that are read here.
namespace parvel::host::zip {

inline constexpr std::size_t signatureLength = 4;
inline constexpr char localSignature[] = "PK\x03\x04";
inline constexpr char directorySignature[] = "PK\x01\x02";
inline constexpr char endSignature[] = "PK\x05\x06";
inline constexpr char end64Signature[] = "PK\x06\x06";
inline constexpr char locator64Signature[] = "PK\x06\x07";

inline constexpr std::size_t localHeaderLength = 30;
inline constexpr std::size_t directoryHeaderLength = 46;
inline constexpr std::size_t endLength = 22;
inline constexpr std::size_t end64Length = 56;
inline constexpr std::size_t locator64Length = 20;
/// An end record with the longest comment, and the zip64 locator before it.
inline constexpr std::size_t longestEnd = locator64Length + endLength + 0xFFFF;

inline constexpr std::uint16_t encryptedFlag = 1;
inline constexpr std::uint16_t utf8Flag = 1 << 11;

inline constexpr std::uint16_t unicodeNameField = 0x7075;
inline constexpr std::uint16_t unicodeCommentField = 0x6375;
inline constexpr std::uint16_t strongCipherField = 0x9901;
inline constexpr std::uint16_t strongCipherMethod = 99;

/// In place of a number that stands in a zip64 record.
inline constexpr std::uint16_t max16 = 0xFFFF;
inline constexpr std::uint32_t max32 = 0xFFFFFFFF;

// All numbers are little-endian, at any address.
inline std::uint16_t get16(const std::uint8_t* bytes) {
    return static_cast<std::uint16_t>(bytes[0] | bytes[1] << 8);
}
inline std::uint32_t get32(const std::uint8_t* bytes) {
    return get16(bytes) | static_cast<std::uint32_t>(get16(bytes + 2)) << 16;
}
inline std::uint64_t get64(const std::uint8_t* bytes) {
    return get32(bytes) | static_cast<std::uint64_t>(get32(bytes + 4)) << 32;
}

}  // namespace parvel::host::zip
