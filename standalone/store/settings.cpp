// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/settings.h"

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
    const std::string name(key);
    return connection_.Read([&](soci::session& sql) {
        std::string value;
        sql << "select value from settings where name = :name", soci::use(name, "name"), soci::into(value);
        return sql.got_data() ? std::optional(value) : std::nullopt;
    });
}

void Settings::Set(std::string_view key, std::string_view value) {
    if (key.empty() || !IsPlainText(key, kMaxKeyBytes) || !IsPlainText(value, kMaxValueBytes)) {
        throw InvalidRecord("a setting is a name of 1 to 64 bytes and a value, UTF-8 without control characters");
    }
    const std::string name(key);
    const std::string text(value);
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        sql << "insert into settings (name, value) values (:name, :value)"
               " on conflict (name) do update set value = excluded.value",
            soci::use(name, "name"), soci::use(text, "value");
    });
}

std::int64_t Settings::Revision() {
    return connection_.Read([](soci::session& sql) {
        long long revision = 0;
        sql << "select value from counters where name = 'revision'", soci::into(revision);
        return std::int64_t{revision};
    });
}

}  // namespace lookhaven::store
