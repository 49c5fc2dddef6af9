// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/login_throttle.h"

#include <algorithm>
#include <string>

#include "standalone/store/connection.h"
#include "standalone/store/secret.h"

namespace lookhaven::store {

namespace {

constexpr int kAttempts = 5;
constexpr long long kWindowS = 60;

// One key of fixed form out of two texts of any form and length; names are told apart without regard to case.
std::string Origin(std::string_view account, std::string_view address) {
    std::string text(account);
    std::transform(text.begin(), text.end(), text.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
    return Digest(Digest(text).append(address));
}

}  // namespace

// The window begins with the first attempt, and once more with the fifth: from there on it is the bar.
int LoginThrottle::Enter(std::string_view account, std::string_view address, std::int64_t now_s) {
    const std::string origin = Origin(account, address);
    const long long now = now_s;
    return connection_.Write([&](soci::session& sql) {
        sql << "delete from login_attempts where since + :window <= :now or since > :now",
            soci::use(kWindowS, "window"), soci::use(now, "now");
        int attempts = 0;
        long long since = 0;
        sql << "insert into login_attempts (origin, attempts, since) values (:origin, 1, :now)"
               " on conflict (origin) do update set attempts = login_attempts.attempts + 1,"
               " since = case when login_attempts.attempts + 1 = :limit then excluded.since else login_attempts.since "
               "end"
               " returning attempts, since",
            soci::use(origin, "origin"), soci::use(now, "now"), soci::use(kAttempts, "limit"), soci::into(attempts),
            soci::into(since);
        return attempts <= kAttempts ? 0 : static_cast<int>(since + kWindowS - now);
    });
}

void LoginThrottle::Clear(std::string_view account, std::string_view address) {
    const std::string origin = Origin(account, address);
    connection_.Write([&](soci::session& sql) {
        sql << "delete from login_attempts where origin = :origin", soci::use(origin, "origin");
    });
}

}  // namespace lookhaven::store
