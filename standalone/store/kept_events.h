// SPDX-License-Identifier: Apache-2.0
//
// Events that somebody keeps: retention leaves their footage alone until they are released.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <span>
#include <string>

#include "standalone/store/store.h"

namespace lookhaven::store {

constexpr std::size_t kMaxKeepNoteBytes = 500;

// Why an event is kept, and who says so.
struct KeepRecord {
    std::string note;         // one line, may be empty
    std::string keeper;       // the account's name at that time; empty for the command line
    std::int64_t kept_s = 0;  // 0: not known

    friend bool operator==(const KeepRecord&, const KeepRecord&) = default;
};

class KeptEvents {
  public:
    // The store must outlive this object.
    explicit KeptEvents(Store& store) : connection_(store.connection()) {}

    // Keeps or releases those of the events that exist, growing ones too, in one transaction. Returns how many there
    // were: an event that retention is deleting does not count. An event that is kept already gets the new note and
    // keeper. Keep throws InvalidRecord.
    int Keep(std::span<const int> event_ids, const KeepRecord& record);
    int Release(std::span<const int> event_ids);

    // Nothing for an event that is not kept.
    std::optional<KeepRecord> Find(int event_id);
    // By event id, of the kept events with first <= id <= last.
    std::map<int, KeepRecord> FindBetween(int first_event_id, int last_event_id);
    // What kept events take of the mount.
    std::int64_t SizeBytes(int mount_id);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
