#include <cmath>
#include <limits>

#include <gtest/gtest.h>

#include "parvel/foundation/Error.h"
#include "parvel/platform/PropertyList.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

constexpr std::string_view kHead =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
    "<!DOCTYPE plist PUBLIC \"-//Apple//DTD PLIST 1.0//EN\" "
    "\"http://www.apple.com/DTDs/PropertyList-1.0.dtd\">\n";

std::optional<Value> readText(std::string_view text) {
    return PropertyListCodec::host().parse(Data::copyOf(text), std::nullopt);
}

/// The one value of a list.
std::optional<Value> readValue(std::string_view markup) {
    return readText(std::string(kHead) + "<plist version=\"1.0\">" + std::string(markup) +
                    "</plist>");
}

Value number(std::int64_t value) {
    return Number::signedInteger(value);
}

TEST(XMLPropertyList, ReadsEveryKind) {
    const std::optional<Value> value = readValue(R"(
<dict>
    <key>text</key> <string>a &lt;b&gt; &amp; c</string>
    <key>yes</key> <true/>
    <key>no</key> <false></false>
    <key>count</key> <integer>42</integer>
    <key>price</key> <real>5.09</real>
    <key>released</key> <date>2014-03-04T05:06:07Z</date>
    <key>bytes</key> <data> AAEC
        /w== </data>
    <key>list</key> <array><integer>1</integer><array/></array>
    <key>nested</key> <dict><key/><string/></dict>
</dict>)");

    const std::uint8_t bytes[] = {0, 1, 2, 255};
    EXPECT_EQ(value, Value(Dictionary{
                         {"text", "a <b> & c"},
                         {"yes", Number::boolean(true)},
                         {"no", Number::boolean(false)},
                         {"count", number(42)},
                         {"price", Number::real(5.09)},
                         {"released", Date{415602367}},
                         {"bytes", Data::copyOf(Data::Bytes(bytes))},
                         {"list", Array{number(1), Array{}}},
                         {"nested", Dictionary{{"", ""}}},
                     }));
}

TEST(XMLPropertyList, ReadsAnyKindAtTheTop) {
    EXPECT_EQ(readValue("<string>x</string>"), Value("x"));
    EXPECT_EQ(readValue("<array/>"), Value(Array{}));
    EXPECT_EQ(readText("<dict/>"), Value(Dictionary{}));
}

TEST(XMLPropertyList, KeepsTheKindOfANumber) {
    EXPECT_EQ(readValue("<true/>")->as<Number>()->kind(), Number::Kind::Boolean);
    EXPECT_EQ(readValue("<integer>1</integer>")->as<Number>()->kind(), Number::Kind::Signed);
    EXPECT_EQ(readValue("<real>1</real>")->as<Number>()->kind(), Number::Kind::Real);
}

TEST(XMLPropertyList, ReadsIntegersOverTheSignedAndUnsignedRange) {
    EXPECT_EQ(readValue("<integer>-9223372036854775808</integer>"),
              number(std::numeric_limits<std::int64_t>::min()));
    EXPECT_EQ(readValue("<integer>9223372036854775809</integer>"),
              Value(Number::unsignedInteger((1ULL << 63) + 1)));
    EXPECT_EQ(readValue("<integer>18446744073709551615</integer>"),
              Value(Number::unsignedInteger(~0ULL)));
    EXPECT_EQ(readValue("<integer> -5\n</integer>"), number(-5));
    EXPECT_EQ(readValue("<integer>+7</integer>"), number(7));
    EXPECT_EQ(readValue("<integer>007</integer>"), number(7));
    EXPECT_EQ(readValue("<integer>0xFf</integer>"), number(255));
    EXPECT_EQ(readValue("<integer>-0x10</integer>"), number(-16));
}

TEST(XMLPropertyList, RefusesOtherIntegers) {
    for (const char* text :
         {"", " ", "-", "abc", "4 stars", "1.5", "1e3", "0x", "0xG", "--1", "+-1", "- 1", "1 2",
          "18446744073709551616", "-9223372036854775809", "0x10000000000000000"})
        EXPECT_FALSE(readValue("<integer>" + std::string(text) + "</integer>")) << text;
}

TEST(XMLPropertyList, ReadsReals) {
    EXPECT_EQ(readValue("<real>-1.5e3</real>"), Value(Number::real(-1500)));
    EXPECT_EQ(readValue("<real> +0.25 </real>"), Value(Number::real(0.25)));
    EXPECT_TRUE(std::isnan(readValue("<real>nan</real>")->as<Number>()->doubleValue()));
    EXPECT_EQ(readValue("<real>-inf</real>")->as<Number>()->doubleValue(),
              -std::numeric_limits<double>::infinity());
    EXPECT_EQ(readValue("<real>+infinity</real>")->as<Number>()->doubleValue(),
              std::numeric_limits<double>::infinity());
    for (const char* text : {"", "x", "1,5", "1.5 x", "+-1", "0x1p3", "1e999"})
        EXPECT_FALSE(readValue("<real>" + std::string(text) + "</real>")) << text;
}

TEST(XMLPropertyList, ReadsDatesOfAnyYear) {
    EXPECT_EQ(readValue("<date>2001-01-01T00:00:00Z</date>"), Value(Date{0}));
    EXPECT_EQ(readValue("<date>1860-10-06T23:59:59Z</date>"), Value(Date{-4425408001}));
    EXPECT_EQ(readValue("<date>4001-01-01T00:00:00Z</date>"), Value(Date{63113904000}));
    EXPECT_EQ(readValue("<date>0001-01-01T00:00:00Z</date>"), Value(Date{-63113904000}));
    EXPECT_EQ(readValue("<date> 9999-12-31T23:59:59Z </date>"), Value(Date{252423993599}));
    EXPECT_EQ(readValue("<date>2000-02-29T12:00:00Z</date>"), Value(Date{-26481600}));
}

TEST(XMLPropertyList, RefusesOtherDates) {
    for (const char* text :
         {"", "2001-01-01", "2001-01-01T00:00:00", "2001-01-01 00:00:00Z", "2001-02-29T00:00:00Z",
          "2001-13-01T00:00:00Z", "2001-00-01T00:00:00Z", "2001-01-01T24:00:00Z",
          "2001-01-01T00:60:00Z", "2001-01-01T00:00:60Z", "0000-01-01T00:00:00Z",
          "20010-01-01T00:00:00Z", "-001-01-01T00:00:00Z", "2001-01-01T00:00:00+0000",
          "2001-01-01T00:00:00.5Z", "2001-01- 1T00:00:00Z"})
        EXPECT_FALSE(readValue("<date>" + std::string(text) + "</date>")) << text;
}

TEST(XMLPropertyList, ReadsBase64Strictly) {
    EXPECT_EQ(readValue("<data></data>"), Value(Data()));
    EXPECT_EQ(readValue("<data>TQ==</data>"), Value(Data::copyOf("M")));
    EXPECT_EQ(readValue("<data>TWE=</data>"), Value(Data::copyOf("Ma")));
    EXPECT_EQ(readValue("<data>\n\tTW Fu\r\n</data>"), Value(Data::copyOf("Man")));
    for (const char* text : {"T", "TQ", "TQ=", "TWE", "TQ==TQ==", "T===", "====", "=TQ=", "TW=u",
                             "TQ-_", "TWFu.", "TWFuT"})
        EXPECT_FALSE(readValue("<data>" + std::string(text) + "</data>")) << text;
}

TEST(XMLPropertyList, TakesTheLastOfSeveralEqualKeys) {
    EXPECT_EQ(readValue("<dict><key>a</key><true/><key>b</key><true/>"
                        "<key>a</key><string>last</string></dict>"),
              Value(Dictionary{{"a", "last"}, {"b", Number::boolean(true)}}));
}

TEST(XMLPropertyList, AcceptsCommentsAndInstructionsAnywhere) {
    EXPECT_EQ(readText("<?xml version=\"1.0\"?><!-- a --><?b c?><plist><!-- d --><array><?e?>"
                       "<string>one <!-- f -->two<?g?></string></array></plist><!-- h -->"),
              Value(Array{"one two"}));
}

TEST(XMLPropertyList, ReadsTheUsualEncodings) {
    using namespace std::string_literals;
    const Value expected("\xC3\xA9");
    EXPECT_EQ(readText("\xEF\xBB\xBF<string>\xC3\xA9</string>"), expected);
    EXPECT_EQ(readText("<?xml version='1.0' encoding='ISO-8859-1'?><string>\xE9</string>"),
              expected);
    EXPECT_EQ(readText("\xFF\xFE<\0r\0e\0a\0l\0>\0\x31\0<\0/\0r\0e\0a\0l\0>\0"s),
              Value(Number::real(1)));
    EXPECT_EQ(readValue("<string><![CDATA[<&>]]>&#x1F600;</string>"), Value("<&>\xF0\x9F\x98\x80"));
    EXPECT_FALSE(readText("<string>\xE9</string>"));
}

TEST(XMLPropertyList, ReadsADeclaredEntityAsItsText) {
    EXPECT_EQ(readText("<!DOCTYPE plist [<!ENTITY e 'x'><!ENTITY f '[&e;]'>]>"
                       "<plist><string>&f;&e;&f;</string></plist>"),
              Value("[x]x[x]"));
}

TEST(XMLPropertyList, OpensNoExternalEntity) {
    const TemporaryDirectory folder;
    const std::string canary = folder.write("canary", "canary");

    EXPECT_EQ(readText("<!DOCTYPE plist [<!ENTITY e SYSTEM '" + canary +
                       "'>]><plist><string>-&e;-</string></plist>"),
              Value("--"));
}

TEST(XMLPropertyList, RefusesWhatTheFormDoesNotKnow) {
    for (const char* markup : {"",
                               "text",
                               "<true/><true/>",
                               "<nothing/>",
                               "<Dict/>",
                               "<key>a</key>",
                               "<plist/>",
                               "<dict><true/></dict>",
                               "<dict><key>a</key></dict>",
                               "<dict><key>a</key><key>b</key><true/></dict>",
                               "<dict>x</dict>",
                               "<dict><key>a</key>x<true/></dict>",
                               "<array>x</array>",
                               "<array><key>a</key></array>",
                               "<array><plist/></array>",
                               "<string><b/></string>",
                               "<string><string/></string>",
                               "<key><true/></key>",
                               "<true>x</true>",
                               "<true><true/></true>",
                               "<p:dict xmlns:p='urn:p'/>",
                               "<string>"})
        EXPECT_FALSE(readValue(markup)) << markup;
    for (const char* text : {"", " ", "x", "<plist/>", "<plist><dict/></plist>x", "<key>a</key>"})
        EXPECT_FALSE(readText(text)) << text;
}

TEST(XMLPropertyList, NamesTheURLInItsError) {
    const URL url = URL::fileURLWithPath("/book/Store.plist");
    std::optional<Error> error;

    EXPECT_FALSE(PropertyListCodec::host().parse(Data::copyOf("nonsense"), url, &error));
    EXPECT_EQ(error, makeFileError(PVFileErrorCode::Corrupt, url));

    EXPECT_FALSE(PropertyListCodec::host().parse(Data(), std::nullopt, &error));
    EXPECT_EQ(error, makeFileError(PVFileErrorCode::Corrupt, std::nullopt));
}

}  // namespace
}  // namespace parvel::testing
