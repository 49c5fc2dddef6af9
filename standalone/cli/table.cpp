// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/table.h"

#include <algorithm>
#include <string_view>
#include <vector>

namespace lookhaven::cli {

namespace {

// How many columns of a terminal the text takes, for the scripts that most camera names are written in.
std::size_t Width(std::string_view text) {
    return static_cast<std::size_t>(
        std::count_if(text.begin(), text.end(), [](char c) { return (static_cast<unsigned char>(c) >> 6) != 2; }));
}

}  // namespace

std::string PlainText(const Json::Value& value) {
    if (!value.isArray()) {
        return value.asString();
    }
    std::string text;
    for (const Json::Value& each : value) {
        text += (text.empty() ? "" : " ") + PlainText(each);
    }
    return text;
}

std::string TextUnlessZero(const Json::Value& value) {
    return value.asInt64() == 0 ? "" : PlainText(value);
}

std::string Table(std::span<const Column> columns, const Json::Value& entries) {
    std::vector<std::string> lines(entries.size() + 1);
    for (const Column& column : columns) {
        std::vector<std::string> cells = {column.title};
        const Json::Path path(column.member);
        for (const Json::Value& entry : entries) {
            cells.push_back(column.format(path.resolve(entry)));
        }
        std::size_t width = 0;
        for (const std::string& cell : cells) {
            width = std::max(width, Width(cell));
        }
        const bool last = &column == &columns.back();
        for (std::size_t i = 0; i < lines.size(); ++i) {
            lines[i] += cells[i] + (last ? "\n" : std::string(width - Width(cells[i]) + 2, ' '));
        }
    }
    std::string text;
    for (const std::string& line : lines) {
        text += line;
    }
    return text;
}

}  // namespace lookhaven::cli
