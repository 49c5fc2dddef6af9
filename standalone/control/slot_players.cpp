// SPDX-License-Identifier: Apache-2.0
//
// What the slots hold of players: which there are, which are too many, and what is requested of them.
#include <algorithm>
#include <functional>

#include "standalone/base/clock.h"
#include "standalone/control/slot_table.h"

namespace lookhaven::control {

namespace {

// A pause in one word: the serial above, then the rate in 8 bits, then whether it is on.
constexpr int kSerialShift = 9;

bool IsPlayerOf(const Slot& slot, std::string_view session) {
    return slot.serial != 0 && slot.player.key != 0 && SessionOf(slot) == session && !slot.MustEnd();
}

}  // namespace

void SlotTable::BeginPlayer(Slot& slot, std::int64_t key) {
    slot.player.key = key;
    slot.player.started_us = base::MonotonicMicros();
    Wake();
}

std::optional<RequestRef> SlotTable::FindPlayer(std::string_view session, std::int64_t key) const {
    std::optional<RequestRef> found;
    for (Slot& slot : Used()) {
        const RequestRef use{&slot, slot.serial};
        if (IsPlayerOf(slot, session) && slot.player.key == key && (!found || use.serial > found->serial)) {
            found = use;
        }
    }
    return found;
}

void SlotTable::NoteForwardedPlayer(Slot& slot, std::int64_t key, int host) {
    slot.player_host_id = host;
    slot.forwarded_player_key = key;
}

int SlotTable::FindForwardedPlayer(std::string_view session, std::int64_t key) const {
    int host = 0;
    std::uint64_t newest = 0;
    for (const Slot& slot : Used()) {
        const std::uint64_t serial = slot.serial;
        if (serial > newest && slot.forwarded_player_key == key && SessionOf(slot) == session && !slot.MustEnd()) {
            host = slot.player_host_id;
            newest = serial;
        }
    }
    return host;
}

std::uint64_t SlotTable::PackPause(std::uint64_t serial, const Pause& pause) {
    const auto rate = static_cast<std::uint8_t>(pause.resumed_rate);
    return serial << kSerialShift | std::uint64_t{rate} << 1 | (pause.on ? 1U : 0U);
}

Pause SlotTable::UnpackPause(std::uint64_t word) {
    return {(word & 1) != 0, static_cast<std::int8_t>(word >> 1 & 0xff)};
}

bool SlotTable::ChangePause(const RequestRef& player, const std::function<void(Pause&)>& change) {
    std::atomic<std::uint64_t>& word = player.slot->player.pause;
    for (std::uint64_t held = word; held >> kSerialShift == player.serial;) {
        Pause pause = UnpackPause(held);
        change(pause);
        if (word.compare_exchange_weak(held, PackPause(player.serial, pause))) {
            return true;
        }
    }
    return false;
}

std::set<std::string> SlotTable::SessionsWithPlayers() const {
    std::set<std::string> sessions;
    for (const Slot& slot : Used()) {
        if (slot.serial != 0 && slot.player.started_us != 0) {
            sessions.emplace(SessionOf(slot));
        }
    }
    return sessions;
}

std::vector<Slot*> SlotTable::ExcessPlayers(std::string_view session, pid_t newest) const {
    std::vector<std::pair<std::int64_t, Slot*>> others;  // when they began, read once: a player may change it
    const Slot* owner = nullptr;
    for (Slot& slot : Used()) {
        if (slot.serial != 0 && slot.pid == newest && SessionOf(slot) == session) {
            owner = &slot;
        } else if (const std::int64_t started_us = slot.player.started_us;
                   IsPlayerOf(slot, session) && started_us != 0) {
            others.emplace_back(started_us, &slot);
        }
    }
    if (newest <= 0 || owner == nullptr) {
        return {};
    }
    std::ranges::sort(others, std::greater());
    const int places = std::max(0, owner->player.max_players - (owner->MustEnd() ? 0 : 1));
    std::vector<Slot*> excess;
    for (std::size_t at = static_cast<std::size_t>(places); at < others.size(); ++at) {
        excess.push_back(others[at].second);
    }
    return excess;
}

}  // namespace lookhaven::control
