// IC::PropertyValue: every constructor, text form and comparison.
#include <gtest/gtest.h>

#include <iostream>
#include <memory>
#include <sstream>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

#include "IC/PropertyValue.h"

using IC::EnumValue;
using IC::Number;
using IC::PropertyValue;
using IC::Version2;

TEST(PropertyValue, DefaultIsNone) {
    PropertyValue value;
    EXPECT_EQ(PropertyValue::NONE, value.getKind());
    EXPECT_FALSE(value.getFlag());
    EXPECT_EQ("", value.toString());
}

TEST(PropertyValue, CharPointerMakesString) {
    PropertyValue value("Computer System", true);
    EXPECT_EQ(PropertyValue::STRING, value.getKind());
    EXPECT_TRUE(value.getFlag());
    EXPECT_EQ("Computer System", value.getString());
    EXPECT_EQ("Computer System", value.toString());
}

TEST(PropertyValue, StdStringMakesString) {
    PropertyValue value(std::string("abc"), false);
    EXPECT_EQ(PropertyValue::STRING, value.getKind());
    EXPECT_FALSE(value.getFlag());
    EXPECT_EQ("abc", value.getString());
    EXPECT_EQ("abc", static_cast<std::string>(value));
}

TEST(PropertyValue, NumberKeepsNumber) {
    PropertyValue value(Number(3276.8), true);
    EXPECT_EQ(PropertyValue::NUMBER, value.getKind());
    EXPECT_TRUE(value.getFlag());
    EXPECT_EQ(Number(3276.8), value.getNumber());
    EXPECT_EQ("3276.8", value.toString());
    EXPECT_EQ("2.7", PropertyValue(Number(Version2(2, 7)), false).toString());
}

TEST(PropertyValue, EnumKeepsEnum) {
    PropertyValue value(EnumValue(static_cast<unsigned short>(513)), false);
    EXPECT_EQ(PropertyValue::ENUM, value.getKind());
    EXPECT_EQ(EnumValue(static_cast<unsigned short>(513)), value.getEnum());
    EXPECT_EQ(2u, value.getEnum().getWidth());
    EXPECT_EQ("513", value.toString());
}

TEST(PropertyValue, ByteKeepsByteInDecimal) {
    PropertyValue value(static_cast<unsigned char>(0xAB), true);
    EXPECT_EQ(PropertyValue::BYTE, value.getKind());
    EXPECT_TRUE(value.getFlag());
    EXPECT_EQ(0xAB, value.getByte());
    EXPECT_EQ("171", value.toString());
}

TEST(PropertyValue, BytesPrintAsUpperCaseHexPairs) {
    std::vector<unsigned char> const bytes = {0x04, 0x03, 0x02, 0x01};
    PropertyValue value(bytes, false);
    EXPECT_EQ(PropertyValue::BYTES, value.getKind());
    EXPECT_EQ(bytes, value.getBytes());
    EXPECT_EQ("04 03 02 01", value.toString());
    EXPECT_EQ("AB FF 00 7E",
              PropertyValue(std::vector<unsigned char>{0xab, 0xff, 0x00, 0x7e}, false).toString());
    EXPECT_EQ("", PropertyValue(std::vector<unsigned char>{}, false).toString());
}

TEST(PropertyValue, NumbersPrintBetweenBraces) {
    std::vector<Number> const numbers = {Number(1u), Number(9u), Number(12u)};
    PropertyValue value(numbers, true);
    EXPECT_EQ(PropertyValue::NUMBERS, value.getKind());
    EXPECT_EQ(numbers, value.getNumbers());
    EXPECT_EQ("{1, 9, 12}", value.toString());
    EXPECT_EQ("{}", PropertyValue(std::vector<Number>{}, true).toString());
}

TEST(PropertyValue, StringsPrintBetweenBraces) {
    std::vector<std::string> const strings = {"a", "b"};
    PropertyValue value(strings, false);
    EXPECT_EQ(PropertyValue::STRINGS, value.getKind());
    EXPECT_EQ(strings, value.getStrings());
    EXPECT_EQ("{a, b}", value.toString());
}

TEST(PropertyValue, BareKindCarriesKind) {
    PropertyValue value(PropertyValue::STRINGS, true);
    EXPECT_EQ(PropertyValue::KIND, value.getKind());
    EXPECT_TRUE(value.getFlag());
    EXPECT_EQ(PropertyValue::STRINGS, value.getKindValue());
    EXPECT_EQ("7", value.toString());
}

TEST(PropertyValue, EqualityComparesKindFlagAndValue) {
    EXPECT_EQ(PropertyValue("x", true), PropertyValue(std::string("x"), true));
    EXPECT_NE(PropertyValue("x", true), PropertyValue("x", false));
    EXPECT_NE(PropertyValue("x", true), PropertyValue("y", true));
    EXPECT_NE(PropertyValue(Number(1u), false), PropertyValue(Number(2u), false));
    EXPECT_NE(PropertyValue(static_cast<unsigned char>(1), false),
              PropertyValue(EnumValue(static_cast<unsigned char>(1)), false));
    EXPECT_EQ(PropertyValue(), PropertyValue());
    EXPECT_NE(PropertyValue(PropertyValue::BYTE, false),
              PropertyValue(PropertyValue::BYTES, false));
}

TEST(PropertyValue, StreamWritesText) {
    std::ostringstream out;
    out << PropertyValue(std::vector<std::string>{"x", "y", "z"}, false);
    EXPECT_EQ("{x, y, z}", out.str());
}

namespace {

// One value of every kind, each with a value other than its kind's empty
// one; texts and vectors long enough to live on the heap.
std::vector<PropertyValue> everyKind() {
    return {PropertyValue(),
            PropertyValue("a text too long to be kept inside the string", true),
            PropertyValue(Number(Version2(2, 8)), true),
            PropertyValue(EnumValue(static_cast<unsigned short>(515)), false),
            PropertyValue(static_cast<unsigned char>(0xA5), true),
            PropertyValue(std::vector<unsigned char>(40, 0x5A), true),
            PropertyValue(std::vector<Number>(30, Number(255u)), true),
            PropertyValue(std::vector<std::string>(3, std::string(40, 'x')), false),
            PropertyValue(PropertyValue::NUMBERS, true)};
}

// Every getter but the one of the value's own kind gives the empty or zero
// value of its kind.
void expectOtherGettersEmpty(PropertyValue const& value) {
    PropertyValue::KindType const kind = value.getKind();
    if (kind != PropertyValue::STRING) {
        EXPECT_EQ("", value.getString());
    }
    if (kind != PropertyValue::NUMBER) {
        EXPECT_EQ(Number::NONE, value.getNumber().getKind());
        EXPECT_EQ(Number(), value.getNumber());
    }
    if (kind != PropertyValue::ENUM) {
        EXPECT_EQ(EnumValue(), value.getEnum());
    }
    if (kind != PropertyValue::BYTE) {
        EXPECT_EQ(0, value.getByte());
    }
    if (kind != PropertyValue::BYTES) {
        EXPECT_TRUE(value.getBytes().empty());
    }
    if (kind != PropertyValue::NUMBERS) {
        EXPECT_TRUE(value.getNumbers().empty());
    }
    if (kind != PropertyValue::STRINGS) {
        EXPECT_TRUE(value.getStrings().empty());
    }
    if (kind != PropertyValue::KIND) {
        EXPECT_EQ(PropertyValue::NONE, value.getKindValue());
    }
}

}  // namespace

TEST(PropertyValue, GettersOfAnotherKindGiveEmptyValues) {
    for (PropertyValue const& value : everyKind()) {
        SCOPED_TRACE(value.getKind());
        expectOtherGettersEmpty(value);
    }
}

TEST(PropertyValue, EmptyAnswersOutliveTheValue) {
    std::string const* text = nullptr;
    std::vector<Number> const* numbers = nullptr;
    std::vector<std::string> const* strings = nullptr;
    {
        PropertyValue const value(static_cast<unsigned char>(1), true);
        text = &value.getString();
        numbers = &value.getNumbers();
        strings = &value.getStrings();
    }
    EXPECT_TRUE(text->empty());
    EXPECT_TRUE(numbers->empty());
    EXPECT_TRUE(strings->empty());
}

TEST(PropertyValue, CopiesKeepKindFlagAndValue) {
    for (PropertyValue const& source : everyKind()) {
        SCOPED_TRACE(source.getKind());
        std::unique_ptr<PropertyValue> original(new PropertyValue(source));
        PropertyValue const copy(*original);
        std::string const text = original->toString();
        original.reset();
        EXPECT_EQ(source, copy);
        EXPECT_EQ(source.getFlag(), copy.getFlag());
        EXPECT_EQ(text, copy.toString());
        expectOtherGettersEmpty(copy);
    }
}

TEST(PropertyValue, AssignmentBetweenEveryTwoKinds) {
    std::vector<PropertyValue> const values = everyKind();
    for (PropertyValue const& before : values) {
        for (PropertyValue const& source : values) {
            SCOPED_TRACE(std::to_string(before.getKind()) + " = " +
                         std::to_string(source.getKind()));
            PropertyValue copied(before);
            copied = source;
            EXPECT_EQ(source, copied);
            EXPECT_EQ(source.toString(), copied.toString());
            expectOtherGettersEmpty(copied);

            PropertyValue moved(before);
            PropertyValue donor(source);
            moved = std::move(donor);
            EXPECT_EQ(source, moved);
            EXPECT_EQ(source.getKind(), donor.getKind());
            EXPECT_EQ(source.getFlag(), donor.getFlag());
            expectOtherGettersEmpty(moved);
        }
    }
}

TEST(PropertyValue, AssignmentOfTheSameKindReplacesTheValue) {
    PropertyValue value(std::vector<Number>{Number(1u), Number(2u)}, true);
    value = PropertyValue(std::vector<Number>{Number(3u)}, false);
    EXPECT_EQ(PropertyValue(std::vector<Number>{Number(3u)}, false), value);
    value = PropertyValue("short", true);
    value = PropertyValue(std::string(50, 'y'), true);
    EXPECT_EQ(std::string(50, 'y'), value.getString());
}

TEST(PropertyValue, SelfAssignmentKeepsTheValue) {
    for (PropertyValue const& source : everyKind()) {
        SCOPED_TRACE(source.getKind());
        PropertyValue value(source);
        PropertyValue const& sameByCopy = value;
        value = sameByCopy;
        EXPECT_EQ(source, value);
        PropertyValue& sameByMove = value;
        value = std::move(sameByMove);
        EXPECT_EQ(source, value);
    }
}

TEST(PropertyValue, MoveKeepsValueAndLeavesKindAndFlag) {
    for (PropertyValue const& source : everyKind()) {
        SCOPED_TRACE(source.getKind());
        PropertyValue donor(source);
        PropertyValue const moved(std::move(donor));
        EXPECT_EQ(source, moved);
        EXPECT_EQ(source.getKind(), donor.getKind());
        EXPECT_EQ(source.getFlag(), donor.getFlag());
        donor = PropertyValue("again", false);
        EXPECT_EQ(PropertyValue("again", false), donor);
    }
    EXPECT_TRUE(std::is_nothrow_move_constructible<PropertyValue>::value);
    EXPECT_TRUE(std::is_nothrow_move_assignable<PropertyValue>::value);
}

TEST(PropertyValue, VectorOfValuesSurvivesGrowth) {
    std::vector<PropertyValue> const values = everyKind();
    std::vector<PropertyValue> grown;
    for (int round = 0; round < 20; ++round) {
        grown.insert(grown.begin(), values.begin(), values.end());
    }
    for (size_t i = 0; i < grown.size(); ++i) {
        EXPECT_EQ(values[i % values.size()], grown[i]);
    }
}

TEST(PropertyValue, EqualityNeverHoldsAcrossKinds) {
    std::vector<PropertyValue> const values = everyKind();
    for (size_t i = 0; i < values.size(); ++i) {
        for (size_t j = 0; j < values.size(); ++j) {
            EXPECT_EQ(i == j, values[i] == values[j]) << i << " " << j;
        }
    }
    // Empty values of different kinds differ too.
    EXPECT_NE(PropertyValue("", true), PropertyValue(std::vector<std::string>(), true));
    EXPECT_NE(PropertyValue(std::vector<unsigned char>(), true),
              PropertyValue(std::vector<Number>(), true));
    EXPECT_NE(PropertyValue(Number(), true), PropertyValue(PropertyValue::NONE, true));
    EXPECT_NE(PropertyValue(), PropertyValue(PropertyValue::NONE, false));
}

TEST(PropertyValue, IsNoLargerThanATextAndAPointer) {
    std::cout << "sizeof(IC::PropertyValue) = " << sizeof(PropertyValue) << "\n";
    EXPECT_LE(sizeof(PropertyValue), sizeof(std::string) + sizeof(void*));
}
