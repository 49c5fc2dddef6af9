// SPDX-License-Identifier: Apache-2.0
//
// Tables of text, made of the same JSON that --json prints.
#pragma once

#include <span>
#include <string>

#include <json/json.h>

namespace lookhaven::cli {

// Text as it is, numbers in decimal, a list's members divided by blanks.
std::string PlainText(const Json::Value& value);
// The same, but nothing for 0.
std::string TextUnlessZero(const Json::Value& value);

struct Column {
    const char* title;
    const char* member;  // of each entry: "id", "recording.mode"; empty for the entry itself
    std::string (*format)(const Json::Value& member) = PlainText;
};

// A head of titles and a line for each entry.
std::string Table(std::span<const Column> columns, const Json::Value& entries);

}  // namespace lookhaven::cli
