// SPDX-License-Identifier: MIT
#include "platform/base/value.h"

#include <gtest/gtest.h>

#include <limits>

namespace brivo {
namespace {

TEST(DictionaryTest, KeepsTheOrderOfFirstSetting) {
  Dictionary dictionary{{"b", 1}, {"a", 2}};
  dictionary.set("b", 3);
  dictionary.set("c", 4);
  std::string keys;
  for (const auto& [key, value] : dictionary) keys += key;
  EXPECT_EQ(keys, "bac");
  EXPECT_EQ(dictionary.signedInteger("b"), 3);
}

TEST(DictionaryTest, AMissingKeyIsNone) {
  const Dictionary dictionary{{"text", "x"}};
  EXPECT_EQ(dictionary.find("other"), nullptr);
  EXPECT_EQ(dictionary.boolean("other"), std::nullopt);
  EXPECT_EQ(dictionary.string("other"), nullptr);
}

TEST(DictionaryTest, AValueOfAnotherKindIsNone) {
  const Dictionary dictionary{{"text", "7"}, {"number", 7}};
  EXPECT_EQ(dictionary.unsignedInteger("text"), std::nullopt);
  EXPECT_EQ(dictionary.string("number"), nullptr);
}

TEST(DictionaryTest, EqualityIgnoresOrder) {
  EXPECT_EQ((Dictionary{{"a", 1}, {"b", 2}}), (Dictionary{{"b", 2}, {"a", 1}}));
  EXPECT_FALSE((Dictionary{{"a", 1}}) == (Dictionary{{"a", 2}}));
  EXPECT_FALSE((Dictionary{{"a", 1}}) == (Dictionary{{"a", 1}, {"b", 2}}));
}

TEST(DictionaryTest, MergeReplacesAndAppends) {
  Dictionary dictionary{{"a", 1}, {"b", 2}};
  dictionary.merge({{"b", 3}, {"c", 4}});
  EXPECT_EQ(dictionary, (Dictionary{{"a", 1}, {"b", 3}, {"c", 4}}));
}

TEST(ValueTest, NumbersConvertIntoEachOther) {
  EXPECT_EQ(Value(true).asSigned(), 1);
  EXPECT_EQ(Value(0.75).asBoolean(), true);
  EXPECT_EQ(Value(2.9).asUnsigned(), 2u);
  EXPECT_EQ(Value(std::int32_t{-1}).asUnsigned(), std::numeric_limits<std::uint64_t>::max());
  EXPECT_EQ(Value(std::uint32_t{7}).asReal(), 7.0);
}

TEST(ValueTest, WhatDoesNotFitBecomesTheNearestThatDoes) {
  constexpr auto most = std::numeric_limits<std::int64_t>::max();
  EXPECT_EQ(Value(std::numeric_limits<std::uint64_t>::max()).asSigned(), most);
  EXPECT_EQ(Value(1e300).asSigned(), most);
  EXPECT_EQ(Value(-1e300).asUnsigned(), 0u);
  EXPECT_EQ(Value(std::numeric_limits<double>::quiet_NaN()).asSigned(), 0);
}

TEST(ValueTest, ClassesTellTheKind) {
  EXPECT_EQ(Value().valueClass(), Value::Class::none);
  EXPECT_EQ(Value(true).valueClass(), Value::Class::number);
  EXPECT_EQ(Value(1.5).valueClass(), Value::Class::number);
  EXPECT_EQ(Value("x").valueClass(), Value::Class::string);
  EXPECT_EQ(Value(Data::copyOf("x")).valueClass(), Value::Class::data);
  EXPECT_EQ(Value(Url::file("/x")).valueClass(), Value::Class::url);
  EXPECT_EQ(Value(Endpoint{"unix:path=/x"}).valueClass(), Value::Class::endpoint);
  EXPECT_EQ(Value(IndexSet{{1, 2}}).valueClass(), Value::Class::indexSet);
  EXPECT_EQ(Value(Error{"d", 1, "t"}).valueClass(), Value::Class::error);
  EXPECT_EQ(Value(Array{1}).valueClass(), Value::Class::array);
  EXPECT_EQ(Value(Dictionary{}).valueClass(), Value::Class::dictionary);
}

TEST(ValueTest, DescribesEveryKindOnOneLine) {
  const Dictionary dictionary{{"list", Array{1, "two", true}}, {"bytes", Data::copyOf("abc")}};
  EXPECT_EQ(describe(dictionary), "{list = (1, two, true); bytes = <3 bytes>}");
}

}  // namespace
}  // namespace brivo
