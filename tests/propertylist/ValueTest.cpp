#include "propertylist/Value.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <optional>

namespace propertylist {
namespace {

std::vector<std::string> keysOf(const Dictionary& dictionary) {
  std::vector<std::string> keys;
  for (const Dictionary::Entry& entry : dictionary) keys.push_back(entry.key());
  return keys;
}

TEST(Value, TellsItsKindAndHoldsWhatItWasMadeFrom) {
  EXPECT_EQ(Value(Dictionary{{"a", 1}}).kind(), Kind::dictionary);
  EXPECT_EQ(Value(Array{1}).kind(), Kind::array);
  EXPECT_EQ(Value("text").kind(), Kind::string);
  EXPECT_EQ(Value(7).kind(), Kind::integer);
  EXPECT_EQ(Value(1.5).kind(), Kind::real);
  EXPECT_EQ(Value(true).kind(), Kind::boolean);
  EXPECT_EQ(Value(Date{8}).kind(), Kind::date);
  EXPECT_EQ(Value(Bytes{1}).kind(), Kind::data);

  EXPECT_EQ(*Value(Dictionary{{"a", 1}}).asDictionary()->find("a"), Value(1));
  EXPECT_EQ((*Value(Array{5}).asArray())[0], Value(5));
  EXPECT_EQ(*Value(std::string_view("text")).asString(), "text");
  EXPECT_EQ(Value(7).asInteger(), 7);
  EXPECT_EQ(Value(1.5F).asReal(), 1.5);
  EXPECT_EQ(Value(true).asBoolean(), true);
  EXPECT_EQ(Value(Date{8}).asDate(), Date{8});
  EXPECT_EQ(*Value(Bytes{1, 2}).asData(), (Bytes{1, 2}));
}

TEST(Value, GivesNothingWhenAskedForAnotherKind) {
  const Value integer(7);
  EXPECT_EQ(integer.asDictionary(), nullptr);
  EXPECT_EQ(integer.asArray(), nullptr);
  EXPECT_EQ(integer.asString(), nullptr);
  EXPECT_EQ(integer.asReal(), std::nullopt);
  EXPECT_EQ(integer.asBoolean(), std::nullopt);
  EXPECT_EQ(integer.asDate(), std::nullopt);
  EXPECT_EQ(integer.asData(), nullptr);
  EXPECT_EQ(Value("7").asInteger(), std::nullopt);
  EXPECT_EQ(Value("7").asUnsigned(), std::nullopt);
}

TEST(Value, GivesAnIntegerOnlyWhereItFits) {
  const struct {
    const char* name;
    Value value;
    std::optional<std::int64_t> asInteger;
    std::optional<std::uint64_t> asUnsigned;
  } kCases[] = {
      {"small", Value(5), 5, 5},
      {"negative", Value(-5), -5, std::nullopt},
      {"smallest", Value(std::numeric_limits<std::int64_t>::min()),
       std::numeric_limits<std::int64_t>::min(), std::nullopt},
      {"largest signed", Value(0x7FFFFFFFFFFFFFFF), 0x7FFFFFFFFFFFFFFF, 0x7FFFFFFFFFFFFFFFU},
      {"above it", Value(0x8000000000000000U), std::nullopt, 0x8000000000000000U},
      {"largest unsigned", Value(0xFFFFFFFFFFFFFFFFU), std::nullopt, 0xFFFFFFFFFFFFFFFFU},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(c.value.asInteger(), c.asInteger);
    EXPECT_EQ(c.value.asUnsigned(), c.asUnsigned);
  }
}

TEST(Value, EqualsStrictlyByKindAndContent) {
  const double otherNaN = std::bit_cast<double>(0x7FF8000000000001U);
  const double nan = std::numeric_limits<double>::quiet_NaN();
  const struct {
    const char* name;
    Value a, b;
    bool isEqual;
  } kCases[] = {
      {"integer and real", 1, 1.0, false},
      {"integer and boolean", 1, true, false},
      {"real and boolean", 1.0, true, false},
      {"integer and string", 1, "1", false},
      {"real and date", 1.0, Date{1.0}, false},
      {"string and data", "a", Bytes{'a'}, false},
      {"empty array and dictionary", Array(), Dictionary(), false},
      {"signed and unsigned", std::int64_t{5}, std::uint64_t{5}, true},
      {"-1 and 2^64-1", -1, 0xFFFFFFFFFFFFFFFFU, false},
      {"zeros of two signs", 0.0, -0.0, false},
      {"a NaN and itself", nan, nan, true},
      {"two NaNs", nan, otherNaN, false},
      {"dates that are no number", Date{nan}, Date{nan}, true},
      {"dates of two zeros", Date{0.0}, Date{-0.0}, false},
      {"texts with and without NUL", std::string("a"), std::string("a\0", 2), false},
      {"arrays in another order", Array{1, 2}, Array{2, 1}, false},
      {"an array and its beginning", Array{1, 2}, Array{1}, false},
      {"dictionaries made in another order", Dictionary{{"a", 1}, {"b", 2}},
       Dictionary{{"b", 2}, {"a", 1}}, true},
      {"dictionaries with other keys", Dictionary{{"a", 1}}, Dictionary{{"b", 1}}, false},
      {"dictionaries with other values", Dictionary{{"a", 1}}, Dictionary{{"a", 2}}, false},
      {"nested, equal", Dictionary{{"a", Array{Dictionary{{"b", Bytes{1}}}}}},
       Dictionary{{"a", Array{Dictionary{{"b", Bytes{1}}}}}}, true},
      {"nested, other", Dictionary{{"a", Array{Dictionary{{"b", Bytes{1}}}}}},
       Dictionary{{"a", Array{Dictionary{{"b", Bytes{2}}}}}}, false},
      {"long texts", std::string(100, 'a'), std::string(100, 'a'), true},
      {"long texts that end otherwise", std::string(100, 'a'), std::string(99, 'a') + "b", false},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(c.a == c.b, c.isEqual);
    EXPECT_EQ(c.b == c.a, c.isEqual);
    EXPECT_TRUE(c.a == c.a);
  }
}

TEST(Value, IsNotChangedByAChangeOfItsCopy) {
  const Dictionary original{{"list", Array{1, 2}}, {"name", "x"}};
  Dictionary copy = original;
  EXPECT_TRUE(copy.sharesStorageWith(original));
  Array list = *findArray(copy, "list");
  list.append(3);
  copy.set("list", list);
  copy.remove("name");
  EXPECT_EQ(original, (Dictionary{{"list", Array{1, 2}}, {"name", "x"}}));
  EXPECT_EQ(copy, (Dictionary{{"list", Array{1, 2, 3}}}));
  EXPECT_FALSE(copy.sharesStorageWith(original));
}

TEST(Value, TakesAPartOfItselfInItsOwnPlace) {
  Value copied(Array{Value(Array{Value(Array{"inner"})})});
  copied = (*copied.asArray())[0];
  EXPECT_EQ(copied, Value(Array{Value(Array{"inner"})}));
  Value other(Array{"text"});
  other = (*other.asArray())[0];
  EXPECT_EQ(other, Value("text"));
  Value& same = other;
  other = std::move(same);
  EXPECT_EQ(other, Value("text"));
}

TEST(Value, CanHoldItselfAsItWas) {
  Array array{1};
  array.append(array);
  array.replace(0, array);
  EXPECT_EQ(array, (Array{Array{1, Array{1}}, Array{1}}));
  Dictionary dictionary{{"a", 1}};
  dictionary.set("self", dictionary);
  EXPECT_EQ(dictionary, (Dictionary{{"a", 1}, {"self", Dictionary{{"a", 1}}}}));
}

TEST(Value, IsAnEmptyDictionaryAfterItWasMovedFrom) {
  Value text("text");
  const Value taken = std::move(text);
  EXPECT_EQ(taken, Value("text"));
  EXPECT_EQ(text, Value(Dictionary()));  // NOLINT(bugprone-use-after-move): this is the rule
}

TEST(Value, EqualsWhereDataOrAnEmptyDictionaryIsTheSame) {
  const Value data = Bytes(100, 1);
  EXPECT_EQ(Value(Array{data, 1}), Value(Array{data, 1}));
  Dictionary emptied{{"a", 1}};
  emptied.remove("a");
  EXPECT_EQ(Value(emptied), Value(Dictionary()));
  EXPECT_EQ(Dictionary(std::vector<Dictionary::Entry>()), Dictionary());
  EXPECT_FALSE((Dictionary{{"a", 1}} == Dictionary{{"a", 2}}));
}

TEST(Dictionary, OfManyKeysHasNothingBehindTheLast) {
  Dictionary many;
  for (int number = 100; number < 200; ++number) many.set(std::to_string(number), number);
  EXPECT_EQ(many.find("999"), nullptr);
  EXPECT_EQ(many.find("1995"), nullptr);
  EXPECT_EQ(*many.find("199"), Value(199));
}

TEST(Value, SharesTheTextThatItWasMadeFrom) {
  const auto text = std::make_shared<const std::string>("shared");
  const Value value(text);
  const Value copy = value;
  EXPECT_EQ(copy.asString()->data(), text->data());
}

TEST(Array, ChangesByAppendReplaceAndRemove) {
  Array array;
  EXPECT_TRUE(array.empty());
  array.append("a");
  array.append("b");
  array.append("c");
  array.replace(1, "B");
  array.removeAt(0);
  EXPECT_EQ(array, (Array{"B", "c"}));
  EXPECT_TRUE(array.contains("c"));
  EXPECT_FALSE(array.contains("b"));
  array.removeAt(1);
  array.removeAt(0);
  EXPECT_EQ(array, Array());
}

TEST(Dictionary, IsKeptInTheOrderOfItsKeysBytes) {
  Dictionary dictionary{{"b", 1}, {"a", 2}, {"", 3}};
  dictionary.set("\xC3\xA4", 4);  // a letter above ASCII comes after all of ASCII
  dictionary.set("Z", 5);
  dictionary.set("aa", 6);
  EXPECT_EQ(keysOf(dictionary), (std::vector<std::string>{"", "Z", "a", "aa", "b", "\xC3\xA4"}));
}

TEST(Dictionary, KeepsTheLastValueOfAKeyThatIsGivenTwice) {
  EXPECT_EQ((Dictionary{{"b", 0}, {"a", 1}, {"a", 2}, {"c", 3}, {"a", 4}}),
            (Dictionary{{"a", 4}, {"b", 0}, {"c", 3}}));
  std::vector<Dictionary::Entry> entries{{"k", 1}, {"k", 2}};
  EXPECT_EQ(Dictionary(entries), (Dictionary{{"k", 2}}));
}

TEST(Dictionary, FindsSetsAndRemovesByKey) {
  Dictionary dictionary;
  EXPECT_EQ(dictionary.find("a"), nullptr);
  EXPECT_FALSE(dictionary.remove("a"));
  for (int i = 0; i < 1000; ++i) dictionary.set(std::to_string(i * 7919 % 1000), i);
  EXPECT_EQ(dictionary.size(), 1000U);
  for (int i = 0; i < 1000; ++i) {
    EXPECT_EQ(*dictionary.find(std::to_string(i * 7919 % 1000)), Value(i));
  }
  EXPECT_EQ(dictionary.find("1000"), nullptr);
  dictionary.set("17", "new");
  EXPECT_EQ(*dictionary.find("17"), Value("new"));
  EXPECT_TRUE(dictionary.remove("17"));
  EXPECT_FALSE(dictionary.contains("17"));
  EXPECT_EQ(dictionary.size(), 999U);
}

TEST(Dictionary, TakesAKeyThatLiesInItself) {
  Dictionary dictionary{{"a", 1}, {"b", 2}};
  dictionary.set(dictionary.begin()->key(), 3);
  EXPECT_EQ(dictionary, (Dictionary{{"a", 3}, {"b", 2}}));
  EXPECT_TRUE(dictionary.remove(dictionary.begin()->key()));
  EXPECT_EQ(dictionary, (Dictionary{{"b", 2}}));
}

TEST(Dictionary, AnswersAValueOnlyInTheNamedKind) {
  const Dictionary dictionary{{"array", Array{1}},
                              {"boolean", true},
                              {"dictionary", Dictionary{{"x", 1}}},
                              {"string", "text"}};
  EXPECT_EQ(*findString(dictionary, "string"), "text");
  EXPECT_EQ(*findArray(dictionary, "array"), Array{1});
  EXPECT_EQ(*findDictionary(dictionary, "dictionary"), (Dictionary{{"x", 1}}));
  EXPECT_EQ(findBoolean(dictionary, "boolean"), true);
  EXPECT_EQ(findString(dictionary, "array"), nullptr);
  EXPECT_EQ(findArray(dictionary, "string"), nullptr);
  EXPECT_EQ(findDictionary(dictionary, "string"), nullptr);
  EXPECT_EQ(findBoolean(dictionary, "string"), std::nullopt);
  EXPECT_EQ(findString(dictionary, "absent"), nullptr);
  EXPECT_EQ(findBoolean(dictionary, "absent"), std::nullopt);
}

TEST(Entry, KeepsItsKeyWhateverItsValueBecomes) {
  std::vector<Dictionary::Entry> entries{{"a", -1}, {"b", true}, {"c", "text"}};
  entries[0] = entries[2];
  EXPECT_EQ(entries[0].key(), "c");
  EXPECT_EQ(entries[0].value(), Value("text"));
  entries[1] = std::move(entries[0]);
  EXPECT_EQ(entries[1].key(), "c");
  EXPECT_EQ(entries[1].value(), Value("text"));
  const Dictionary::Entry& same = entries[1];
  entries[1] = same;
  EXPECT_EQ(entries[1].key(), "c");
  entries[0] = Dictionary::Entry("d", Array{1});
  EXPECT_EQ(entries[0].key(), "d");
  EXPECT_EQ(entries[0].value(), Value(Array{1}));
  EXPECT_EQ(entries[2].key(), "c");
}

TEST(Entry, GivesAwayCopiesOfItsValueWithoutItsKey) {
  Dictionary dictionary{{"outer", Dictionary{{"inner", -5}}}};
  Value copy = dictionary.begin()->value();
  dictionary.set("outer", false);
  dictionary.set("outer", copy);
  copy = *copy.asDictionary()->find("inner");
  EXPECT_EQ(copy, Value(-5));
  EXPECT_EQ(keysOf(dictionary), std::vector<std::string>{"outer"});
  EXPECT_EQ(dictionary, (Dictionary{{"outer", Dictionary{{"inner", -5}}}}));
}

TEST(Value, TellsBooleansFromIntegersBelowZero) {
  constexpr auto kSmallest = std::numeric_limits<std::int64_t>::min();
  constexpr auto kLargest = std::numeric_limits<std::uint64_t>::max();
  for (const Value& integer : {Value(-1), Value(kSmallest)}) {
    EXPECT_EQ(integer.kind(), Kind::integer);
    EXPECT_EQ(integer.asBoolean(), std::nullopt);
    EXPECT_EQ(integer.asUnsigned(), std::nullopt);
  }
  EXPECT_EQ(Value(kSmallest).asInteger(), kSmallest);
  EXPECT_EQ(Value(kLargest).asUnsigned(), kLargest);
  EXPECT_EQ(Value(kLargest).asInteger(), std::nullopt);
  EXPECT_NE(Value(kLargest), Value(-1));
  for (const bool boolean : {false, true}) {
    EXPECT_EQ(Value(boolean).kind(), Kind::boolean);
    EXPECT_EQ(Value(boolean).asInteger(), std::nullopt);
    EXPECT_NE(Value(boolean), Value(boolean ? 1 : 0));
  }
}

}  // namespace
}  // namespace propertylist
