// SPDX-License-Identifier: Apache-2.0
//
// Joins numbers into one text, the form in which the platform takes lists of ids.
#pragma once

#include <string>

// The values from first up to last in decimal, separator between them; empty for an empty range.
template <typename Iterator>
std::string Iter2String(Iterator first, Iterator last, const std::string& separator) {
    std::string text;
    for (Iterator value = first; value != last; ++value) {
        if (value != first) {
            text += separator;
        }
        text += std::to_string(*value);
    }
    return text;
}
