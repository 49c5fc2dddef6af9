// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/slot_table.h"

#include <algorithm>
#include <functional>
#include <stdexcept>

#include <sys/eventfd.h>
#include <sys/mman.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/futex.h"

namespace lookhaven::control {

// The slots behind it are aligned as well.
struct alignas(Slot) SlotTable::Guard {
    pthread_mutex_t mutex;
    std::atomic<std::size_t> used;  // slots, from the first on
    std::atomic<std::uint32_t> reports;
};

SlotTable::SlotTable(std::size_t slots) : wake_(::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC)) {
    const std::size_t size_bytes = sizeof(Guard) + slots * sizeof(Slot);
    void* memory = ::mmap(nullptr, size_bytes, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    if (memory == MAP_FAILED || !wake_) {
        base::ThrowErrno("cannot make the table of requests");
    }
    guard_ = new (memory) Guard{};
    InitSharedMutex(guard_->mutex);
    slots_ = {reinterpret_cast<Slot*>(guard_ + 1), slots};
    is_taken_.resize(slots);
}

SlotTable::~SlotTable() {
    if (guard_ != nullptr) {
        ::munmap(guard_, SizeBytes());
    }
}

std::size_t SlotTable::SizeBytes() const {
    return sizeof(Guard) + slots_.size_bytes();
}

std::span<Slot> SlotTable::Used() const {
    return slots_.first(guard_->used);
}

Slot& SlotTable::At(std::size_t number) const {
    if (number >= slots_.size()) {
        throw std::out_of_range("there is no such slot");
    }
    return slots_[number];
}

Slot* SlotTable::Take(std::size_t keep_free) {
    if (std::ranges::count(is_taken_, false) <= static_cast<std::ptrdiff_t>(keep_free)) {
        return nullptr;
    }
    const auto index = static_cast<std::size_t>(std::ranges::find(is_taken_, false) - is_taken_.begin());
    is_taken_[index] = true;
    Slot* slot = &slots_[index];
    if (index == guard_->used) {
        new (slot) Slot{};
        guard_->used = index + 1;
    }
    slot->ended = 0;  // a process that was taken over may have left anything
    slot->is_stream = false;
    slot->has_session = false;
    slot->has_call = false;
    slot->account.fill('\0');
    slot->status = 0;
    slot->pid = 0;
    slot->user = 0;
    slot->pairing = 0;
    slot->work = Work::kNone;
    slot->is_hashing = false;
    slot->player.started_us = 0;
    slot->player.key = 0;
    slot->player.is_excess = false;
    slot->player.paused = false;
    slot->player.pause = PackPause(++last_serial_, {});
    slot->forwarded_player_key = 0;
    slot->other_hosts_camera = 0;
    slot->serial = last_serial_;
    return slot;
}

void SlotTable::Free(Slot& slot) {
    slot.serial = 0;
    is_taken_[NumberOf(slot)] = false;
}

void SlotTable::KeepOnly(const Slot& slot) {
    if (guard_ == nullptr) {
        return;
    }
    auto* const begin = reinterpret_cast<char*>(guard_);
    const auto page_bytes = static_cast<std::size_t>(::sysconf(_SC_PAGESIZE));
    const auto at = static_cast<std::size_t>(reinterpret_cast<const char*>(&slot) - begin) / page_bytes * page_bytes;
    const std::size_t behind = at + std::max(page_bytes, sizeof slot);
    ::munmap(begin, at);
    if (behind < SizeBytes()) {
        ::munmap(begin + behind, SizeBytes() - behind);
    }
    guard_ = nullptr;
    slots_ = {};
    wake_.Reset();
}

void SlotTable::VisitRunning(const std::function<void(const Slot&)>& visit) const {
    for (const Slot& slot : Used()) {
        if (slot.serial != 0) {
            visit(slot);
        }
    }
}

std::size_t SlotTable::CountOthers(const Slot& slot, const std::function<bool(const Slot&)>& counts) const {
    return static_cast<std::size_t>(std::ranges::count_if(
        Used(), [&](const Slot& each) { return &each != &slot && each.serial != 0 && counts(each); }));
}

bool SlotTable::IsWatchedByOthers(const Slot& slot, int camera) const {
    return CountOthers(slot,
                       [camera](const Slot& each) { return each.other_hosts_camera == camera && !each.MustEnd(); }) > 0;
}

QuotaResult SlotTable::BeginRequest(Slot& slot, int user, std::size_t max_of_user, std::size_t max_in_all) {
    const SharedLock lock = TryLock(guard_->mutex);
    if (!lock || CountOthers(slot, [](const Slot& each) { return each.user != 0; }) >= max_in_all) {
        return QuotaResult::kTooMany;
    }
    if (CountOthers(slot, [user](const Slot& each) { return each.user == user; }) >= max_of_user) {
        return QuotaResult::kTooManyOfUser;
    }
    slot.user = user;
    return QuotaResult::kGranted;
}

bool SlotTable::BeginSearch(Slot& slot, std::size_t max_of_user) {
    const SharedLock lock = TryLock(guard_->mutex);
    const auto counts = [user = slot.user.load()](const Slot& each) {
        return (each.work == Work::kSearch || each.work == Work::kExport) && each.user == user && !each.is_stream;
    };
    if (!lock || CountOthers(slot, counts) >= max_of_user) {
        return false;
    }
    slot.work = Work::kSearch;
    return true;
}

bool SlotTable::BeginHashing(Slot& slot, const HashingLimits& limits) {
    const SharedLock lock = TryLock(guard_->mutex);
    const auto is_full = [&](std::size_t max, const std::function<bool(const Slot&)>& counts) {
        return CountOthers(slot, [&](const Slot& each) { return each.is_hashing && counts(each); }) >= max;
    };
    const int user = slot.user;
    if (!lock || is_full(limits.in_all, [](const Slot&) { return true; })) {
        return false;
    }
    if (user != 0 && (is_full(limits.of_users, [](const Slot& each) { return each.user != 0; }) ||
                      is_full(limits.of_user, [user](const Slot& each) { return each.user == user; }))) {
        return false;
    }
    slot.is_hashing = true;
    return true;
}

bool SlotTable::BeginProbing(Slot& slot, std::size_t max_in_all) {
    const SharedLock lock = TryLock(guard_->mutex);
    if (!lock || CountOthers(slot, [](const Slot& each) { return each.work == Work::kProbing; }) >= max_in_all) {
        return false;
    }
    slot.work = Work::kProbing;
    return true;
}

QuotaResult SlotTable::BeginExport(Slot& slot, std::size_t max_of_user, std::size_t max_in_all) {
    const SharedLock lock = TryLock(guard_->mutex);
    const auto exports = [](const Slot& each) { return each.work == Work::kExport; };
    const auto of_user = [&](const Slot& each) { return exports(each) && each.user == slot.user; };
    if (lock && CountOthers(slot, of_user) >= max_of_user) {
        return QuotaResult::kTooManyOfUser;
    }
    if (!lock || CountOthers(slot, exports) >= max_in_all) {
        return QuotaResult::kTooMany;
    }
    slot.work = Work::kExport;
    return QuotaResult::kGranted;
}

bool SlotTable::BeginWatch(Slot& slot, std::size_t max_of_user) {
    const SharedLock lock = TryLock(guard_->mutex);
    const auto counts = [user = slot.user.load()](const Slot& each) {
        return each.work == Work::kWatch && each.user == user;
    };
    if (!lock || CountOthers(slot, counts) >= max_of_user) {
        return false;
    }
    slot.work = Work::kWatch;
    return true;
}

const std::atomic<std::uint32_t>& SlotTable::Reports() const {
    return guard_->reports;
}

void SlotTable::NoteReport() {
    base::Wake(guard_->reports);
}

std::set<std::string> SlotTable::Sessions() const {
    std::set<std::string> sessions;
    for (const Slot& slot : Used()) {
        if (slot.serial != 0 && slot.has_session && !slot.MustEnd()) {
            sessions.emplace(SessionOf(slot));
        }
    }
    return sessions;
}

std::set<std::uint64_t> SlotTable::Pairings() const {
    std::set<std::uint64_t> pairings;
    for (const Slot& slot : Used()) {
        if (const std::uint64_t pairing = slot.pairing; pairing != 0 && slot.serial != 0 && !slot.MustEnd()) {
            pairings.insert(pairing);
        }
    }
    return pairings;
}

// The serial is read before the rest: where a slot is reused in between, only its former request is marked.
void SlotTable::EndAll(const std::function<bool(const Slot&)>& is_meant) {
    for (Slot& slot : Used()) {
        const RequestRef use{&slot, slot.serial};
        if (use.serial != 0 && is_meant(slot)) {
            MarkEnded(use);
        }
    }
    Wake();
}

void SlotTable::EndSession(std::string_view handle) {
    EndAll([handle](const Slot& slot) { return SessionOf(slot) == handle; });
}

void SlotTable::EndPairing(std::uint64_t pairing) {
    EndAll([pairing](const Slot& slot) { return slot.pairing == pairing; });
}

void SlotTable::End(const RequestRef& use) {
    MarkEnded(use);
    Wake();
}

// Serials grow, so a mark that comes late takes no newer one away.
void SlotTable::MarkEnded(const RequestRef& use) {
    std::uint64_t marked = use.slot->ended;
    while (marked < use.serial && !use.slot->ended.compare_exchange_weak(marked, use.serial)) {
    }
}

SharedLock SlotTable::LockPlayers() const {
    return TryLock(guard_->mutex);
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

}  // namespace lookhaven::control
