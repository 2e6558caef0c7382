#include "cli/MarkedValues.h"

#include <array>
#include <charconv>
#include <chrono>
#include <cstdint>
#include <limits>
#include <string>
#include <vector>

#include "cli/JsonMarks.h"

namespace parvel::cli {
namespace {

/// The number that stands in the text from the offset on with exactly `count` digits.
std::optional<int> digitsAt(std::string_view text, std::size_t offset, std::size_t count) {
    const std::string_view digits = text.substr(offset, count);
    int number = 0;
    if (digits.find_first_not_of("0123456789") != std::string_view::npos)
        return std::nullopt;
    std::from_chars(digits.data(), digits.data() + digits.size(), number);
    return number;
}

/// Whole seconds since 2001 of a text "2001-01-01T00:00:00".
std::optional<std::int64_t> wholeSeconds(std::string_view text) {
    static constexpr std::string_view shape = "dddd-dd-ddTdd:dd:dd";
    if (text.size() != shape.size())
        return std::nullopt;
    for (std::size_t i = 0; i < shape.size(); ++i) {
        if (shape[i] != 'd' && text[i] != shape[i])
            return std::nullopt;
    }
    const auto year = digitsAt(text, 0, 4), month = digitsAt(text, 5, 2),
               day = digitsAt(text, 8, 2);
    const auto hour = digitsAt(text, 11, 2), minute = digitsAt(text, 14, 2);
    const auto second = digitsAt(text, 17, 2);
    if (!year || !month || !day || !hour || !minute || !second)
        return std::nullopt;
    const std::chrono::year_month_day date{std::chrono::year(*year),
                                           std::chrono::month(static_cast<unsigned>(*month)),
                                           std::chrono::day(static_cast<unsigned>(*day))};
    if (!date.ok() || *hour > 23 || *minute > 59 || *second > 59)
        return std::nullopt;
    const std::int64_t days = std::chrono::sys_days(date).time_since_epoch().count();
    return days * 86400 + *hour * 3600 + *minute * 60 + *second - kReferenceDateUnixSeconds;
}

/// The decimal text of a negative whole number plus a fraction above zero: the fraction's digits
/// are taken from 1, so that the text is as exact as they are (-3 and .25 give "-2.75").
std::string negativeSum(std::int64_t whole, std::string_view fraction) {
    std::string text = "-" + std::to_string(-(whole + 1)) + ".";
    const std::size_t last = fraction.find_last_not_of('0');
    for (std::size_t i = 0; i <= last; ++i)
        text.push_back(static_cast<char>('0' + (i == last ? 10 : 9) - (fraction[i] - '0')));
    return text;
}

std::optional<Value> markedDate(const Value& value) {
    if (const String* text = value.as<String>()) {
        const std::optional<Date> date = dateFromIsoText(*text);
        return date ? std::optional<Value>(*date) : std::nullopt;
    }
    const Number* seconds = value.as<Number>();
    if (!seconds || seconds->kind() == Number::Kind::Boolean)
        return std::nullopt;
    return Date{seconds->doubleValue()};
}

std::optional<Value> markedReal(const Value& value) {
    using Limits = std::numeric_limits<double>;
    if (value == Value("inf"))
        return Number::real(Limits::infinity());
    if (value == Value("-inf"))
        return Number::real(-Limits::infinity());
    if (value == Value("nan"))
        return Number::real(Limits::quiet_NaN());
    return std::nullopt;
}

}  // namespace

std::optional<Date> dateFromIsoText(std::string_view text) {
    if (!text.ends_with('Z'))
        return std::nullopt;
    text.remove_suffix(1);
    const std::size_t point = std::min(text.find('.'), text.size());
    const std::optional<std::int64_t> whole = wholeSeconds(text.substr(0, point));
    const bool hasFraction = point < text.size();
    const std::string_view fraction = hasFraction ? text.substr(point + 1) : std::string_view("0");
    if (!whole || fraction.empty() ||
        fraction.find_first_not_of("0123456789") != std::string_view::npos)
        return std::nullopt;
    const bool isZero = fraction.find_first_not_of('0') == std::string_view::npos;
    const std::string decimal = *whole < 0 && !isZero
                                    ? negativeSum(*whole, fraction)
                                    : std::to_string(*whole) + "." + std::string(fraction);
    Date date;
    std::from_chars(decimal.data(), decimal.data() + decimal.size(),
                    date.secondsSinceReferenceDate);
    return date;
}

std::optional<Data> dataFromBase64(std::string_view text) {
    static constexpr std::string_view digits =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    static constexpr std::array<std::int8_t, 256> values = [] {
        std::array<std::int8_t, 256> table{};
        table.fill(-1);
        for (std::size_t i = 0; i < digits.size(); ++i)
            table[static_cast<unsigned char>(digits[i])] = static_cast<std::int8_t>(i);
        return table;
    }();
    if (text.size() % 4 != 0)
        return std::nullopt;
    const std::size_t padding = text.ends_with("==") ? 2 : text.ends_with("=") ? 1 : 0;
    std::vector<std::uint8_t> bytes;
    bytes.reserve(text.size() / 4 * 3);
    std::uint32_t bits = 0;
    for (std::size_t i = 0; i < text.size() - padding; ++i) {
        const std::int8_t value = values[static_cast<unsigned char>(text[i])];
        if (value < 0)
            return std::nullopt;
        bits = bits << 6 | static_cast<std::uint32_t>(value);
        // The first of four digits completes no byte; each of the others does.
        if (i % 4 != 0)
            bytes.push_back(static_cast<std::uint8_t>(bits >> (6 - 2 * (i % 4))));
    }
    return Data::copyOf(bytes);
}

std::optional<Value> markedValue(std::string_view mark, const Value& value) {
    if (mark == kDateMark)
        return markedDate(value);
    if (mark == kRealMark)
        return markedReal(value);
    const String* text = value.as<String>();
    const std::optional<Data> data = text ? dataFromBase64(*text) : std::nullopt;
    return data ? std::optional<Value>(*data) : std::nullopt;
}

}  // namespace parvel::cli
