// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/metrics_text.h"

#include <array>
#include <charconv>

namespace lookhaven::api {

namespace {

std::string Escaped(std::string_view text) {
    std::string escaped;
    for (const char c : text) {
        if (c == '\\' || c == '"') {
            escaped += '\\';
        }
        escaped += c == '\n' ? std::string("\\n") : std::string(1, c);
    }
    return escaped;
}

}  // namespace

void MetricsText::Family(std::string_view name, std::string_view type, std::string_view help) {
    family_ = name;
    text_.append("# HELP ").append(name).append(" ").append(help).append("\n");
    text_.append("# TYPE ").append(name).append(" ").append(type).append("\n");
}

void MetricsText::Sample(double value, Labels labels, std::string_view suffix) {
    text_.append(family_).append(suffix);
    char open = '{';
    for (const auto& [name, text] : labels) {
        text_.append(1, open).append(name).append("=\"").append(Escaped(text)).append("\"");
        open = ',';
    }
    std::array<char, 32> digits{};
    const char* const end = std::to_chars(digits.data(), digits.data() + digits.size(), value).ptr;
    text_.append(open == ',' ? "} " : " ")
        .append(digits.data(), static_cast<std::size_t>(end - digits.data()))
        .append("\n");
}

}  // namespace lookhaven::api
