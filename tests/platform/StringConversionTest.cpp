// SD::make_string / SD::make_wstring: byte-for-character conversions.
#include <gtest/gtest.h>

#include "SD/StringConversion.h"

TEST(StringConversion, AsciiConvertsBothWays) {
    EXPECT_EQ(L"libkestrel.so", SD::make_wstring("libkestrel.so"));
    EXPECT_EQ("libkestrel.so", SD::make_string(L"libkestrel.so"));
    EXPECT_EQ(L"", SD::make_wstring(""));
    EXPECT_EQ("", SD::make_string(L""));
}

TEST(StringConversion, HighBytesKeepTheirValue) {
    std::wstring const wide = SD::make_wstring("caf\xE9");
    ASSERT_EQ(4u, wide.size());
    EXPECT_EQ(static_cast<wchar_t>(0xE9), wide[3]);
    EXPECT_EQ("caf\xE9", SD::make_string(wide));
}

TEST(StringConversion, EveryByteSurvivesRoundTrip) {
    std::string bytes;
    for (int value = 0; value < 256; ++value) {
        bytes += static_cast<char>(value);
    }
    std::wstring const wide = SD::make_wstring(bytes);
    ASSERT_EQ(256u, wide.size());
    for (int value = 0; value < 256; ++value) {
        EXPECT_EQ(static_cast<wchar_t>(value), wide[static_cast<size_t>(value)]);
    }
    EXPECT_EQ(bytes, SD::make_string(wide));
}
