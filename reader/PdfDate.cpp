#include "reader/PdfDate.h"

#include <algorithm>
#include <chrono>

namespace parvel::reader {

namespace {

constexpr std::string_view digits = "0123456789";

/// Takes up to `count` digits off the text's front as a number. None where there is no digit.
std::optional<int> takeNumber(std::string_view& text, std::size_t count) {
    const std::size_t found = std::min(text.find_first_not_of(digits), text.size());
    const std::string_view taken = text.substr(0, std::min(found, count));
    if (taken.empty())
        return std::nullopt;
    int number = 0;
    for (const char digit : taken)
        number = number * 10 + (digit - '0');
    text.remove_prefix(taken.size());
    return number;
}

/// The year off the text's front. An even number of digits is what a date has, so an odd one that
/// begins like the old writer's years is its.
std::optional<int> takeYear(std::string_view& text) {
    const std::size_t count = std::min(text.find_first_not_of(digits), text.size());
    if (count < 4)
        return std::nullopt;
    if (count % 2 == 1 && text.starts_with("191")) {
        text.remove_prefix(2);
        const std::optional<int> years = takeNumber(text, 3);
        return 1900 + *years;
    }
    return takeNumber(text, 4);
}

/// A number that may be missing at the end of the date.
bool takeField(std::string_view& text, int least, int most, int& field) {
    if (const std::optional<int> number = takeNumber(text, 2))
        field = *number;
    return field >= least && field <= most;
}

/// Takes the zone's offset from UTC, in minutes, off the text's front. False for a damaged one;
/// none is UTC.
bool takeZone(std::string_view& text, int& zone) {
    if (text.starts_with('Z') || text.starts_with('z'))
        text = {};
    if (!text.starts_with('+') && !text.starts_with('-'))
        return true;
    const int sign = text.front() == '-' ? -1 : 1;
    text.remove_prefix(1);
    int hours = -1;
    int minutes = 0;
    if (!takeField(text, 0, 23, hours))
        return false;
    if (text.starts_with('\'') || text.starts_with(':'))
        text.remove_prefix(1);
    if (!takeField(text, 0, 59, minutes))
        return false;
    if (text.starts_with('\''))
        text.remove_prefix(1);
    zone = sign * (hours * 60 + minutes);
    return true;
}

bool beginsWithDigit(std::string_view text) {
    return !text.empty() && digits.find(text.front()) != std::string_view::npos;
}

std::string_view withoutBlanks(std::string_view text) {
    constexpr std::string_view blanks(" \t\r\n\f\0", 6);
    text.remove_prefix(std::min(text.find_first_not_of(blanks), text.size()));
    return text.substr(0, text.find_last_not_of(blanks) + 1);
}

}  // namespace

std::optional<double> secondsOfPdfDate(std::string_view text) {
    text = withoutBlanks(text);
    if (text.starts_with("D:"))
        text = withoutBlanks(text.substr(2));
    const std::optional<int> year = takeYear(text);
    int month = 1, day = 1, hour = 0, minute = 0, second = 0;
    if (!year || *year == 0 || !takeField(text, 1, 12, month) || !takeField(text, 1, 31, day))
        return std::nullopt;
    const bool hasHour = beginsWithDigit(text);
    if (!takeField(text, 0, 23, hour) || !takeField(text, 0, 59, minute))
        return std::nullopt;
    const bool hasSecond = beginsWithDigit(text);
    if (!takeField(text, 0, 59, second))
        return std::nullopt;
    int zone = 0;
    if ((hasHour && !takeZone(text, zone)) || (!hasSecond && !text.empty()))
        return std::nullopt;

    using namespace std::chrono;
    const year_month_day date{std::chrono::year(*year), std::chrono::month(unsigned(month)),
                              std::chrono::day(unsigned(day))};
    if (!date.ok())
        return std::nullopt;
    const auto days = (sys_days(date) - sys_days(2001y / January / 1)).count();
    return days * 86400.0 + hour * 3600.0 + (minute - zone) * 60.0 + second;
}

}  // namespace parvel::reader
