#include "parvel/foundation/Value.h"

#include <gtest/gtest.h>

#include <limits>

namespace parvel::testing {
namespace {

/// Arrays and dictionaries in turn, each within the next.
Value nested(std::size_t levels, Value innermost) {
    Value value = std::move(innermost);
    for (std::size_t level = 0; level < levels; ++level) {
        if (level % 2 == 0)
            value = Array(std::vector<Value>{std::move(value)});
        else
            value = Dictionary{{"k", std::move(value)}};
    }
    return value;
}

constexpr std::size_t kVeryDeep = 300'000;

TEST(Value, IsTheNullMarkerAtFirst) {
    EXPECT_EQ(Value().typeID(), TypeID::Null);
    EXPECT_EQ(Value(), Value(Null{}));
}

TEST(Value, KnowsItsKind) {
    EXPECT_EQ(Value(Number::real(1)).typeID(), TypeID::Number);
    EXPECT_EQ(Value("text").typeID(), TypeID::String);
    EXPECT_EQ(Value(std::string_view("text")).typeID(), TypeID::String);
    EXPECT_EQ(Value(Date{1}).typeID(), TypeID::Date);
    EXPECT_EQ(Value(Data()).typeID(), TypeID::Data);
    EXPECT_EQ(Value(Array{}).typeID(), TypeID::Array);
    EXPECT_EQ(Value(Dictionary{}).typeID(), TypeID::Dictionary);
}

TEST(Value, KeepsNULsInText) {
    const std::string text("a\0b", 3);

    EXPECT_EQ(*Value(text).as<String>(), text);
    EXPECT_EQ(*Value(std::string_view(text)).as<String>(), text);
}

TEST(Value, SharesAContainerWithItsCopies) {
    const auto dictionary = std::make_shared<const Dictionary>(Dictionary{{"a", "b"}});
    const auto array = std::make_shared<const Array>(Array{"a"});
    const Value first(dictionary);
    const Value second = first;

    EXPECT_EQ(second.as<Dictionary>(), dictionary.get());
    EXPECT_EQ(Value(array).as<Array>(), array.get());
    EXPECT_EQ(second.as<Array>(), nullptr);
}

TEST(Value, ComparesDeeply) {
    const Value left(Dictionary{{"list", Array{"a", Number::boolean(true), Value()}}});
    const Value right(Dictionary{{"list", Array{"a", Number::real(1), Value()}}});
    const Value other(Dictionary{{"list", Array{"a", Number::real(2), Value()}}});

    EXPECT_EQ(left, right);
    EXPECT_EQ(left.hash(), right.hash());
    EXPECT_NE(left, other);
}

TEST(Value, ComparesEveryKind) {
    EXPECT_EQ(Value(Date{1}), Value(Date{1}));
    EXPECT_NE(Value(Date{1}), Value(Date{2}));
    EXPECT_EQ(Value(Data::copyOf("a")), Value(Data::copyOf("a")));
    EXPECT_NE(Value(Data::copyOf("a")), Value(Data::copyOf("b")));
    EXPECT_NE(Value("a"), Value("b"));
    EXPECT_NE(Value(Array{"a"}), Value(Array{"a", "b"}));
    EXPECT_NE(Value(Dictionary{{"a", "x"}}), Value(Dictionary{{"b", "x"}}));
    EXPECT_NE(Value(Dictionary{{"a", "x"}}), Value(Dictionary{{"a", "x"}, {"b", "x"}}));
}

TEST(Value, OfDifferentKindsIsNeverEqual) {
    EXPECT_NE(Value("1"), Value(Number::signedInteger(1)));
    EXPECT_NE(Value(Date{1}), Value(Number::real(1)));
    EXPECT_NE(Value(""), Value());
    EXPECT_NE(Value(Data()), Value(""));
    EXPECT_NE(Value(Array{}), Value(Dictionary{}));
}

TEST(Value, EqualsItselfEvenWithNaNInside) {
    const double nan = std::numeric_limits<double>::quiet_NaN();

    EXPECT_EQ(Value(Array{Number::real(nan)}), Value(Array{Number::real(nan)}));
    EXPECT_EQ(Value(Array{Date{nan}}), Value(Array{Date{nan}}));
}

TEST(Value, OfEqualValueHashesAlike) {
    EXPECT_EQ(Value(Number::boolean(true)).hash(), Value(Number::real(1)).hash());
    EXPECT_EQ(Value(Date{-0.0}).hash(), Value(Date{0.0}).hash());
    EXPECT_EQ(Value("a").hash(), Value(String("a")).hash());
    EXPECT_NE(Value("a").hash(), Value("b").hash());
}

TEST(Value, TakesTheValueOfOneWithinIt) {
    for (const Value& inner : {Value("text"), Value(Number::real(1)), Value(Array{"a"})}) {
        Value value(Array{inner});
        value = (*value.as<Array>())[0];
        EXPECT_EQ(value, inner);

        const Value& same = value;
        value = same;
        EXPECT_EQ(value, inner);
    }
}

TEST(Value, OfAnyDepthIsFreed) {
    { const Value deep = nested(kVeryDeep, "x"); }
    Value replaced = nested(kVeryDeep, "x");
    replaced = "y";

    EXPECT_EQ(replaced, Value("y"));
}

TEST(Value, IsKeptWhereADeepOneAroundItIsFreed) {
    const Value inner = nested(200, "x");
    { const Value outer = nested(kVeryDeep, inner); }

    EXPECT_EQ(inner, nested(200, "x"));
}

TEST(Value, IsFreedWhereItIsBothWideAndDeep) {
    const auto leaf = std::make_shared<const Array>(Array{"leaf"});
    {
        Value value(leaf);
        for (int level = 0; level < 200; ++level)
            value = Array{value, Array{Value(leaf)}, Dictionary{{"k", Value(leaf)}}};
    }

    EXPECT_EQ(leaf.use_count(), 1);
}

TEST(Value, OfAnyDepthIsComparedAndHashed) {
    const Value deep = nested(kVeryDeep, "x");

    EXPECT_EQ(deep, nested(kVeryDeep, "x"));
    EXPECT_NE(deep, nested(kVeryDeep, "y"));
    EXPECT_EQ(deep.hash(), nested(kVeryDeep, "x").hash());
}

TEST(Value, OfAnyDepthIsDescribedTo512Levels) {
    const String text = description(nested(kVeryDeep, "x"));

    EXPECT_EQ(text.size(), 256 * std::string("{k = ()}").size() + std::string("{…}").size());
    EXPECT_NE(text.find("({…})"), String::npos);
    EXPECT_NE(description(nested(512, "x")).find("(\"x\")"), String::npos);
}

TEST(Description, IsOneLineInKeyOrder) {
    const Value value(Dictionary{{"title", "A \"B\" \\ C\nD"},
                                 {"cover", Data::copyOf("12345")},
                                 {"added", Date{0.5}},
                                 {"tags", Array{"a", Number::signedInteger(2), Value()}},
                                 {"Z", Number::boolean(true)},
                                 {"empty", Dictionary{}}});

    EXPECT_EQ(description(value),
              "{Z = 1; added = 2001-01-01T00:00:00.5Z; cover = <5 bytes>; empty = {}; "
              "tags = (\"a\", 2, <null>); title = \"A \\\"B\\\" \\\\ C\\nD\"}");
}

TEST(Description, IsOneLineWhateverAKeyHolds) {
    const Dictionary dictionary{{"a\n\"b\" \\", Number::signedInteger(1)}};

    EXPECT_EQ(description(dictionary), "{a\\n\\\"b\\\" \\\\ = 1}");
}

TEST(Description, OfADictionaryIsThatOfItsValue) {
    const Dictionary dictionary{{"a", "b"}};

    EXPECT_EQ(description(dictionary), "{a = \"b\"}");
    EXPECT_EQ(description(Dictionary{}), "{}");
    EXPECT_EQ(description(Value(Array{})), "()");
}

TEST(Description, OfADateWithoutAnISOFormIsItsSeconds) {
    EXPECT_EQ(description(Value(Date{1e300})), "1e+300");
}

}  // namespace
}  // namespace parvel::testing
