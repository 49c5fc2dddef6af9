// SPDX-License-Identifier: Apache-2.0
//
// The audit log: what was changed in this installation, by whom and from where.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

struct AuditEntry {
    int id = 0;  // from 1, never used twice; a later entry has a higher one
    std::int64_t time_s = 0;
    int user_id = 0;           // 0: the command line
    std::string who = {};      // as the account was called then
    std::string address = {};  // empty for the command line
    std::string action = {};   // "camera.add"
    std::string object = {};   // "Gate (3)"
    std::string before = {};   // JSON without secrets; empty where there was nothing
    std::string after = {};    // likewise; empty where nothing is left

    friend bool operator==(const AuditEntry&, const AuditEntry&) = default;
};

// Keeps the newest entries only, so that it cannot fill the store.
class AuditLog {
  public:
    static constexpr int kMaxEntries = 100'000;

    // The store must outlive this object.
    explicit AuditLog(Store& store, int max_entries = kMaxEntries)
        : connection_(store.connection()),
          max_entries_(max_entries) {}

    // Stores the entry under a new id, which it returns; entry.id is ignored.
    int Add(AuditEntry entry);
    // The entries before that one, newest first; before_id 0: from the newest on.
    std::vector<AuditEntry> List(int before_id, int limit);

  private:
    Connection& connection_;
    const int max_entries_;
};

}  // namespace lookhaven::store
