#include "parvel/platform/linux/DateTextICU.h"

#include <unicode/datefmt.h>
#include <unicode/locid.h>
#include <unicode/parsepos.h>
#include <unicode/unistr.h>

#include <cmath>
#include <cstdlib>
#include <memory>
#include <mutex>

namespace parvel {
namespace {

constexpr double kMillisecondsASecond = 1000;

icu::Locale localeNamed(const std::string& name) {
    const std::string_view language = std::string_view(name).substr(0, name.find_first_of(".@"));
    const bool isCLocale = language == "C" || language == "POSIX";
    return icu::Locale::createCanonical(isCLocale ? "en_US_POSIX" : name.c_str());
}

class DateTextICU final : public DateText {
public:
    explicit DateTextICU(const icu::Locale& locale)
        : m_format(icu::DateFormat::createDateInstance(icu::DateFormat::kFullRelative, locale)) {}

    std::string stringFromDate(const Date& date) override {
        const std::lock_guard guard(m_lock);
        return formatted(date);
    }

    std::optional<Date> dateFromString(std::string_view text) override {
        // No date is nearly as long; this bounds what a hostile attribute can cost.
        constexpr std::size_t kLongestText = 1024;
        if (text.empty() || text.size() > kLongestText)
            return std::nullopt;

        const std::lock_guard guard(m_lock);
        if (!m_format)
            return std::nullopt;
        const icu::UnicodeString unicode = icu::UnicodeString::fromUTF8(icu::StringPiece(text));
        icu::ParsePosition position(0);
        const UDate parsed = m_format->parse(unicode, position);
        if (position.getErrorIndex() != -1 || position.getIndex() != unicode.length())
            return std::nullopt;
        // ICU parses leniently ("January 32"); what it would not write itself is not accepted.
        const Date date{parsed / kMillisecondsASecond -
                        static_cast<double>(kReferenceDateUnixSeconds)};
        if (formatted(date) != text)
            return std::nullopt;
        return date;
    }

private:
    /// Called under the lock. Empty for a date that is no number.
    std::string formatted(const Date& date) const {
        std::string text;
        if (!m_format || !std::isfinite(date.secondsSinceReferenceDate))
            return text;
        const UDate milliseconds =
            (date.secondsSinceReferenceDate + static_cast<double>(kReferenceDateUnixSeconds)) *
            kMillisecondsASecond;
        icu::UnicodeString unicode;
        m_format->format(milliseconds, unicode);
        return unicode.toUTF8String(text);
    }

    std::mutex m_lock;  // ICU's formatters are not for several threads at once
    const std::unique_ptr<icu::DateFormat> m_format;
};

}  // namespace

std::string userTimeLocaleName() {
    // ICU's own default looks at LC_MESSAGES.
    for (const char* name : {"LC_ALL", "LC_TIME", "LANG"}) {
        const char* value = std::getenv(name);
        if (value && *value != '\0')
            return value;
    }
    return "C";
}

std::unique_ptr<DateText> makeDateTextICU(const std::string& localeName) {
    return std::make_unique<DateTextICU>(localeNamed(localeName));
}

DateText& DateText::host() {
    static const std::unique_ptr<DateText> dateText = makeDateTextICU(userTimeLocaleName());
    return *dateText;
}

}  // namespace parvel
