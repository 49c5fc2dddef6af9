// SPDX-License-Identifier: Apache-2.0
#include "standalone/binding/compact_json.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <string_view>

namespace lookhaven::binding {

namespace {

constexpr int kAllDigits = 17;  // as many as any double needs

void AppendInteger(std::string& text, auto number) {
    std::array<char, 24> digits;
    text.append(digits.data(), std::to_chars(digits.data(), digits.data() + digits.size(), number).ptr);
}

// What JSON has no number for becomes null or a number that readers take for infinite.
void AppendReal(std::string& text, double real) {
    if (!std::isfinite(real)) {
        text += std::isnan(real) ? "null" : real < 0 ? "-1e+9999" : "1e+9999";
        return;
    }
    std::array<char, 32> digits;
    const char* end =
        std::to_chars(digits.data(), digits.data() + digits.size(), real, std::chars_format::general, kAllDigits).ptr;
    const std::string_view written(digits.data(), static_cast<std::size_t>(end - digits.data()));
    text += written;
    if (written.find_first_of(".e") == written.npos) {
        text += ".0";  // stays a real number for who reads it
    }
}

void AppendEscaped(std::string& text, char c) {
    constexpr std::string_view kEscaped = "\"\\\b\f\n\r\t";
    constexpr std::string_view kLetters = "\"\\bfnrt";
    constexpr std::string_view kHex = "0123456789abcdef";
    text += '\\';
    if (const std::size_t found = kEscaped.find(c); found != kEscaped.npos) {
        text += kLetters[found];
    } else {
        text += "u00";
        text += kHex[static_cast<unsigned char>(c) >> 4];
        text += kHex[static_cast<unsigned char>(c) & 15];
    }
}

void AppendString(std::string& text, const char* begin, const char* end) {
    const auto must_be_escaped = [](char c) { return static_cast<unsigned char>(c) < ' ' || c == '"' || c == '\\'; };
    text += '"';
    for (const char* plain = begin;; ++begin) {
        begin = std::find_if(begin, end, must_be_escaped);
        text.append(plain, begin);
        if (begin == end) {
            break;
        }
        AppendEscaped(text, *begin);
        plain = begin + 1;
    }
    text += '"';
}

// An array may lack elements before its last: they are null.
void AppendArray(std::string& text, const Json::Value& array) {
    text += '[';
    Json::ArrayIndex next = 0;
    for (auto element = array.begin(); element != array.end(); ++element, ++next) {
        for (; next < element.index(); ++next) {
            text += next > 0 ? ",null" : "null";
        }
        if (next > 0) {
            text += ',';
        }
        AppendCompactJson(text, *element);
    }
    text += ']';
}

void AppendObject(std::string& text, const Json::Value& object) {
    text += '{';
    for (auto member = object.begin(); member != object.end(); ++member) {
        if (member != object.begin()) {
            text += ',';
        }
        const char* end = nullptr;
        const char* name = member.memberName(&end);
        AppendString(text, name, end);
        text += ':';
        AppendCompactJson(text, *member);
    }
    text += '}';
}

}  // namespace

void AppendCompactJson(std::string& text, const Json::Value& value) {
    switch (value.type()) {
    case Json::nullValue:
        text += "null";
        break;
    case Json::intValue:
        AppendInteger(text, value.asLargestInt());
        break;
    case Json::uintValue:
        AppendInteger(text, value.asLargestUInt());
        break;
    case Json::realValue:
        AppendReal(text, value.asDouble());
        break;
    case Json::stringValue: {
        const char* begin = nullptr;
        const char* end = nullptr;
        value.getString(&begin, &end);
        AppendString(text, begin, end);
        break;
    }
    case Json::booleanValue:
        text += value.asBool() ? "true" : "false";
        break;
    case Json::arrayValue:
        AppendArray(text, value);
        break;
    case Json::objectValue:
        AppendObject(text, value);
        break;
    }
}

}  // namespace lookhaven::binding
