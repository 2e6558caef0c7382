#include "cli/PropertyValue.h"

#include <gtest/gtest.h>

#include "cli/CommandLine.h"

namespace parvel::testing {
namespace {

using cli::PropertyValue;
using cli::UsageError;

Dictionary changesOf(std::string_view text, const Dictionary& record = {}) {
    Dictionary changes;
    PropertyValue::fromText("--set", text).storeIn(changes, record);
    return changes;
}

std::string problemOf(std::string_view text) {
    try {
        PropertyValue::fromText("--set", text);
    } catch (const UsageError& error) {
        return error.what();
    }
    return {};
}

TEST(PropertyValue, TakesAKeyAndAPropertysOwnName) {
    EXPECT_EQ(changesOf("itemName=T"), (Dictionary{{"itemName", "T"}}));
    EXPECT_EQ(changesOf("title=T"), (Dictionary{{"itemName", "T"}}));
    EXPECT_EQ(changesOf("author=A"), (Dictionary{{"artistName", "A"}}));
    EXPECT_EQ(changesOf("displayName=D"), (Dictionary{{"PVDisplayName", "D"}}));
    EXPECT_EQ(changesOf("sort-name=S"), (Dictionary{{"sort-name", "S"}}));
}

TEST(PropertyValue, ValuesTakeTheTypeThatThePropertyStores) {
    EXPECT_EQ(changesOf("rating=4"), (Dictionary{{"rating", Number::signedInteger(4)}}));
    EXPECT_EQ(changesOf("rating=4.5"), (Dictionary{{"rating", Number::real(4.5)}}));
    EXPECT_EQ(changesOf("pageCount=18446744073709551615"),
              (Dictionary{{"pageCount", Number::unsignedInteger(UINT64_MAX)}}));
    EXPECT_EQ(changesOf("uploadErrorCode=-7"),
              (Dictionary{{"PVUploadErrorCode", Number::signedInteger(-7)}}));
    EXPECT_EQ(changesOf("coverImageData=QUI="),
              (Dictionary{{"PVCoverImageData", Data::copyOf("AB")}}));
    EXPECT_EQ(changesOf("year=1984"), (Dictionary{{"year", "1984"}}));
    EXPECT_EQ(changesOf("itemId=42"), (Dictionary{{"itemId", "42"}}));
}

TEST(PropertyValue, ATextIsUTF8) {
    EXPECT_EQ(changesOf("title=\xC3\xA9\xF0\x9F\x93\x96"),
              (Dictionary{{"itemName", "\xC3\xA9\xF0\x9F\x93\x96"}}));
    EXPECT_EQ(problemOf("title=a\xFF"), "--set title=a\xFF: title is a text in UTF-8");
    EXPECT_EQ(problemOf("other=\xC3"), "--set other=\xC3: other is a text in UTF-8");
}

TEST(PropertyValue, APathIsAnyBytes) {
    EXPECT_EQ(changesOf("sourceURL=/a\xFF"), (Dictionary{{"sourcePath", "/a\xFF"}}));
}

TEST(PropertyValue, FlagsAreBooleans) {
    for (const char* text : {"true", "yes", "1"}) {
        const Dictionary changes = changesOf("isExplicit=" + std::string(text));
        EXPECT_EQ(changes, (Dictionary{{"explicit", Number::boolean(true)}}));
        EXPECT_EQ(changes.find("explicit")->as<Number>()->kind(), Number::Kind::Boolean);
    }
    for (const char* text : {"false", "no", "0"})
        EXPECT_EQ(changesOf("isPreview=" + std::string(text)),
                  (Dictionary{{"isPreview", Number::boolean(false)}}));
}

TEST(PropertyValue, DatesAreADayOrASecond) {
    EXPECT_EQ(changesOf("releaseDate=2001-01-02"), (Dictionary{{"releaseDate", Date{86400}}}));
    EXPECT_EQ(changesOf("lastOpenDate=2001-01-01T00:00:01Z"),
              (Dictionary{{"PVLastOpenedDate", Date{1}}}));
    EXPECT_EQ(changesOf("insertionDate=2001-01-02"),
              (Dictionary{{"PVInsertionDate", Number::signedInteger(86400)}}));
    EXPECT_EQ(changesOf("PVInsertionDate=-5"),
              (Dictionary{{"PVInsertionDate", Number::signedInteger(-5)}}));
}

TEST(PropertyValue, TheValueIsAllBehindTheFirstSign) {
    EXPECT_EQ(changesOf("title=a=b"), (Dictionary{{"itemName", "a=b"}}));
    EXPECT_EQ(changesOf("title="), (Dictionary{{"itemName", ""}}));
}

TEST(PropertyValue, AKeyThatIsNoPropertyIsAString) {
    EXPECT_EQ(changesOf("shelf=7"), (Dictionary{{"shelf", "7"}}));
}

TEST(PropertyValue, APropertyOfTheInnerDictionaryLeavesTheOthersThere) {
    const Dictionary record{
        {"book-info", Dictionary{{"package-file-hash", "H"}, {"mime-type", "old"}}}};

    EXPECT_EQ(
        changesOf("mimeType=new", record),
        (Dictionary{{"book-info", Dictionary{{"package-file-hash", "H"}, {"mime-type", "new"}}}}));
    EXPECT_EQ(changesOf("mimeType=new", {{"book-info", "odd"}}),
              (Dictionary{{"book-info", Dictionary{{"mime-type", "new"}}}}));
}

TEST(PropertyValue, TwoPropertiesOfTheInnerDictionaryStandBesideEachOther) {
    Dictionary changes = changesOf("mimeType=M");
    PropertyValue::fromText("--set", "packageHash=H").storeIn(changes, {});

    EXPECT_EQ(
        changes,
        (Dictionary{{"book-info", Dictionary{{"mime-type", "M"}, {"package-file-hash", "H"}}}}));
}

TEST(PropertyValue, WhatIsNoValueOfThePropertyIsAWrongCommandLine) {
    EXPECT_EQ(problemOf("title"), "--set title: not KEY=VALUE");
    EXPECT_EQ(problemOf("=T"), "--set =T: not KEY=VALUE");
    EXPECT_EQ(problemOf("explicit=maybe"), "--set explicit=maybe: explicit is true or false");
    EXPECT_EQ(problemOf("rating=good"), "--set rating=good: rating is a number");
    EXPECT_EQ(problemOf("rating=inf"), "--set rating=inf: rating is a number");
    EXPECT_EQ(problemOf("pageCount=-1"),
              "--set pageCount=-1: pageCount is a whole number that is not negative");
    EXPECT_EQ(problemOf("releaseDate=2001-02-30"),
              "--set releaseDate=2001-02-30: releaseDate is a date such as 2001-01-31 or "
              "2001-01-31T12:00:00Z");
    EXPECT_EQ(problemOf("coverImageData=?"), "--set coverImageData=?: coverImageData is base64");
}

}  // namespace
}  // namespace parvel::testing
