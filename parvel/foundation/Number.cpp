#include "parvel/foundation/Number.h"

#include <bit>
#include <charconv>
#include <cmath>
#include <functional>
#include <limits>

namespace parvel {
namespace {

constexpr double kTwoTo63 = 9223372036854775808.0;
constexpr double kTwoTo64 = 18446744073709551616.0;

/// Cut toward zero, saturating; NaN gives 0.
std::int64_t signedFromReal(double real) {
    if (std::isnan(real))
        return 0;
    if (real >= kTwoTo63)
        return std::numeric_limits<std::int64_t>::max();
    if (real < -kTwoTo63)
        return std::numeric_limits<std::int64_t>::min();
    return static_cast<std::int64_t>(real);
}

std::uint64_t unsignedFromReal(double real) {
    if (real >= kTwoTo64)
        return std::numeric_limits<std::uint64_t>::max();
    if (real >= kTwoTo63)
        return static_cast<std::uint64_t>(real);
    return static_cast<std::uint64_t>(signedFromReal(real));
}

/// A form that is the same for equal values of whatever kind, and for no others: every whole value
/// of the two 64-bit ranges as an integer, the rest by the bits of the real.
struct Canonical {
    enum class Form : std::uint8_t { NonNegative, Negative, Real };
    Form form;
    std::uint64_t bits;
    friend bool operator==(const Canonical&, const Canonical&) = default;
};

Canonical canonicalInteger(bool negative, std::uint64_t bits) {
    return {negative ? Canonical::Form::Negative : Canonical::Form::NonNegative, bits};
}

Canonical canonicalReal(double real) {
    if (std::isnan(real))
        return {Canonical::Form::Real,
                std::bit_cast<std::uint64_t>(std::numeric_limits<double>::quiet_NaN())};
    const bool isInteger = std::trunc(real) == real && real >= -kTwoTo63 && real < kTwoTo64;
    if (!isInteger)
        return {Canonical::Form::Real, std::bit_cast<std::uint64_t>(real)};
    return canonicalInteger(real < 0, unsignedFromReal(real));
}

Canonical canonical(const Number& number) {
    if (number.kind() == Number::Kind::Real)
        return canonicalReal(number.doubleValue());
    const bool negative = number.kind() == Number::Kind::Signed && number.int64Value() < 0;
    return canonicalInteger(negative, number.unsignedValue());
}

}  // namespace

Number Number::boolean(bool value) {
    return {Kind::Boolean, value ? 1U : 0U, 0};
}

Number Number::signedInteger(std::int64_t value) {
    return {Kind::Signed, static_cast<std::uint64_t>(value), 0};
}

Number Number::unsignedInteger(std::uint64_t value) {
    const bool fits = value <= static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max());
    return {fits ? Kind::Signed : Kind::Unsigned, value, 0};
}

Number Number::real(double value) {
    return {Kind::Real, 0, value};
}

bool Number::boolValue() const {
    return m_kind == Kind::Real ? m_real != 0 : m_bits != 0;
}

std::int64_t Number::int64Value() const {
    return m_kind == Kind::Real ? signedFromReal(m_real) : static_cast<std::int64_t>(m_bits);
}

std::uint64_t Number::unsignedValue() const {
    return m_kind == Kind::Real ? unsignedFromReal(m_real) : m_bits;
}

double Number::doubleValue() const {
    switch (m_kind) {
        case Kind::Real:
            return m_real;
        case Kind::Signed:
            return static_cast<double>(static_cast<std::int64_t>(m_bits));
        case Kind::Boolean:
        case Kind::Unsigned:
            break;
    }
    return static_cast<double>(m_bits);
}

std::string Number::stringValue() const {
    constexpr double kLeastScientific = 1e15;
    if (m_kind == Kind::Unsigned)
        return std::to_string(m_bits);
    if (m_kind != Kind::Real)
        return std::to_string(static_cast<std::int64_t>(m_bits));
    if (std::isnan(m_real))
        return "nan";
    // A negative zero equals zero, so it reads "0" too.
    if (std::fabs(m_real) < kLeastScientific && std::trunc(m_real) == m_real)
        return std::to_string(static_cast<std::int64_t>(m_real));

    char text[32];
    return {text, std::to_chars(text, text + sizeof text, m_real).ptr};
}

std::size_t Number::hash() const {
    const Canonical form = canonical(*this);
    return std::hash<std::uint64_t>{}(form.bits) + 31 * static_cast<std::size_t>(form.form);
}

bool operator==(const Number& left, const Number& right) {
    return canonical(left) == canonical(right);
}

}  // namespace parvel
