#include <gtest/gtest.h>

#include "cli/ResultFormat.h"
#include "parvel/foundation/PropertyList.h"

namespace parvel::testing {
namespace {

using cli::OutputForm;
using cli::Result;
using cli::ResultFormat;

/// What stands in the record when the list that holds the results is read again.
Dictionary recordReadBack(Dictionary record) {
    Result result;
    result.path = "a.epub";
    result.record = std::make_shared<const Dictionary>(std::move(record));
    const std::unique_ptr<ResultFormat> format = ResultFormat::make(OutputForm::PropertyList);
    std::string text(format->opening());
    format->append(result, text);
    text += format->closing();
    const std::optional<Value> list = valueFromPropertyList(Data::copyOf(text));
    if (!list || !list->as<Array>() || list->as<Array>()->size() != 1) {
        ADD_FAILURE() << text.substr(0, 1000);
        return {};
    }
    return *(*list->as<Array>())[0].as<Dictionary>()->find("record")->as<Dictionary>();
}

TEST(PropertyListFormat, KeepsWhatThePropertyListHolds) {
    const Dictionary record{{"bytes", Data::copyOf("b")},
                            {"date", Date{86400}},
                            {"flag", Number::boolean(true)},
                            {"list", Array{Dictionary(), Array()}},
                            {"number", Number::unsignedInteger(18446744073709551615U)},
                            {"text", "a\tb\nc & <d> 草枕"}};
    EXPECT_EQ(recordReadBack(record), record);
}

TEST(PropertyListFormat, LeavesNullMarkersOut) {
    EXPECT_EQ(recordReadBack({{"a", Null{}}, {"b", Array{Null{}, "c"}}}),
              (Dictionary{{"b", Array{"c"}}}));
}

TEST(PropertyListFormat, ReplacesWhatXMLHasNoFormFor) {
    EXPECT_EQ(recordReadBack({{"a\x01", "b\x1b\uFFFE\uFFFF\xff"}}),
              (Dictionary{{"a\uFFFD", "b\uFFFD\uFFFD\uFFFD\uFFFD"}}));
}

TEST(PropertyListFormat, WritesADateOutsideTheYears1To9999AsSeconds) {
    EXPECT_EQ(recordReadBack({{"a", Date{1e12}}}),
              (Dictionary{{"a", Dictionary{{"$date", Number::real(1e12)}}}}));
}

TEST(PropertyListFormat, LeavesOutWhatIsNestedTooDeep) {
    Value deep = Array();
    for (int depth = 0; depth < 2000; ++depth)
        deep = Array{deep};

    const Dictionary read = recordReadBack({{"deep", deep}, {"text", "kept"}});

    EXPECT_EQ(*read.find("text"), Value("kept"));
    EXPECT_TRUE(read.contains("deep"));
}

}  // namespace
}  // namespace parvel::testing
