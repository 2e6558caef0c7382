#include "parvel/foundation/Value.h"
#include "tests/support/TestRounds.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <random>

namespace parvel::testing {
namespace {

std::vector<String> keysOf(const Dictionary& dictionary) {
    std::vector<String> keys;
    for (const Dictionary::Entry& entry : dictionary)
        keys.push_back(entry.key);
    return keys;
}

TEST(Dictionary, KeepsItsKeysInByteOrder) {
    const Dictionary dictionary{{"b", "1"}, {"a", "2"}, {"\xC3\xA4", "3"}, {"Z", "4"}, {"", "5"}};

    EXPECT_EQ(keysOf(dictionary), (std::vector<String>{"", "Z", "a", "b", "\xC3\xA4"}));
}

TEST(Dictionary, TakesTheLastOfSeveralEntriesWithOneKey) {
    const Dictionary dictionary{{"b", "1"}, {"a", "1"}, {"b", "2"}, {"b", "3"}, {"a", "2"}};

    EXPECT_EQ(dictionary, (Dictionary{{"a", "2"}, {"b", "3"}}));
}

TEST(Dictionary, TakesTheLastOfEqualKeysThatStandInOrder) {
    EXPECT_EQ((Dictionary{{"a", "1"}, {"a", "2"}}), (Dictionary{{"a", "2"}}));
}

TEST(Dictionary, FindsWhatItHolds) {
    const Dictionary dictionary{{"a", "1"}, {"c", "3"}};

    ASSERT_NE(dictionary.find("c"), nullptr);
    EXPECT_EQ(*dictionary.find("c"), Value("3"));
    EXPECT_EQ(dictionary.find("b"), nullptr);
    EXPECT_EQ(dictionary.find("d"), nullptr);
    EXPECT_EQ(Dictionary().find("a"), nullptr);
    EXPECT_TRUE(dictionary.contains("a"));
    EXPECT_FALSE(dictionary.contains(""));
}

TEST(Dictionary, TellsKeysApartBehindANUL) {
    const Dictionary dictionary{{String("a\0b", 3), "1"}};

    EXPECT_FALSE(dictionary.contains("a"));
    EXPECT_TRUE(dictionary.contains(std::string_view("a\0b", 3)));
}

TEST(Dictionary, SetsAndReplaces) {
    Dictionary dictionary{{"b", "1"}};
    dictionary.set("a", "2");
    dictionary.set("c", Value());
    dictionary.set("b", Number::signedInteger(3));

    EXPECT_EQ(dictionary,
              (Dictionary{{"a", "2"}, {"b", Number::signedInteger(3)}, {"c", Value()}}));
}

TEST(Dictionary, SetsOneOfItsOwnKeysAndValues) {
    Dictionary dictionary{{"b", "1"}};
    dictionary.set("a", *dictionary.find("b"));
    dictionary.set(dictionary.begin()->key, "2");

    EXPECT_EQ(dictionary, (Dictionary{{"a", "2"}, {"b", "1"}}));
}

TEST(Dictionary, Removes) {
    Dictionary dictionary{{"a", "1"}, {"b", "2"}};
    dictionary.remove("a");
    dictionary.remove("absent");

    EXPECT_EQ(dictionary, (Dictionary{{"b", "2"}}));
}

TEST(Dictionary, MergesTheOthersEntriesOverItsOwn) {
    Dictionary dictionary{{"a", "1"}, {"c", "1"}, {"e", "1"}};
    const Dictionary other{{"b", "2"}, {"c", "2"}, {"f", "2"}};
    dictionary.merge(other);

    EXPECT_EQ(dictionary, (Dictionary{{"a", "1"}, {"b", "2"}, {"c", "2"}, {"e", "1"}, {"f", "2"}}));
    EXPECT_EQ(other.size(), 3U);
}

TEST(Dictionary, MergesNothingAndItself) {
    Dictionary dictionary{{"a", "1"}};
    dictionary.merge(Dictionary{});
    dictionary.merge(dictionary);

    EXPECT_EQ(dictionary, (Dictionary{{"a", "1"}}));
    Dictionary empty;
    empty.merge(dictionary);
    EXPECT_EQ(empty, dictionary);
}

TEST(Dictionary, MergesADictionaryThatItHolds) {
    Dictionary dictionary{{"a", "1"}, {"inner", Dictionary{{"a", "2"}, {"inner", "3"}}}};
    dictionary.merge(*dictionary.find("inner")->as<Dictionary>());

    EXPECT_EQ(dictionary, (Dictionary{{"a", "2"}, {"inner", "3"}}));
}

TEST(Dictionary, CopiesWithoutGivenKeys) {
    const Dictionary dictionary{{"a", "1"}, {"b", "2"}, {"c", "3"}};

    EXPECT_EQ(dictionary.without({"b", "absent"}), (Dictionary{{"a", "1"}, {"c", "3"}}));
    EXPECT_EQ(dictionary.without({}), dictionary);
}

TEST(Dictionary, OfEqualEntriesHashesAlike) {
    const Dictionary left{{"a", Number::boolean(true)}, {"b", Array{"x"}}};
    const Dictionary right{{"b", Array{"x"}}, {"a", Number::real(1)}};

    EXPECT_EQ(left, right);
    EXPECT_EQ(left.hash(), right.hash());
    EXPECT_NE(left.hash(), left.without({"a"}).hash());
}

TEST(Dictionary, IsTakenApart) {
    std::vector<Dictionary::Entry> entries = Dictionary{{"b", "2"}, {"a", "1"}}.takeEntries();

    ASSERT_EQ(entries.size(), 2U);
    EXPECT_EQ(entries[0].key, "a");
    EXPECT_EQ((Array{"x", "y"}.takeValues()), (std::vector<Value>{"x", "y"}));
}

TEST(Dictionary, DoesWhatASortedMapDoes) {
    std::mt19937 random(1);
    const auto key = [&random] { return std::string(1, static_cast<char>('a' + random() % 12)); };
    Dictionary dictionary;
    std::map<String, Value> expected;
    for (std::size_t round = 0; round < testRounds(2000); ++round) {
        const String changed = key();
        switch (random() % 3) {
            case 0:
                dictionary.remove(changed);
                expected.erase(changed);
                break;
            case 1:
                dictionary.set(changed, std::to_string(round));
                expected[changed] = std::to_string(round);
                break;
            case 2:
                const Dictionary other{{changed, "m"}, {key(), "n"}, {key(), "o"}};
                dictionary.merge(other);
                for (const Dictionary::Entry& entry : other)
                    expected[entry.key] = entry.value;
                break;
        }
        ASSERT_TRUE(std::equal(dictionary.begin(), dictionary.end(), expected.begin(),
                               expected.end(), [](const auto& entry, const auto& pair) {
                                   return entry.key == pair.first && entry.value == pair.second;
                               }));
    }
}

}  // namespace
}  // namespace parvel::testing
