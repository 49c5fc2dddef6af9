// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/session_watcher.h"

#include <algorithm>
#include <chrono>
#include <set>
#include <thread>
#include <utility>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/store/marks.h"
#include "standalone/store/servers.h"
#include "standalone/store/sessions.h"

namespace lookhaven::api {

namespace {

constexpr std::chrono::milliseconds kPeriod{500};
constexpr std::int64_t kPurgePeriodSeconds = 3600;
constexpr std::int64_t kMinPurgePauseSeconds = 60;  // after a failure

void Look(store::Store& records, control::SlotTable& slots, std::int64_t now_s) {
    if (const std::set<std::string> running = slots.Sessions(); !running.empty()) {
        for (const std::string& ended : store::Sessions(records).EndedAmong({running.begin(), running.end()}, now_s)) {
            slots.EndSession(ended);
        }
    }
    if (const std::set<std::uint64_t> running = slots.Pairings(); !running.empty()) {
        const std::set<std::uint64_t> valid = store::RecordingServers(records).Pairings();
        for (const std::uint64_t pairing : running) {
            if (!valid.contains(pairing)) {
                slots.EndPairing(pairing);
            }
        }
    }
}

// False when it failed. That must not end the watch: an expired session opens nothing, purged or not.
bool TryToPurge(store::Store& records, std::int64_t now_s) {
    try {
        store::Sessions(records).PurgeExpired(now_s);
        return true;
    } catch (const store::StoreError& error) {
        base::LogWarning(std::string("cannot remove expired sessions: ") + error.what());
        return false;
    }
}

void Watch(const base::Installation& installation, control::SlotTable& slots, SessionFilter& filter) {
    store::Store records = store::Store::Open(installation.StoreUrl());
    filter.Learn(store::Sessions(records).Key());
    PurgeSchedule purges;
    int newest = 0;
    for (;; std::this_thread::sleep_for(kPeriod)) {
        const std::int64_t now_s = base::WallSeconds();
        Look(records, slots, now_s);
        // Any host of the store, and the command line, may have reported it.
        if (const int id = store::Marks(records).NewestId(); std::exchange(newest, id) != id) {
            slots.NoteReport();
        }
        // The wall clock may be set back by years.
        if (const std::int64_t uptime_s = base::MonotonicMicros() / 1'000'000; purges.IsDue(uptime_s)) {
            purges.NoteAttempt(uptime_s, TryToPurge(records, now_s));
        }
    }
}

}  // namespace

void PurgeSchedule::NoteAttempt(std::int64_t now_s, bool is_purged) {
    pause_s_ = is_purged ? 0 : std::clamp(2 * pause_s_, kMinPurgePauseSeconds, kPurgePeriodSeconds);
    due_s_ = now_s + (is_purged ? kPurgePeriodSeconds : pause_s_);
}

void WatchSessions(const base::Installation& installation, control::SlotTable& slots, SessionFilter& filter) {
    base::SetLogProgram("session-watcher");
    for (std::string last_problem;;) {
        try {
            Watch(installation, slots, filter);
        } catch (const std::exception& error) {
            if (last_problem != error.what()) {
                last_problem = error.what();
                base::LogError("cannot ask which sessions have ended: " + last_problem);
            }
        }
        std::this_thread::sleep_for(kPeriod);
    }
}

}  // namespace lookhaven::api
