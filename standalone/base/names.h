// SPDX-License-Identifier: Apache-2.0
//
// Words for values: what people and programs write for them.
#pragma once

#include <map>
#include <string>

namespace lookhaven::base {

template <typename Value>
using Names = std::map<std::string, Value>;

// Its number where it has no name.
template <typename Value>
std::string NameOf(const Names<Value>& names, Value value) {
    for (const auto& [name, each] : names) {
        if (each == value) {
            return name;
        }
    }
    return std::to_string(static_cast<int>(value));
}

}  // namespace lookhaven::base
