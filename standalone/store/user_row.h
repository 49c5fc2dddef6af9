// SPDX-License-Identifier: Apache-2.0
//
// Statements that several changes of an account share. For this folder's sources.
#pragma once

#include "standalone/store/connection.h"
#include "standalone/store/query.h"

namespace lookhaven::store {

// Throws NotFound. Also locks the row against a concurrent removal, where there are row locks.
inline void RequireUser(soci::session& sql, int id) {
    Require(FetchOne<int>(sql, "update users set privilege = privilege where id = :id returning id", id), "account",
            id);
}

// Ends all sessions of that account.
inline void EndSessions(soci::session& sql, int user_id) {
    Execute(sql, "delete from sessions where user_id = :user", user_id);
}

}  // namespace lookhaven::store
