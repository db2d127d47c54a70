// IC::Number: construction, text form and comparison.
#include "IC/Number.h"

#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <new>
#include <ostream>

namespace IC {

namespace {

// Days since 1970-01-01 to a proleptic Gregorian calendar date. Done by hand
// rather than with gmtime() so that every 64-bit second count converts the
// same way on 32-bit x86, where time_t is 32 bits wide.
void civilFromDays(std::int64_t days, std::int64_t& year, unsigned int& month, unsigned int& day) {
    days += 719468;  // shift the epoch to 0000-03-01
    std::int64_t const era = (days >= 0 ? days : days - 146096) / 146097;
    std::int64_t const dayOfEra = days - era * 146097;  // [0, 146096]
    std::int64_t const yearOfEra =
        (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;  // [0, 399]
    std::int64_t const dayOfYear =
        dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);  // [0, 365]
    std::int64_t const monthIndex = (5 * dayOfYear + 2) / 153;           // [0, 11], March first
    day = static_cast<unsigned int>(dayOfYear - (153 * monthIndex + 2) / 5 + 1);
    month = static_cast<unsigned int>(monthIndex < 10 ? monthIndex + 3 : monthIndex - 9);
    year = yearOfEra + era * 400 + (month <= 2 ? 1 : 0);
}

std::string formatDateTime(std::int64_t seconds) {
    std::int64_t days = seconds / 86400;
    std::int64_t secondOfDay = seconds % 86400;
    if (secondOfDay < 0) {
        secondOfDay += 86400;
        --days;
    }
    std::int64_t year = 0;
    unsigned int month = 0;
    unsigned int day = 0;
    civilFromDays(days, year, month, day);
    char text[64];
    std::snprintf(text, sizeof text, "%04lld-%02u-%02u %02u:%02u:%02u",
                  static_cast<long long>(year), month, day,
                  static_cast<unsigned int>(secondOfDay / 3600),
                  static_cast<unsigned int>(secondOfDay / 60 % 60),
                  static_cast<unsigned int>(secondOfDay % 60));
    return text;
}

// The shortest of 15 or 17 significant digits that reads back as the same
// value: 15 keeps values such as 3276.8 free of binary noise.
std::string formatDouble(double value) {
    char text[64];
    std::snprintf(text, sizeof text, "%.15g", value);
    if (std::strtod(text, nullptr) != value) {
        std::snprintf(text, sizeof text, "%.17g", value);
    }
    return text;
}

// The version that numbers of other kinds answer with: constant-initialized,
// so it is there before any constructor of another library runs.
Version2 const noVersion{};

}  // namespace

Number::Number() : kind_(NONE), words_{0, 0} {}

Number::Number(bool value) : kind_(BOOL), words_{value ? 1u : 0u, 0} {}

Number::Number(unsigned int value) : kind_(UNSIGNED), words_{value, 0} {}

Number::Number(double value) : kind_(DOUBLE), words_{0, 0} { setWide(value); }

Number::Number(Version2 const& value) : kind_(VERSION), version_(value) {}

Number::Number(KindType kind) : kind_(kind), words_{0, 0} {
    if (kind == VERSION) {
        new (&version_) Version2();
    } else if (kind == DATETIME) {
        setWide(static_cast<std::int64_t>(std::time(nullptr)));
    }
}

Version2 const& Number::getVersion() const { return kind_ == VERSION ? version_ : noVersion; }

std::string Number::toString() const {
    switch (kind_) {
        case BOOL:
            return getBool() ? "true" : "false";
        case UNSIGNED:
            return std::to_string(getUnsigned());
        case DOUBLE:
            return formatDouble(getDouble());
        case VERSION:
            return std::to_string(version_.getMajor()) + "." + std::to_string(version_.getMinor());
        case DATETIME:
            return formatDateTime(getDateTime());
        case NONE:
            break;
    }
    return "";
}

bool Number::operator==(Number const& other) const {
    if (kind_ != other.kind_) {
        return false;
    }
    switch (kind_) {
        case BOOL:
            return getBool() == other.getBool();
        case UNSIGNED:
            return getUnsigned() == other.getUnsigned();
        case DOUBLE:
            // Compared as doubles, not as bits: 0.0 equals -0.0 and a NaN
            // equals nothing.
            return getDouble() == other.getDouble();
        case VERSION:
            return version_ == other.version_;
        case DATETIME:
            return getDateTime() == other.getDateTime();
        case NONE:
            break;
    }
    return true;
}

std::ostream& operator<<(std::ostream& out, Number const& number) {
    return out << number.toString();
}

}  // namespace IC
