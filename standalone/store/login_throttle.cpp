// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/login_throttle.h"

#include <string>

#include "standalone/base/text.h"
#include "standalone/store/connection.h"
#include "standalone/store/secret.h"

namespace lookhaven::store {

namespace {

constexpr int kAttempts = 5;
constexpr std::int64_t kWindowS = 60;

// One key of fixed form out of two texts of any form and length; names are compared without regard to case.
std::string Origin(std::string_view account, std::string_view address) {
    return Digest(Digest(base::LowerAscii(account)).append(address));
}

}  // namespace

// The window begins with the first attempt, and once more with the fifth: from there on attempts are refused.
int LoginThrottle::Enter(std::string_view account, std::string_view address, std::int64_t now_s) {
    return connection_.Write([&](soci::session& sql) {
        Execute(sql, "delete from login_attempts where since <= :over or since > :now", now_s - kWindowS, now_s);
        const auto [attempts, since_s] =
            FetchOne<std::pair<int, std::int64_t>>(
                sql,
                "insert into login_attempts (origin, attempts, since) values (:origin, 1, :now)"
                " on conflict (origin) do update set attempts = login_attempts.attempts + 1,"
                " since = case when login_attempts.attempts + 1 = :limit then excluded.since"
                " else login_attempts.since end returning attempts, since",
                Origin(account, address), now_s, kAttempts)
                .value();
        return attempts <= kAttempts ? 0 : static_cast<int>(since_s + kWindowS - now_s);
    });
}

int LoginThrottle::Wait(std::string_view account, std::string_view address, std::int64_t now_s) {
    return connection_
        .FetchOne<int>("select since + :window - :now from login_attempts where origin = :origin"
                       " and attempts >= :limit and since > :over and since <= :at",
                       kWindowS, now_s, Origin(account, address), kAttempts, now_s - kWindowS, now_s)
        .value_or(0);
}

void LoginThrottle::Clear(std::string_view account, std::string_view address) {
    connection_.Execute("delete from login_attempts where origin = :origin", Origin(account, address));
}

}  // namespace lookhaven::store
