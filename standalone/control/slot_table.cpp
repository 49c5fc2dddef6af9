// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/slot_table.h"

#include <algorithm>
#include <stdexcept>

#include <sys/eventfd.h>
#include <sys/mman.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/file.h"

namespace lookhaven::control {

namespace {

bool IsPlayerOf(const Slot& slot, std::string_view session) {
    return slot.serial != 0 && slot.player.started_us != 0 && SessionOf(slot) == session;
}

}  // namespace

SlotTable::SlotTable(std::size_t slots) : wake_(::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC)) {
    void* memory = ::mmap(nullptr, slots * sizeof(Slot), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    if (memory == MAP_FAILED || !wake_) {
        base::ThrowErrno("cannot make the table of requests");
    }
    slots_ = {static_cast<Slot*>(memory), slots};
    for (Slot& slot : slots_) {
        new (&slot) Slot{};
    }
}

SlotTable::~SlotTable() {
    ::munmap(slots_.data(), slots_.size_bytes());
}

Slot* SlotTable::Take() {
    const auto slot = std::find_if(slots_.begin(), slots_.end(), [](const Slot& each) { return each.serial == 0; });
    if (slot == slots_.end()) {
        return nullptr;
    }
    slot->is_stream = false;
    slot->has_session = false;
    slot->must_end = false;
    slot->pid = 0;
    slot->player.started_us = 0;
    slot->player.is_excess = false;
    slot->player.pause_requested = false;
    slot->player.paused = false;
    slot->player.resumed_rate = 0;
    slot->serial = ++last_serial_;
    return &*slot;
}

void SlotTable::SetSession(Slot& slot, std::string_view handle) {
    if (handle.size() >= slot.session.size()) {
        throw std::length_error("a session handle is too long");
    }
    slot.session.fill('\0');
    handle.copy(slot.session.data(), handle.size());
    slot.has_session = true;
}

std::size_t SlotTable::OlderRequests(const Slot& slot) const {
    return static_cast<std::size_t>(std::count_if(slots_.begin(), slots_.end(), [&](const Slot& each) {
        const std::uint64_t serial = each.serial;
        return serial != 0 && serial < slot.serial && SessionOf(each) == SessionOf(slot);
    }));
}

std::set<std::string> SlotTable::Sessions() const {
    std::set<std::string> sessions;
    for (const Slot& slot : slots_) {
        if (slot.serial != 0 && slot.has_session && !slot.must_end) {
            sessions.emplace(SessionOf(slot));
        }
    }
    return sessions;
}

void SlotTable::EndSession(std::string_view handle) {
    for (Slot& slot : slots_) {
        if (slot.serial != 0 && SessionOf(slot) == handle) {
            slot.must_end = true;
        }
    }
    Wake();
}

void SlotTable::End(Slot& slot) {
    slot.must_end = true;
    Wake();
}

void SlotTable::BeginPlayer(Slot& slot, std::int64_t key) {
    slot.player.key = key;
    slot.player.started_us = base::MonotonicMicros();
    Wake();
}

Slot* SlotTable::FindPlayer(std::string_view session, std::int64_t key) const {
    Slot* found = nullptr;
    for (Slot& slot : slots_) {
        if (IsPlayerOf(slot, session) && slot.player.key == key &&
            (found == nullptr || slot.player.started_us > found->player.started_us)) {
            found = &slot;
        }
    }
    return found;
}

std::set<std::string> SlotTable::SessionsWithPlayers() const {
    std::set<std::string> sessions;
    for (const Slot& slot : slots_) {
        if (slot.serial != 0 && slot.player.started_us != 0) {
            sessions.emplace(SessionOf(slot));
        }
    }
    return sessions;
}

std::vector<Slot*> SlotTable::ExcessPlayers(std::string_view session, pid_t newest) const {
    std::vector<Slot*> others;
    const Slot* owner = nullptr;
    for (Slot& slot : slots_) {
        if (slot.serial != 0 && slot.pid == newest && SessionOf(slot) == session) {
            owner = &slot;
        } else if (IsPlayerOf(slot, session)) {
            others.push_back(&slot);
        }
    }
    if (newest <= 0 || owner == nullptr) {
        return {};
    }
    std::sort(others.begin(), others.end(),
              [](const Slot* left, const Slot* right) { return left->player.started_us > right->player.started_us; });
    const auto staying = std::min<std::size_t>(others.size(), static_cast<std::size_t>(owner->player.max_players - 1));
    others.erase(others.begin(), others.begin() + static_cast<std::ptrdiff_t>(staying));
    return others;
}

void SlotTable::Wake() {
    const std::uint64_t one = 1;
    // A counter that is full wakes the host as well.
    [[maybe_unused]] const ssize_t written = ::write(wake_.Get(), &one, sizeof one);
}

void SlotTable::ClearWake() {
    std::uint64_t count = 0;
    [[maybe_unused]] const ssize_t got = ::read(wake_.Get(), &count, sizeof count);
}

void SlotTable::SetWakeDescriptor(int descriptor) {
    wake_.Release();
    wake_.Reset(descriptor);
}

std::string_view SessionOf(const Slot& slot) {
    return slot.has_session ? std::string_view(slot.session.data()) : std::string_view{};
}

}  // namespace lookhaven::control
