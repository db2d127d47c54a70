// Decode tables of the component builders: a constant array of (code,
// value) rows and one lookup, so that each translation from an SMBIOS code
// to the agent's value reads as the table it is.
#pragma once

#include <cstddef>

namespace IC {
namespace decode {

template <typename Value>
struct Row {
    unsigned int code;
    Value value;
};

// The value of the first row whose code matches; `otherwise` when none does.
template <typename Value, std::size_t N>
constexpr Value lookup(Row<Value> const (&rows)[N], unsigned int code, Value otherwise) {
    for (std::size_t i = 0; i < N; ++i) {
        if (rows[i].code == code) {
            return rows[i].value;
        }
    }
    return otherwise;
}

}  // namespace decode
}  // namespace IC
