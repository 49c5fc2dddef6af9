// SPDX-License-Identifier: Apache-2.0
//
// Logins: a secret that the browser keeps in its cookie, and a public handle that names the session everywhere else.
//
// Why so        The handle becomes part of file names and log lines, so it must open nothing; and a copy of the store
//               must not log anybody in, so it holds only a hash of the secret. A keyed tag in the secret lets who
//               has no store tell a forged one at the cost of a hash.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "standalone/store/store.h"
#include "standalone/store/users.h"

namespace lookhaven::store {

// A session ends when it was not used for idle_s, and in any case absolute_s after the login.
struct SessionLifetime {
    std::int64_t idle_s = std::int64_t{12} * 3600;
    std::int64_t absolute_s = std::int64_t{7} * 86400;
};

struct NewSession {
    std::string secret;  // 64 hex digits, the last of them a tag; given out once, here
    std::string handle;  // 32 hex digits
};

struct Session {
    std::string handle;
    User user;
    std::int64_t created_s = 0;
    std::int64_t last_seen_s = 0;  // to the minute
    std::int64_t expires_s = 0;
    std::string address;  // where the log-in came from; empty where that is not known
};

class Sessions {
  public:
    // The store must outlive this object.
    explicit Sessions(Store& store, SessionLifetime lifetime = {})
        : connection_(store.connection()),
          lifetime_(lifetime) {}

    // A user has at most that many sessions: the oldest end.
    static constexpr int kMaxPerUser = 64;
    static constexpr std::size_t kKeyDigits = 64;

    // Throws NotFound for an unknown user.
    NewSession Create(int user_id, std::int64_t now_s, std::string_view address = {});
    // The same at a log-in. Throws NotFound too when the password has changed since it was checked, for that change
    // could not end a session that did not exist yet.
    NewSession Create(const VerifiedUser& user, std::int64_t now_s, std::string_view address = {});

    // False for what cannot be a session's secret, without asking the store. With the key, of Key(), only what the
    // store has once given out can be one.
    static bool MayBeSecret(std::string_view text);
    static bool MayBeSecret(std::string_view text, std::string_view key);
    // The live session of the cookie, whatever bytes the cookie holds; nothing when unknown or expired. One query.
    std::optional<Session> FindBySecret(std::string_view secret, std::int64_t now_s);

    // Records that the session is in use and postpones its end. Writes at most once a minute; true when it wrote.
    // Throws StoreError at once when another writer has the store: the next request may touch the session.
    bool Touch(const Session& session, std::int64_t now_s);

    // False when there was no such session.
    bool End(std::string_view handle);
    // Only if it is the user's; false when the user has no such session.
    bool End(int user_id, std::string_view handle);
    // The number of sessions ended; that of the handle stays.
    int EndOfUser(int user_id, std::string_view kept = {});

    // The user's live ones, the newest first.
    std::vector<Session> OfUser(int user_id, std::int64_t now_s);
    struct Use {
        int sessions = 0;  // live ones
        std::int64_t last_s = 0;
    };
    std::map<int, Use> Uses(std::int64_t now_s);  // by user

    // Those of the handles whose session is over: unknown, expired or ended. One query.
    std::vector<std::string> EndedAmong(const std::vector<std::string>& handles, std::int64_t now_s);

    // The number of rows deleted. Does not wait for other writers, either.
    int PurgeExpired(std::int64_t now_s);

    // With which the secrets of this store's sessions are tagged; made by Store::Migrate, and stays.
    std::string Key();

  private:
    // password_hash: null when it does not matter.
    NewSession Insert(int user_id, const std::string* password_hash, std::int64_t now_s, std::string_view address);

    Connection& connection_;
    SessionLifetime lifetime_;
};

}  // namespace lookhaven::store
