// SPDX-License-Identifier: Apache-2.0
//
// Access tokens: secrets with which an analytics box or a POS terminal reports marks, without an account.
//
// Why so        A device keeps its secret for years, where others may find it. So it opens nothing but what the device
//               does, and a copy of the store lets nobody report, since it holds only a hash of the secret.
// Invariants    (1) A secret is given out once, by Add.
//               (2) A token changes in nothing but its last use, and loses the cameras that are removed.
#pragma once

#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "standalone/store/marks.h"
#include "standalone/store/store.h"

namespace lookhaven::store {

struct AccessToken {
    int id = 0;                // from 1, never used twice
    std::string name;          // UTF-8, 1 to 64 bytes, no other token's
    std::set<int> camera_ids;  // at which it may report
    bool may_alert = false;
    bool may_pos = false;
    std::int64_t created_s = 0;
    std::string creator;          // as the account was called then
    std::int64_t last_use_s = 0;  // to the minute; 0: not used yet
    std::int64_t expires_s = 0;   // 0: never

    bool MayReport(MarkKind kind) const { return kind == MarkKind::kAlert ? may_alert : may_pos; }
    bool IsExpired(std::int64_t now_s) const { return expires_s != 0 && expires_s <= now_s; }
    // As whom it reports. Its number is no account's.
    Reporter AsReporter() const { return {-id, "token " + name}; }
};

class AccessTokens {
  public:
    // The store must outlive this object.
    explicit AccessTokens(Store& store) : store_(store), connection_(store.connection()) {}

    static constexpr int kMaxTokens = 500;
    // With which every secret begins: by it people, and programs that look for leaked secrets, know one.
    static constexpr std::string_view kPrefix = "lht_";

    struct Added {
        int id = 0;
        std::string secret;
    };
    // Stores the token under a new id, not used yet. Throws InvalidRecord, AlreadyExists, or NotFound for an unknown
    // camera.
    Added Add(const AccessToken& token);
    // Throws NotFound.
    void Remove(int id);

    // The token of the secret, whatever bytes that holds, and expired ones too.
    std::optional<AccessToken> FindBySecret(std::string_view secret);
    // Whether this store has once given it out; one that is not found then was removed.
    bool WasGiven(std::string_view secret);
    std::optional<AccessToken> Find(int id);
    std::vector<AccessToken> List();  // by id

    // Records that the token is in use. Writes at most once a minute. Throws StoreError at once when another writer has
    // the store.
    void Touch(const AccessToken& token, std::int64_t now_s);

  private:
    Store& store_;
    Connection& connection_;
};

}  // namespace lookhaven::store
