#include "parvel/platform/DateText.h"

#include "parvel/platform/linux/DateTextICU.h"
#include "tests/support/AbsentLibrary.h"
#include "tests/support/TestRounds.h"

#include <gtest/gtest.h>
#include <stdlib.h>

#include <atomic>
#include <cmath>
#include <ctime>
#include <limits>
#include <map>
#include <thread>

namespace parvel::testing {
namespace {

constexpr double kDay = 86400;

/// Noon of a day where the tests run.
Date localNoon(int year, int month, int day) {
    std::tm time{};
    time.tm_year = year - 1900;
    time.tm_mon = month - 1;
    time.tm_mday = day;
    time.tm_hour = 12;
    time.tm_isdst = -1;
    return {static_cast<double>(std::mktime(&time) - kReferenceDateUnixSeconds)};
}

/// Sets the three variables that name the locale, and puts them back.
class LocaleEnvironment {
public:
    LocaleEnvironment(const char* all, const char* time, const char* lang) {
        set("LC_ALL", all);
        set("LC_TIME", time);
        set("LANG", lang);
    }
    ~LocaleEnvironment() {
        for (const auto& [name, value] : m_before)
            assign(name, value ? value->c_str() : nullptr);
    }

private:
    void set(const char* name, const char* value) {
        const char* before = getenv(name);
        m_before[name] = before ? std::optional<std::string>(before) : std::nullopt;
        assign(name, value);
    }
    static void assign(const std::string& name, const char* value) {
        if (value)
            setenv(name.c_str(), value, 1);
        else
            unsetenv(name.c_str());
    }

    std::map<std::string, std::optional<std::string>> m_before;
};

TEST(DateText, SpellsWeekdayAndMonthOut) {
    const auto english = makeDateTextICU("en_US.UTF-8");
    const auto german = makeDateTextICU("de_DE.UTF-8");

    EXPECT_EQ(english->stringFromDate(localNoon(2024, 1, 1)), "Monday, January 1, 2024");
    EXPECT_EQ(german->stringFromDate(localNoon(2024, 1, 1)), "Montag, 1. Januar 2024");
}

TEST(DateText, SaysTodayAndYesterdayInTheLocalesWords) {
    const auto english = makeDateTextICU("en_US.UTF-8");
    const auto german = makeDateTextICU("de_DE.UTF-8");
    const Date now = Date::now();

    EXPECT_EQ(english->stringFromDate(now), "today");
    EXPECT_EQ(german->stringFromDate(now), "heute");
    EXPECT_EQ(german->stringFromDate(Date{now.secondsSinceReferenceDate - kDay}), "gestern");
}

TEST(DateText, IsEnglishInTheCLocale) {
    for (const char* name : {"C", "C.UTF-8", "POSIX"})
        EXPECT_EQ(makeDateTextICU(name)->stringFromDate(localNoon(2024, 1, 1)),
                  "Monday, January 1, 2024");
}

TEST(DateText, ReadsBackWhatItWroteInEveryScript) {
    for (const char* name : {"en_US", "en_GB", "de_DE@euro", "fr_FR.UTF-8", "ja_JP", "ar_EG", "ru",
                             "he_IL", "hi_IN", "zh_CN", "th_TH", "fa_IR", "unknown_XX"}) {
        const auto dateText = makeDateTextICU(name);
        const double now = Date::now().secondsSinceReferenceDate;
        for (const Date& date :
             {Date{now}, Date{now - kDay}, localNoon(2024, 2, 29), localNoon(1999, 12, 31)}) {
            const std::string text = dateText->stringFromDate(date);
            const std::optional<Date> read = dateText->dateFromString(text);

            ASSERT_TRUE(read) << name << ": " << text;
            EXPECT_LE(std::fabs(read->secondsSinceReferenceDate - date.secondsSinceReferenceDate),
                      kDay);
            EXPECT_EQ(dateText->stringFromDate(*read), text);
        }
    }
}

TEST(DateText, ReadsNothingThatItWouldNotWrite) {
    const auto english = makeDateTextICU("en_US.UTF-8");

    for (std::string_view text :
         {"", " ", "x", "heute", "Monday", "2024-01-01", "2024-01-01T00:00:00Z", "January 1, 2024",
          "Sunday, January 1, 2024", "Monday, January 32, 2024", "Monday, January 1, 2024 ",
          " Monday, January 1, 2024", "Monday, January 1, 2024 at noon", "monday, january 1, 2024",
          "Today", "today\xFF"})
        EXPECT_FALSE(english->dateFromString(text)) << text;
    EXPECT_FALSE(english->dateFromString(std::string_view("today\0", 6)));
}

TEST(DateText, ReadsNothingOutOfAVeryLongText) {
    EXPECT_FALSE(DateText::host().dateFromString(std::string(100'000'000, '1')));
}

TEST(DateText, WritesNothingForWhatIsNoTime) {
    EXPECT_EQ(DateText::host().stringFromDate({std::numeric_limits<double>::quiet_NaN()}), "");
    EXPECT_EQ(DateText::host().stringFromDate({std::numeric_limits<double>::infinity()}), "");
}

TEST(DateText, SurvivesDatesFarBeyondTheCalendar) {
    for (double seconds : {1e13, -1e13, 1e300, -1e300}) {
        const std::string text = DateText::host().stringFromDate(Date{seconds});
        EXPECT_FALSE(text.empty()) << seconds;
        static_cast<void>(DateText::host().dateFromString(text));
    }
}

TEST(DateText, WritesAndReadsNothingWhereItsLibraryIsMissing) {
    const auto english = makeDateTextICU("en_US.UTF-8", absentLibrary<host::Libicui18n>);

    EXPECT_EQ(english->stringFromDate(localNoon(2024, 1, 1)), "");
    EXPECT_FALSE(english->dateFromString("Monday, January 1, 2024"));
}

TEST(DateText, IsOneForTheProcess) {
    EXPECT_EQ(&DateText::host(), &DateText::host());
}

TEST(DateText, NamesTheLocaleAsTheEnvironmentDoes) {
    {
        const LocaleEnvironment environment("de_DE.UTF-8", "fr_FR.UTF-8", "en_US.UTF-8");
        EXPECT_EQ(userTimeLocaleName(), "de_DE.UTF-8");
    }
    {
        const LocaleEnvironment environment("", "fr_FR.UTF-8", "en_US.UTF-8");
        EXPECT_EQ(userTimeLocaleName(), "fr_FR.UTF-8");
    }
    {
        const LocaleEnvironment environment(nullptr, nullptr, "en_US.UTF-8");
        EXPECT_EQ(userTimeLocaleName(), "en_US.UTF-8");
    }
    const LocaleEnvironment environment(nullptr, "", nullptr);
    EXPECT_EQ(userTimeLocaleName(), "C");
}

TEST(DateText, MayBeCalledFrom16Threads) {
    const std::size_t rounds = testRounds(100);
    const Date date = localNoon(2024, 1, 1);
    const std::string expected = DateText::host().stringFromDate(date);
    std::atomic<int> wrong{0};
    std::vector<std::thread> threads;
    for (int index = 0; index < 16; ++index) {
        threads.emplace_back([&] {
            for (std::size_t round = 0; round < rounds; ++round) {
                const std::string text = DateText::host().stringFromDate(date);
                if (text != expected || !DateText::host().dateFromString(text))
                    ++wrong;
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();

    EXPECT_EQ(wrong, 0);
}

}  // namespace
}  // namespace parvel::testing
