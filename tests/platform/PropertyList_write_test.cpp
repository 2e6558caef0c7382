#include <cmath>
#include <limits>

#include <gtest/gtest.h>

#include "parvel/platform/PropertyList.h"

namespace parvel::testing {
namespace {

std::optional<std::string> written(const Value& value) {
    const std::optional<Data> data = PropertyListCodec::host().writeXML(value);
    std::vector<std::uint8_t> storage;
    return data ? std::optional<std::string>(data->text(storage)) : std::nullopt;
}

std::optional<Value> readAgain(const Value& value) {
    const std::optional<Data> data = PropertyListCodec::host().writeXML(value);
    return data ? PropertyListCodec::host().parse(*data, std::nullopt) : std::nullopt;
}

TEST(XMLPropertyListWriter, WritesTheUsualForm) {
    EXPECT_EQ(written(Dictionary{{"b", Array{Number::boolean(true), "x < y & z"}},
                                 {"a", Number::signedInteger(-5)},
                                 {"c", Dictionary{{"d", Data::copyOf("M")}, {"e", Array{}}}},
                                 {"f", Dictionary{}},
                                 {"g", Number::real(0.1)},
                                 {"h", Date{0}}}),
              R"(<?xml version="1.0" encoding="UTF-8"?>
<!DOCTYPE plist PUBLIC "-//Apple//DTD PLIST 1.0//EN" "http://www.apple.com/DTDs/PropertyList-1.0.dtd">
<plist version="1.0">
<dict>
	<key>a</key>
	<integer>-5</integer>
	<key>b</key>
	<array>
		<true/>
		<string>x &lt; y &amp; z</string>
	</array>
	<key>c</key>
	<dict>
		<key>d</key>
		<data>
		TQ==
		</data>
		<key>e</key>
		<array/>
	</dict>
	<key>f</key>
	<dict/>
	<key>g</key>
	<real>0.1</real>
	<key>h</key>
	<date>2001-01-01T00:00:00Z</date>
</dict>
</plist>
)");
}

TEST(XMLPropertyListWriter, ReadsBackEqual) {
    std::string bytes;
    for (int i = 0; i < 300; ++i)
        bytes += static_cast<char>(i);
    const Data parts[] = {Data::copyOf(bytes), Data::copyOf("more")};
    for (const Value& value :
         {Value(Number::unsignedInteger((1ULL << 63) + 1)),
          Value(Number::unsignedInteger(~0ULL)),
          Value(Number::signedInteger(std::numeric_limits<std::int64_t>::min())),
          Value(Number::signedInteger(-5)),
          Value(Number::real(1.0 / 3)),
          Value(Number::real(-0.0)),
          Value(Number::real(5e-324)),
          Value(Number::real(1.7e308)),
          Value(Number::real(std::numeric_limits<double>::quiet_NaN())),
          Value(Number::real(-std::numeric_limits<double>::infinity())),
          Value(Date{-4425408001}),
          Value(Date{63113904000}),
          Value(""),
          Value(" leading\ttab\nline\r\nend\r"),
          Value("\xF0\x9F\x98\x80 ]]> \"'"),
          Value(Data()),
          Value(Data::joining(parts)),
          Value(Array{}),
          Value(Dictionary{}),
          Value(Dictionary{{"", Array{Array{Dictionary{{"k", ""}}}}}, {"a&<b>", ""}})})
        EXPECT_EQ(readAgain(value), value) << description(value);
}

TEST(XMLPropertyListWriter, KeepsTheKindOfANumber) {
    EXPECT_EQ(readAgain(Number::boolean(false))->as<Number>()->kind(), Number::Kind::Boolean);
    EXPECT_EQ(readAgain(Number::real(1))->as<Number>()->kind(), Number::Kind::Real);
    EXPECT_EQ(readAgain(Number::unsignedInteger(~0ULL))->as<Number>()->kind(),
              Number::Kind::Unsigned);
}

TEST(XMLPropertyListWriter, CutsADateToWholeSecondsTowardThePast) {
    EXPECT_EQ(readAgain(Date{1.75}), Value(Date{1}));
    EXPECT_EQ(readAgain(Date{-1.25}), Value(Date{-2}));
}

TEST(XMLPropertyListWriter, WritesUndecodableBytesAsReplacementCharacters) {
    EXPECT_EQ(readAgain("a\xFF\x62"), Value("a\xEF\xBF\xBD\x62"));
    EXPECT_EQ(readAgain(Dictionary{{"\xC3", ""}}), Value(Dictionary{{"\xEF\xBF\xBD", ""}}));
}

TEST(XMLPropertyListWriter, RefusesWhatTheFormCannotHold) {
    const double infinity = std::numeric_limits<double>::infinity();
    for (const Value& value :
         {Value(Null()), Value(Array{Null()}), Value(Dictionary{{"a", Null()}}), Value("\x01"),
          Value("a\x1F"), Value(std::string("a\0b", 3)), Value("\xEF\xBF\xBF"),
          Value(Dictionary{{"\x02", ""}}), Value(Date{1e13}), Value(Date{-63113904001}),
          Value(Date{252423993600}), Value(Date{infinity}), Value(Date{std::nan("")})})
        EXPECT_FALSE(written(value)) << description(value);
}

TEST(XMLPropertyListWriter, RefusesWhatItWouldNotReadForItsDepth) {
    Value value("x");
    for (int level = 0; level < 512; ++level)
        value = Array(std::vector<Value>{value});
    EXPECT_EQ(readAgain(value), value);
    EXPECT_FALSE(written(Array(std::vector<Value>{value})));
}

}  // namespace
}  // namespace parvel::testing
