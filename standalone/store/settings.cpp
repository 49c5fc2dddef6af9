// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/settings.h"

#include <charconv>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxKeyBytes = 64;
constexpr std::size_t kMaxValueBytes = 65536;

}  // namespace

std::optional<std::string> Settings::Find(std::string_view key) {
    if (!IsPlainText(key, kMaxKeyBytes)) {
        return std::nullopt;
    }
    return connection_.FetchOne<std::string>("select value from settings where name = :name", std::string(key));
}

int Settings::NumberOr(std::string_view key, int fallback) {
    const std::string text = Find(key).value_or("");
    int number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc() && end == text.data() + text.size() ? number : fallback;
}

void Settings::Set(std::string_view key, std::string_view value) {
    if (key.empty() || !IsPlainText(key, kMaxKeyBytes) || !IsPlainText(value, kMaxValueBytes)) {
        throw InvalidRecord("a setting is a name of 1 to 64 bytes and a value, UTF-8 without control characters");
    }
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Execute(sql,
                "insert into settings (name, value) values (:name, :value)"
                " on conflict (name) do update set value = excluded.value",
                std::string(key), std::string(value));
    });
}

std::string Settings::Installation() {
    return connection_.Read([](soci::session& sql) {
        return FetchOne<std::string>(sql, "select value from settings where name = 'installation'").value();
    });
}

std::int64_t Settings::Revision() {
    return connection_.FetchOne<std::int64_t>("select value from counters where name = 'revision'").value();
}

}  // namespace lookhaven::store
