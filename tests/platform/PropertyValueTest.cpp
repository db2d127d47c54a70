// IC::PropertyValue: every constructor, text form and comparison.
#include <gtest/gtest.h>

#include <sstream>

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
