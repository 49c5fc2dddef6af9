// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/camera_lease_keeper.h"

#include <algorithm>
#include <cstdlib>
#include <string>
#include <thread>
#include <utility>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/base/version.h"

namespace lookhaven::recorder {

namespace {

std::int64_t HeartbeatOf(const std::vector<store::Host>& hosts, int id) {
    const auto host = std::ranges::find(hosts, id, &store::Host::id);
    return host == hosts.end() ? -1 : host->heartbeat;
}

}  // namespace

CameraLeaseKeeper::CameraLeaseKeeper(const base::Installation& installation, const EventRowQueue& rows,
                                     std::int64_t offline_us)
    : installation_(installation),
      rows_(rows),
      own_(installation.HostId()),
      offline_us_(offline_us),
      watch_(offline_us),
      thread_(installation.StoreUrl(), "share the cameras with the other hosts",
              [this](store::Store& store, const std::stop_token&) { Work(store); }) {}

void CameraLeaseKeeper::Ask(store::HostRoom room, const std::map<int, std::uint64_t>& received) {
    const std::int64_t now_us = base::MonotonicMicros();
    room_ = room;
    if (room != store::HostRoom::kNone) {
        no_room_since_us_ = 0;
    } else if (no_room_since_us_ == 0) {
        no_room_since_us_ = now_us;
    }
    {
        const std::lock_guard lock(mutex_);
        rates_.Note(received, now_us);
    }
    thread_.Ask();
}

std::set<int> CameraLeaseKeeper::Held() const {
    const std::lock_guard lock(mutex_);
    seen_ = published_;
    return held_;
}

bool CameraLeaseKeeper::IsHeldElsewhere(int camera) const {
    const std::lock_guard lock(mutex_);
    return !held_elsewhere_ || held_elsewhere_->contains(camera);
}

std::optional<int> CameraLeaseKeeper::OtherHolder(int camera) const {
    const std::lock_guard lock(mutex_);
    if (!held_elsewhere_) {
        return std::nullopt;
    }
    const auto found = held_elsewhere_->find(camera);
    const bool is_elsewhere =
        found != held_elsewhere_->end() && !held_.contains(camera);  // it may just have been taken
    return is_elsewhere ? found->second : 0;
}

void CameraLeaseKeeper::NoteRecorded(std::set<int> cameras) {
    const std::lock_guard lock(mutex_);
    recorded_ = std::move(cameras);
    noted_ = seen_;
}

void CameraLeaseKeeper::Work(store::Store& store) {
    store::Hosts hosts(store);
    const std::vector<store::Host> all = hosts.All();
    const std::vector<AssignedHost> watched = Observe(all);
    store::CameraLeases leases(store);
    const std::vector<store::CameraLease> cameras = leases.List();
    NoteHolders(cameras);  // first: live views need it of a store that can only be read as well
    if (rows_.IsRefused()) {
        Publish({});
        return;
    }
    if (!rows_.FirstReservedId()) {
        return;
    }
    hosts.Report({.id = own_,
                  .version = base::kVersion,
                  .room = room_,
                  .processors = static_cast<int>(std::thread::hardware_concurrency())});
    const Assignment assignment = Assign(own_, watched, cameras);
    std::set<int> held;
    for (const store::CameraLease& camera : cameras) {
        if (camera.host_id == own_ && std::ranges::find(assignment.give, camera.camera_id) == assignment.give.end()) {
            held.insert(camera.camera_id);
        }
    }
    Publish(held);
    for (const int camera : assignment.give) {
        if (HasEnded(camera)) {
            leases.Release(camera, own_);
            base::LogInfo("has given up camera " + std::to_string(camera));
        }
    }
    for (const store::CameraLease& camera : assignment.take) {
        if (leases.Take(camera, own_, HeartbeatOf(all, camera.host_id))) {
            held.insert(camera.camera_id);
            base::LogInfo(
                "has taken camera " + std::to_string(camera.camera_id) +
                (camera.host_id == 0 ? "" : " from host " + std::to_string(camera.host_id) + ", which is offline"));
        }
    }
    Publish(std::move(held));
    Report(watched, cameras);
    // Last, since whether it can be stored decides nothing now.
    if (const auto changed = ChangedRates(cameras); !changed.empty()) {
        leases.SetRates(own_, changed);
    }
}

std::vector<AssignedHost> CameraLeaseKeeper::Observe(const std::vector<store::Host>& all) {
    watch_.Observe(all, base::MonotonicMicros());
    std::vector<AssignedHost> hosts;
    for (const store::Host& host : all) {
        const bool is_online = host.id == own_ || watch_.IsOnline(host.id);
        const bool runs = host.id == own_ || (is_online && !host.recorder.empty());
        const store::HostRoom room = host.id == own_ ? room_.load() : host.room;
        // Not at once: its mounts may not have been looked at yet, or be back in a moment.
        const std::int64_t since_us = no_room_since_us_;
        const bool lacks_room = host.id == own_ && since_us != 0 && base::MonotonicMicros() - since_us > offline_us_;
        hosts.push_back({.id = host.id,
                         .is_online = is_online,
                         .runs = runs,
                         .takes = runs && room != store::HostRoom::kNone && !host.draining,
                         .gives = host.draining || lacks_room,
                         .is_full = room == store::HostRoom::kFull,
                         .processors = host.processors});
    }
    return hosts;
}

void CameraLeaseKeeper::Publish(std::set<int> held) {
    const std::lock_guard lock(mutex_);
    if (held != held_) {
        held_ = std::move(held);
        ++published_;
    }
}

// Those that differ by more than a quarter from what the store has: there is no need to change a row for less.
std::map<int, std::int64_t> CameraLeaseKeeper::ChangedRates(const std::vector<store::CameraLease>& cameras) const {
    std::map<int, std::int64_t> changed;
    const std::lock_guard lock(mutex_);
    for (const store::CameraLease& camera : cameras) {
        const auto rate = rates_.BytesPerSecond().find(camera.camera_id);
        if (camera.host_id == own_ && rate != rates_.BytesPerSecond().end() &&
            std::abs(rate->second - camera.bytes_per_second) > camera.bytes_per_second / 4) {
            changed.insert(*rate);
        }
    }
    return changed;
}

void CameraLeaseKeeper::NoteHolders(const std::vector<store::CameraLease>& cameras) {
    std::map<int, int> elsewhere;
    for (const store::CameraLease& camera : cameras) {
        if (camera.host_id != 0 && camera.host_id != own_) {
            elsewhere.emplace(camera.camera_id, camera.host_id);
        }
    }
    const std::lock_guard lock(mutex_);
    held_elsewhere_ = std::move(elsewhere);
}

bool CameraLeaseKeeper::HasEnded(int camera) const {
    {
        const std::lock_guard lock(mutex_);
        if (noted_ != published_ || recorded_.contains(camera)) {
            return false;
        }
    }
    return !rows_.HasUnstored(camera);
}

void CameraLeaseKeeper::Report(const std::vector<AssignedHost>& hosts, const std::vector<store::CameraLease>& cameras) {
    std::vector<maintenance::HostStatus> states;
    for (const AssignedHost& host : hosts) {
        const auto count = std::ranges::count(cameras, host.id, &store::CameraLease::host_id);
        states.push_back({host.id,
                          host.id == own_  ? maintenance::HostState::kLocal
                          : host.is_online ? maintenance::HostState::kOnline
                                           : maintenance::HostState::kOffline,
                          static_cast<int>(count)});
    }
    if (states != reported_) {
        maintenance::WriteHostStatus(installation_, states);
        reported_ = std::move(states);
    }
}

}  // namespace lookhaven::recorder
