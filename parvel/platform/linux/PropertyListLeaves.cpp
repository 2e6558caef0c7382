#include <charconv>
#include <chrono>
#include <memory>

#include "parvel/platform/linux/PropertyListForms.h"

namespace parvel {
namespace {

constexpr std::string_view kSpace = " \t\r\n";
constexpr std::string_view kDateTemplate = "dddd-dd-ddTdd:dd:ddZ";

std::string_view trimmed(std::string_view text) {
    const std::size_t begin = text.find_first_not_of(kSpace);
    if (begin == std::string_view::npos)
        return {};
    return text.substr(begin, text.find_last_not_of(kSpace) - begin + 1);
}

/// The whole text as one number.
template <class T, class Format>
bool isNumber(std::string_view text, T& value, Format format) {
    const char* end = text.data() + text.size();
    const auto [stop, problem] = std::from_chars(text.data(), end, value, format);
    return problem == std::errc() && stop == end;
}

bool matchesDateTemplate(std::string_view text) {
    if (text.size() != kDateTemplate.size())
        return false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const bool isDigit = text[i] >= '0' && text[i] <= '9';
        if (kDateTemplate[i] == 'd' ? !isDigit : text[i] != kDateTemplate[i])
            return false;
    }
    return true;
}

int digits(std::string_view text, std::size_t begin, std::size_t count) {
    int value = 0;
    (void)isNumber(text.substr(begin, count), value, 10);
    return value;
}

int base64Value(char c) {
    if (c >= 'A' && c <= 'Z')
        return c - 'A';
    if (c >= 'a' && c <= 'z')
        return c - 'a' + 26;
    if (c >= '0' && c <= '9')
        return c - '0' + 52;
    return c == '+' ? 62 : c == '/' ? 63 : -1;
}

}  // namespace

std::optional<Number> integerFromText(std::string_view text) {
    text = trimmed(text);
    const bool isNegative = text.starts_with('-');
    if (isNegative || text.starts_with('+'))
        text.remove_prefix(1);
    const bool isHexadecimal = text.starts_with("0x") || text.starts_with("0X");
    if (isHexadecimal)
        text.remove_prefix(2);
    std::uint64_t magnitude = 0;
    if (!isNumber(text, magnitude, isHexadecimal ? 16 : 10))
        return std::nullopt;
    if (!isNegative)
        return Number::unsignedInteger(magnitude);
    if (magnitude > std::uint64_t{1} << 63)
        return std::nullopt;
    return Number::signedInteger(static_cast<std::int64_t>(0 - magnitude));
}

std::optional<Number> realFromText(std::string_view text) {
    text = trimmed(text);
    if (text.starts_with('+')) {
        text.remove_prefix(1);
        if (text.starts_with('-'))
            return std::nullopt;
    }
    double value = 0;
    if (!isNumber(text, value, std::chars_format::general))
        return std::nullopt;
    return Number::real(value);
}

std::optional<Date> dateFromText(std::string_view text) {
    using namespace std::chrono;
    text = trimmed(text);
    if (!matchesDateTemplate(text))
        return std::nullopt;
    const year_month_day day{year(digits(text, 0, 4)),
                             month(static_cast<unsigned>(digits(text, 5, 2))),
                             std::chrono::day(static_cast<unsigned>(digits(text, 8, 2)))};
    const int hour = digits(text, 11, 2);
    const int minute = digits(text, 14, 2);
    const int second = digits(text, 17, 2);
    if (day.year() < year(1) || !day.ok() || hour > 23 || minute > 59 || second > 59)
        return std::nullopt;
    const std::int64_t unixSeconds =
        seconds(sys_days(day).time_since_epoch()).count() + hour * 3600 + minute * 60 + second;
    return Date{static_cast<double>(unixSeconds - kReferenceDateUnixSeconds)};
}

std::optional<Data> dataFromBase64(std::string_view text) {
    auto bytes = std::make_unique<std::uint8_t[]>(text.size() / 4 * 3 + 3);
    std::size_t size = 0;
    std::size_t characters = 0;
    std::size_t padding = 0;
    std::uint32_t bits = 0;
    for (const char c : text) {
        if (kSpace.find(c) != std::string_view::npos)
            continue;
        const int value = c == '=' ? 0 : base64Value(c);
        padding += c == '=';
        if (value < 0 || (padding > 0 && c != '='))
            return std::nullopt;
        bits = bits << 6 | static_cast<std::uint32_t>(value);
        if (++characters % 4 != 0)
            continue;
        for (const int shift : {16, 8, 0})
            bytes[size++] = static_cast<std::uint8_t>(bits >> shift);
        bits = 0;
    }
    if (characters % 4 != 0 || padding > 2)
        return std::nullopt;
    return Data::adopt(std::move(bytes), size - padding);
}

}  // namespace parvel
