// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/query.h"

namespace lookhaven::store {

namespace {

// "a, b" as ":a, :b".
std::string Placeholders(std::string columns) {
    for (std::size_t at = 0; (at = columns.find(", ", at)) != std::string::npos; at += 3) {
        columns.insert(at + 2, ":");
    }
    return ":" + columns;
}

}  // namespace

int Run(soci::statement& statement) {
    statement.execute(true);
    return static_cast<int>(statement.get_affected_rows());
}

std::string InsertText(const std::string& table, const std::string& columns) {
    return "insert into " + table + " (" + columns + ") values (" + Placeholders(columns) + ")";
}

// Both engines assign lists of two or more columns.
std::string UpdateText(const std::string& table, const std::string& columns) {
    const std::size_t comma = columns.find(", ");
    const std::string key = columns.substr(0, comma);
    const std::string others = columns.substr(comma + 2);
    return "update " + table + " set (" + others + ") = (" + Placeholders(others) + ") where " + key + " = :" + key;
}

}  // namespace lookhaven::store
