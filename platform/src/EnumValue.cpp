// IC::EnumValue: text form.
#include "IC/EnumValue.h"

#include <ostream>

namespace IC {

std::string EnumValue::toString() const { return std::to_string(value_); }

std::ostream& operator<<(std::ostream& out, EnumValue const& value) {
    return out << value.toString();
}

}  // namespace IC
