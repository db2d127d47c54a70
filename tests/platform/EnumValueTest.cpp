// IC::EnumValue: value, width, text form and comparison.
#include <gtest/gtest.h>

#include <sstream>

#include "IC/EnumValue.h"

using IC::EnumValue;

TEST(EnumValue, DefaultIsZeroOfFourBytes) {
    EnumValue value;
    EXPECT_EQ(0, value.getValue());
    EXPECT_EQ(4u, value.getWidth());
    EXPECT_EQ("0", value.toString());
}

TEST(EnumValue, UnsignedCharHasWidthOne) {
    EnumValue value(static_cast<unsigned char>(200));
    EXPECT_EQ(200, value.getValue());
    EXPECT_EQ(1u, value.getWidth());
}

TEST(EnumValue, UnsignedShortHasWidthTwo) {
    EnumValue value(static_cast<unsigned short>(60000));
    EXPECT_EQ(60000, value.getValue());
    EXPECT_EQ(2u, value.getWidth());
}

TEST(EnumValue, ShortHasWidthTwoAndKeepsSign) {
    EnumValue value(static_cast<short>(-5));
    EXPECT_EQ(-5, value.getValue());
    EXPECT_EQ(2u, value.getWidth());
    EXPECT_EQ("-5", value.toString());
}

TEST(EnumValue, UnsignedIntHasWidthFourAndFullRange) {
    EnumValue value(4000000000u);
    EXPECT_EQ(INT64_C(4000000000), value.getValue());
    EXPECT_EQ(4u, value.getWidth());
    EXPECT_EQ("4000000000", value.toString());
}

TEST(EnumValue, IntHasWidthFourAndKeepsSign) {
    EnumValue value(-7);
    EXPECT_EQ(-7, value.getValue());
    EXPECT_EQ(4u, value.getWidth());
}

TEST(EnumValue, EqualityComparesValueAndWidth) {
    EXPECT_EQ(EnumValue(3), EnumValue(3));
    EXPECT_EQ(EnumValue(3), EnumValue(3u));
    EXPECT_NE(EnumValue(3), EnumValue(4));
    EXPECT_NE(EnumValue(static_cast<unsigned char>(3)), EnumValue(3));
    EXPECT_NE(EnumValue(static_cast<short>(3)), EnumValue(static_cast<unsigned char>(3)));
}

TEST(EnumValue, TextAndStreamAreDecimal) {
    std::ostringstream out;
    out << EnumValue(static_cast<unsigned short>(1234));
    EXPECT_EQ("1234", out.str());
    EXPECT_EQ("255", EnumValue(static_cast<unsigned char>(255)).toString());
}
