// IC::Number: construction, text form and comparison.
#include "IC/Number.h"

#include <cstdio>
#include <cstdlib>
#include <ctime>
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

}  // namespace

Number::Number() : kind_(NONE) {}

Number::Number(bool value) : kind_(BOOL), boolValue_(value) {}

Number::Number(unsigned int value) : kind_(UNSIGNED), unsignedValue_(value) {}

Number::Number(double value) : kind_(DOUBLE), doubleValue_(value) {}

Number::Number(Version2 const& value) : kind_(VERSION), versionValue_(value) {}

Number::Number(KindType kind) : kind_(kind) {
    if (kind == DATETIME) {
        dateTimeValue_ = static_cast<std::int64_t>(std::time(nullptr));
    }
}

std::string Number::toString() const {
    switch (kind_) {
        case BOOL:
            return boolValue_ ? "true" : "false";
        case UNSIGNED:
            return std::to_string(unsignedValue_);
        case DOUBLE:
            return formatDouble(doubleValue_);
        case VERSION:
            return std::to_string(versionValue_.getMajor()) + "." +
                   std::to_string(versionValue_.getMinor());
        case DATETIME:
            return formatDateTime(dateTimeValue_);
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
            return boolValue_ == other.boolValue_;
        case UNSIGNED:
            return unsignedValue_ == other.unsignedValue_;
        case DOUBLE:
            return doubleValue_ == other.doubleValue_;
        case VERSION:
            return versionValue_ == other.versionValue_;
        case DATETIME:
            return dateTimeValue_ == other.dateTimeValue_;
        case NONE:
            break;
    }
    return true;
}

std::ostream& operator<<(std::ostream& out, Number const& number) {
    return out << number.toString();
}

}  // namespace IC
