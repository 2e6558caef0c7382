#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "parvel/foundation/PVExport.h"

namespace parvel {

/// A property-list number: a boolean, a whole number over the signed and unsigned 64-bit range, or
/// a real. It keeps its kind so that it is written back as it was read; comparison ignores the kind
/// and is exact (true equals 1, 1 equals 1.0, 2^53+1 equals no real, NaN equals NaN).
class PV_EXPORT Number {
public:
    enum class Kind : std::uint8_t { Boolean, Signed, Unsigned, Real };

    static Number boolean(bool value);
    static Number signedInteger(std::int64_t value);
    /// Of kind Signed where the value fits there; Unsigned is only what lies above 2^63-1.
    static Number unsignedInteger(std::uint64_t value);
    static Number real(double value);

    [[nodiscard]] Kind kind() const { return m_kind; }

    /// True for any value but zero.
    [[nodiscard]] bool boolValue() const;
    /// The value as a signed integer: reals are cut toward zero and saturate, NaN gives 0, and an
    /// unsigned value above 2^63-1 keeps its bits.
    [[nodiscard]] std::int64_t int64Value() const;
    /// The value as an unsigned integer; a negative one wraps.
    [[nodiscard]] std::uint64_t unsignedValue() const;
    [[nodiscard]] double doubleValue() const;

    /// The decimal string form: "1" or "0" for booleans; a real that is whole and below 1e15 as an
    /// integer, any other as the shortest text that reads back equal ("1.5", "1e+20").
    [[nodiscard]] std::string stringValue() const;

    [[nodiscard]] std::size_t hash() const;
    PV_EXPORT friend bool operator==(const Number& left, const Number& right);

private:
    Number(Kind kind, std::uint64_t bits, double real) : m_kind(kind), m_bits(bits), m_real(real) {}

    Kind m_kind;
    std::uint64_t m_bits;  ///< the whole number's two's complement bits; 0 for reals
    double m_real;         ///< the real's value; 0 for whole numbers
};

}  // namespace parvel
