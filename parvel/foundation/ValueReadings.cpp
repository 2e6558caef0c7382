#include "parvel/foundation/ValueReadings.h"

#include <algorithm>
#include <charconv>
#include <limits>

namespace parvel {
namespace {

bool isDecimalDigit(char character) {
    return character >= '0' && character <= '9';
}

/// Takes leading white space and a sign off the text; returns whether the sign is a minus.
bool takeSign(std::string_view& text) {
    text.remove_prefix(std::min(text.find_first_not_of(" \t\n\v\f\r"), text.size()));
    const bool negative = text.starts_with('-');
    if (negative || text.starts_with('+'))
        text.remove_prefix(1);
    return negative;
}

/// Whether a decimal number that is no double's is too large for one rather than too small.
bool isTooLarge(std::string_view number) {
    const std::size_t exponentMark = std::min(number.find_first_of("eE"), number.size());
    const std::string_view digits = number.substr(0, exponentMark);
    const std::size_t point = std::min(digits.find('.'), digits.size());
    const std::size_t first = digits.find_first_of("123456789");
    const double exponent = exponentMark < number.size()
                                ? static_cast<double>(int64Reading(number.substr(exponentMark + 1)))
                                : 0;
    return static_cast<double>(point) - static_cast<double>(first) + exponent > 0;
}

/// White space, a sign and a decimal number with an optional exponent; 0 where there is none.
double doubleReadingOfText(std::string_view text) {
    const bool negative = takeSign(text);
    // The standard's reader would take another sign, "inf" and "nan" too.
    if (text.empty() || (!isDecimalDigit(text.front()) && text.front() != '.'))
        return 0;
    double number = 0;
    const auto [end, failure] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (failure == std::errc::result_out_of_range) {
        const std::string_view read(text.data(), static_cast<std::size_t>(end - text.data()));
        number = isTooLarge(read) ? std::numeric_limits<double>::infinity() : 0;
    }
    return negative ? -number : number;
}

}  // namespace

std::optional<String> stringForm(const Value* value) {
    if (!value)
        return std::nullopt;
    if (const auto* text = value->as<String>())
        return *text;
    if (const auto* number = value->as<Number>())
        return number->stringValue();
    return std::nullopt;
}

std::int64_t int64Reading(std::string_view text) {
    constexpr std::uint64_t kMost = std::numeric_limits<std::int64_t>::max();
    const bool negative = takeSign(text);
    const std::uint64_t limit = negative ? kMost + 1 : kMost;
    std::uint64_t magnitude = 0;
    for (char character : text) {
        if (!isDecimalDigit(character))
            break;
        const auto digit = static_cast<std::uint64_t>(character - '0');
        if (magnitude > (limit - digit) / 10) {
            magnitude = limit;
            break;
        }
        magnitude = magnitude * 10 + digit;
    }
    return static_cast<std::int64_t>(negative ? 0 - magnitude : magnitude);
}

std::int64_t int64Reading(const Value* value) {
    if (!value)
        return 0;
    if (const auto* text = value->as<String>())
        return int64Reading(std::string_view(*text));
    const auto* number = value->as<Number>();
    return number ? int64Reading(std::string_view(number->stringValue())) : 0;
}

bool boolReading(std::string_view text) {
    takeSign(text);
    text.remove_prefix(std::min(text.find_first_not_of('0'), text.size()));
    return !text.empty() &&
           std::string_view("YyTt123456789").find(text.front()) != std::string_view::npos;
}

bool boolReading(const Value* value) {
    if (!value)
        return false;
    if (const auto* text = value->as<String>())
        return boolReading(std::string_view(*text));
    const auto* number = value->as<Number>();
    return number && number->boolValue();
}

std::uint64_t unsignedReading(const Value* value) {
    if (!value)
        return 0;
    if (const auto* number = value->as<Number>())
        return number->unsignedValue();
    return static_cast<std::uint64_t>(int64Reading(value));
}

double doubleReading(const Value* value) {
    if (!value)
        return 0;
    if (const auto* number = value->as<Number>())
        return number->doubleValue();
    const auto* text = value->as<String>();
    return text ? doubleReadingOfText(*text) : 0;
}

}  // namespace parvel
