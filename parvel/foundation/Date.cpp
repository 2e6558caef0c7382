#include "parvel/foundation/Date.h"

#include <charconv>
#include <chrono>
#include <cmath>
#include <string_view>

namespace parvel {
namespace {

/// A date's whole seconds, rounded down, and the exact decimal digits of what is left.
struct SplitSeconds {
    std::int64_t whole = 0;
    std::string fraction;
};

/// The value 0.`digits` taken from 1, in the same number of digits.
void complementFraction(std::string& digits) {
    for (char& digit : digits)
        digit = static_cast<char>('0' + '9' - digit);
    ++digits.back();  // it was no zero, so there is nothing to carry
}

/// For a value whose whole part fits easily.
SplitSeconds splitSeconds(double seconds) {
    constexpr int kLongestFraction = 1074;  // digits of the smallest double
    constexpr int kLongestWhole = 20;

    const double whole = std::trunc(seconds);
    SplitSeconds split{static_cast<std::int64_t>(whole), {}};
    if (seconds == whole)
        return split;

    // Exact: both have the same exponent or the whole part is zero.
    char text[kLongestWhole + 1 + kLongestFraction];
    const auto end = std::to_chars(text, text + sizeof text, std::fabs(seconds - whole),
                                   std::chars_format::fixed, kLongestFraction);
    std::string_view digits(text, static_cast<std::size_t>(end.ptr - text));
    digits.remove_prefix(2);  // "0."
    split.fraction = digits.substr(0, digits.find_last_not_of('0') + 1);
    if (seconds < 0) {
        --split.whole;
        complementFraction(split.fraction);
    }
    return split;
}

void appendNumber(std::string& text, unsigned number, int width) {
    const std::string digits = std::to_string(number);
    text.append(static_cast<std::size_t>(width) - digits.size(), '0').append(digits);
}

}  // namespace

Date Date::now() {
    const std::chrono::duration<double> sinceUnixEpoch =
        std::chrono::system_clock::now().time_since_epoch();
    return {sinceUnixEpoch.count() - static_cast<double>(kReferenceDateUnixSeconds)};
}

std::string isoText(const Date& date) {
    using namespace std::chrono;
    constexpr double kFarBeyondAllYears = 1e12;
    if (!(std::fabs(date.secondsSinceReferenceDate) < kFarBeyondAllYears))
        return {};

    const SplitSeconds split = splitSeconds(date.secondsSinceReferenceDate);
    const sys_seconds instant{seconds(kReferenceDateUnixSeconds + split.whole)};
    const sys_days day = floor<days>(instant);
    const year_month_day calendar{day};
    if (calendar.year() < year(1) || calendar.year() > year(9999))
        return {};
    const hh_mm_ss clock{instant - day};

    std::string text;
    appendNumber(text, static_cast<unsigned>(static_cast<int>(calendar.year())), 4);
    text += '-';
    appendNumber(text, static_cast<unsigned>(calendar.month()), 2);
    text += '-';
    appendNumber(text, static_cast<unsigned>(calendar.day()), 2);
    text += 'T';
    appendNumber(text, static_cast<unsigned>(clock.hours().count()), 2);
    text += ':';
    appendNumber(text, static_cast<unsigned>(clock.minutes().count()), 2);
    text += ':';
    appendNumber(text, static_cast<unsigned>(clock.seconds().count()), 2);
    if (!split.fraction.empty())
        text.append(".").append(split.fraction);
    return text += 'Z';
}

}  // namespace parvel
