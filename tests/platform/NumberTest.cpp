// IC::Number: kinds, values, text form and comparison.
#include <gtest/gtest.h>

#include <cmath>
#include <ctime>
#include <iostream>
#include <regex>
#include <sstream>
#include <thread>
#include <vector>

#include "IC/Number.h"

using IC::Number;
using IC::Version2;

TEST(Number, DefaultHasNoValueAndEmptyText) {
    Number number;
    EXPECT_EQ(Number::NONE, number.getKind());
    EXPECT_EQ("", number.toString());
    EXPECT_EQ(Number(), number);
}

TEST(Number, BoolKeepsValueAndPrintsTrueFalse) {
    EXPECT_EQ(Number::BOOL, Number(true).getKind());
    EXPECT_TRUE(Number(true).getBool());
    EXPECT_FALSE(Number(false).getBool());
    EXPECT_EQ("true", Number(true).toString());
    EXPECT_EQ("false", Number(false).toString());
}

TEST(Number, UnsignedKeepsFullRangeInDecimal) {
    Number number(4294967295u);
    EXPECT_EQ(Number::UNSIGNED, number.getKind());
    EXPECT_EQ(4294967295u, number.getUnsigned());
    EXPECT_EQ("4294967295", number.toString());
    EXPECT_EQ("0", Number(0u).toString());
}

TEST(Number, DoublePrintsShortestForm) {
    EXPECT_EQ(Number::DOUBLE, Number(1.5).getKind());
    EXPECT_DOUBLE_EQ(1.5, Number(1.5).getDouble());
    EXPECT_EQ("5", Number(5.0).toString());
    EXPECT_EQ("-2", Number(-2.0).toString());
    EXPECT_EQ("250", Number(250.0).toString());
    EXPECT_EQ("3276.8", Number(3276.8).toString());
    EXPECT_EQ("0.1", Number(0.1).toString());
    EXPECT_EQ("1.05", Number(1.05).toString());
}

TEST(Number, DoubleTextReadsBackAsTheSameValue) {
    double const values[] = {1.0 / 3.0, 2.0 / 3.0, 123456789.123456789, 1e-300, 6.02214076e23};
    for (double value : values) {
        EXPECT_EQ(value, std::stod(Number(value).toString())) << Number(value).toString();
    }
}

TEST(Number, VersionPrintsMajorDotMinor) {
    Number number(Version2(2, 7));
    EXPECT_EQ(Number::VERSION, number.getKind());
    EXPECT_EQ(2u, number.getVersion().getMajor());
    EXPECT_EQ(7u, number.getVersion().getMinor());
    EXPECT_EQ("2.7", number.toString());
    EXPECT_EQ("3.10", Number(Version2(3, 10)).toString());
}

TEST(Number, KindConstructorMakesZeroValueOfThatKind) {
    EXPECT_EQ(Number(false), Number(Number::BOOL));
    EXPECT_EQ(Number(0u), Number(Number::UNSIGNED));
    EXPECT_EQ(Number(0.0), Number(Number::DOUBLE));
    EXPECT_EQ(Number(Version2(0, 0)), Number(Number::VERSION));
    EXPECT_EQ(Number(), Number(Number::NONE));
    EXPECT_EQ("0", Number(Number::UNSIGNED).toString());
    EXPECT_EQ("0.0", Number(Number::VERSION).toString());
}

TEST(Number, DateTimeTakesCurrentTime) {
    std::int64_t const before = static_cast<std::int64_t>(std::time(nullptr));
    Number number(Number::DATETIME);
    std::int64_t const after = static_cast<std::int64_t>(std::time(nullptr));
    EXPECT_EQ(Number::DATETIME, number.getKind());
    EXPECT_GE(number.getDateTime(), before);
    EXPECT_LE(number.getDateTime(), after);
}

TEST(Number, DateTimePrintsUtcDateAndTime) {
    Number number(Number::DATETIME);
    std::string const text = number.toString();
    EXPECT_TRUE(std::regex_match(text, std::regex(R"(\d{4}-\d{2}-\d{2} \d{2}:\d{2}:\d{2})")))
        << text;
    std::time_t const seconds = static_cast<std::time_t>(number.getDateTime());
    std::tm parts{};
    ASSERT_NE(nullptr, gmtime_r(&seconds, &parts));
    char expected[32];
    std::strftime(expected, sizeof expected, "%Y-%m-%d %H:%M:%S", &parts);
    EXPECT_EQ(expected, text);
}

TEST(Number, DateTimesMadeASecondApartDiffer) {
    Number first(Number::DATETIME);
    std::this_thread::sleep_for(std::chrono::milliseconds(1100));
    Number second(Number::DATETIME);
    EXPECT_GT(second.getDateTime(), first.getDateTime());
    EXPECT_NE(first, second);
    EXPECT_NE(first.toString(), second.toString());
}

TEST(Number, EqualityComparesKindAndValue) {
    EXPECT_EQ(Number(5u), Number(5u));
    EXPECT_NE(Number(5u), Number(6u));
    EXPECT_NE(Number(5u), Number(5.0));
    EXPECT_NE(Number(true), Number(1u));
    EXPECT_NE(Number(), Number(0u));
    EXPECT_EQ(Number(Version2(1, 2)), Number(Version2(1, 2)));
    EXPECT_NE(Number(Version2(1, 2)), Number(Version2(1, 3)));
    EXPECT_FALSE(Number(2.5) != Number(2.5));
}

TEST(Number, StreamWritesText) {
    std::ostringstream out;
    out << Number(42u) << "|" << Number(true) << "|" << Number(3276.8) << "|" << Number();
    EXPECT_EQ("42|true|3276.8|", out.str());
}

namespace {

// One number of every kind, each with a value other than its zero.
std::vector<Number> everyKind() {
    return {Number(),
            Number(true),
            Number(4000000000u),
            Number(-2.5),
            Number(Version2(7, 12)),
            Number(Number::DATETIME),
            Number(static_cast<Number::KindType>(7))};
}

}  // namespace

TEST(Number, GettersOfAnotherKindGiveThatKindsZero) {
    for (Number const& number : everyKind()) {
        SCOPED_TRACE(number.getKind());
        if (number.getKind() != Number::BOOL) {
            EXPECT_FALSE(number.getBool());
        }
        if (number.getKind() != Number::UNSIGNED) {
            EXPECT_EQ(0u, number.getUnsigned());
        }
        if (number.getKind() != Number::DOUBLE) {
            EXPECT_EQ(0.0, number.getDouble());
        }
        if (number.getKind() != Number::VERSION) {
            EXPECT_EQ(Version2(), number.getVersion());
        }
        if (number.getKind() != Number::DATETIME) {
            EXPECT_EQ(0, number.getDateTime());
        }
    }
    EXPECT_TRUE(Number(true).getBool());
    EXPECT_EQ(4000000000u, Number(4000000000u).getUnsigned());
    EXPECT_EQ(-2.5, Number(-2.5).getDouble());
    EXPECT_EQ(Version2(7, 12), Number(Version2(7, 12)).getVersion());
    EXPECT_GT(Number(Number::DATETIME).getDateTime(), 0);
}

TEST(Number, VersionOfAnotherKindOutlivesTheNumber) {
    Version2 const* version = nullptr;
    {
        Number const number(3u);
        version = &number.getVersion();
    }
    EXPECT_EQ(0u, version->getMajor());
    EXPECT_EQ(0u, version->getMinor());
}

TEST(Number, KindConstructorGivesZeroThroughEveryGetter) {
    EXPECT_FALSE(Number(Number::BOOL).getBool());
    EXPECT_EQ(0u, Number(Number::UNSIGNED).getUnsigned());
    EXPECT_EQ(0.0, Number(Number::DOUBLE).getDouble());
    EXPECT_EQ("0", Number(Number::DOUBLE).toString());
    EXPECT_EQ(Version2(), Number(Number::VERSION).getVersion());
    Number const unlisted(static_cast<Number::KindType>(7));
    EXPECT_EQ(7, static_cast<int>(unlisted.getKind()));
    EXPECT_EQ("", unlisted.toString());
    EXPECT_EQ(Number(static_cast<Number::KindType>(7)), unlisted);
    EXPECT_NE(Number(), unlisted);
}

TEST(Number, CopiesAndAssignmentsKeepKindAndValue) {
    std::vector<Number> const numbers = everyKind();
    for (Number const& source : numbers) {
        Number const copy(source);
        EXPECT_EQ(source, copy);
        EXPECT_EQ(source.toString(), copy.toString());
        for (Number const& before : numbers) {
            Number target(before);
            target = source;
            EXPECT_EQ(source.getKind(), target.getKind());
            EXPECT_EQ(source, target);
            EXPECT_EQ(source.toString(), target.toString());
        }
        Number self(source);
        Number const& alias = self;
        self = alias;
        EXPECT_EQ(source, self);
    }
}

TEST(Number, EqualityNeverHoldsAcrossKinds) {
    std::vector<Number> const numbers = everyKind();
    for (size_t i = 0; i < numbers.size(); ++i) {
        for (size_t j = 0; j < numbers.size(); ++j) {
            EXPECT_EQ(i == j, numbers[i] == numbers[j]) << i << " " << j;
        }
    }
    // Zero values of different kinds differ too.
    EXPECT_NE(Number(false), Number(0u));
    EXPECT_NE(Number(0u), Number(0.0));
    EXPECT_NE(Number(0.0), Number(Version2()));
    EXPECT_NE(Number(Number::DATETIME), Number(0u));
}

TEST(Number, DoublesCompareAsValues) {
    EXPECT_EQ(Number(0.0), Number(-0.0));
    EXPECT_EQ("-0", Number(-0.0).toString());
    double const notANumber = std::nan("");
    EXPECT_NE(Number(notANumber), Number(notANumber));
    EXPECT_EQ(1.0 / 3.0, Number(1.0 / 3.0).getDouble());
}

TEST(Number, IsTwelveBytes) {
    std::cout << "sizeof(IC::Number) = " << sizeof(Number) << "\n";
    EXPECT_EQ(12u, sizeof(Number));
}
