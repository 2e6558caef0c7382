#include "parvel/platform/linux/DateTextICU.h"

#include <unicode/locid.h>
#include <unicode/unistr.h>

#include <cmath>
#include <cstdlib>
#include <memory>
#include <mutex>
#include <utility>

namespace parvel {
namespace {

using host::Libicui18n;

constexpr double kMillisecondsASecond = 1000;

struct CloseDateFormat {
    const Libicui18n* icu = nullptr;
    void operator()(UDateFormat* format) const { icu->udat_close(format); }
};
using DateFormat = std::unique_ptr<UDateFormat, CloseDateFormat>;

icu::Locale localeNamed(const std::string& name) {
    const std::string_view language = std::string_view(name).substr(0, name.find_first_of(".@"));
    const bool isCLocale = language == "C" || language == "POSIX";
    return icu::Locale::createCanonical(isCLocale ? "en_US_POSIX" : name.c_str());
}

/// The locale's full date, with its words for today and yesterday, in the user's time zone.
DateFormat fullDateFormat(const Libicui18n& icu, const icu::Locale& locale) {
    if (!icu.isComplete())
        return nullptr;
    UErrorCode status = U_ZERO_ERROR;
    return DateFormat(icu.udat_open(UDAT_NONE, UDAT_FULL_RELATIVE, locale.getName(), nullptr, -1,
                                    nullptr, 0, &status),
                      CloseDateFormat{&icu});
}

class DateTextICU final : public DateText {
public:
    DateTextICU(const Libicui18n& (*icu)(), icu::Locale locale)
        : m_icu(icu), m_locale(std::move(locale)) {}

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
        if (!hasFormat())
            return std::nullopt;
        const icu::UnicodeString unicode = icu::UnicodeString::fromUTF8(icu::StringPiece(text));
        int32_t position = 0;
        UErrorCode status = U_ZERO_ERROR;
        const UDate parsed = m_icu().udat_parse(m_format.get(), unicode.getBuffer(),
                                                unicode.length(), &position, &status);
        if (U_FAILURE(status) || position != unicode.length())
            return std::nullopt;
        // ICU parses leniently ("January 32"); what it would not write itself is not accepted.
        const Date date{parsed / kMillisecondsASecond -
                        static_cast<double>(kReferenceDateUnixSeconds)};
        if (formatted(date) != text)
            return std::nullopt;
        return date;
    }

private:
    static constexpr int32_t kUsualLength = 128;

    /// Called under the lock. Makes the format when it is first needed.
    bool hasFormat() {
        if (!m_format)
            m_format = fullDateFormat(m_icu(), m_locale);
        return m_format != nullptr;
    }

    /// Called under the lock. Empty for a date that is no number.
    std::string formatted(const Date& date) {
        std::string text;
        if (!std::isfinite(date.secondsSinceReferenceDate) || !hasFormat())
            return text;
        const UDate milliseconds =
            (date.secondsSinceReferenceDate + static_cast<double>(kReferenceDateUnixSeconds)) *
            kMillisecondsASecond;
        icu::UnicodeString unicode;
        UErrorCode status = U_BUFFER_OVERFLOW_ERROR;
        int32_t length = kUsualLength;
        for (int32_t room = length; status == U_BUFFER_OVERFLOW_ERROR; room = length) {
            status = U_ZERO_ERROR;
            length = m_icu().udat_format(m_format.get(), milliseconds, unicode.getBuffer(room),
                                         room, nullptr, &status);
            unicode.releaseBuffer(U_SUCCESS(status) ? length : 0);
        }
        return unicode.toUTF8String(text);
    }

    std::mutex m_lock;  // ICU's formatters are not for several threads at once
    const Libicui18n& (*const m_icu)();
    const icu::Locale m_locale;
    DateFormat m_format;
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

std::unique_ptr<DateText> makeDateTextICU(const std::string& localeName,
                                          const Libicui18n& (*icu)()) {
    return std::make_unique<DateTextICU>(icu, localeNamed(localeName));
}

DateText& DateText::host() {
    static const std::unique_ptr<DateText> dateText = makeDateTextICU(userTimeLocaleName());
    return *dateText;
}

}  // namespace parvel
