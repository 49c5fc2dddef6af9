// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/preferences.h"

#include "standalone/store/user_row.h"

namespace lookhaven::store {

namespace {

std::string TextOf(soci::session& sql, int user_id) {
    return FetchOne<std::string>(sql, "select value from preferences where user_id = :user", user_id).value_or("");
}

}  // namespace

std::string Preferences::Find(int user_id) {
    return connection_.Read([user_id](soci::session& sql) { return TextOf(sql, user_id); });
}

void Preferences::Change(int user_id, const std::function<std::string(const std::string&)>& change) {
    if (const std::string known = Find(user_id); !known.empty() && change(known) == known) {
        return;  // locks nothing: every account may ask for it, as often as it likes
    }
    connection_.Write(
        [&](soci::session& sql) {
            RequireUser(sql, user_id);  // and no one else changes them until the end
            Execute(sql,
                    "insert into preferences (user_id, value) values (:user, :value)"
                    " on conflict (user_id) do update set value = excluded.value",
                    user_id, change(TextOf(sql, user_id)));
        },
        Durability::kLazy);
}

}  // namespace lookhaven::store
