// SPDX-License-Identifier: Apache-2.0
//
// What a request process writes into its slot for others to read: its session and its call.
#include <algorithm>
#include <span>
#include <stdexcept>

#include "standalone/control/slot_table.h"

namespace lookhaven::control {

namespace {

std::string_view TextIn(std::span<const char> text) {
    return {text.begin(), std::ranges::find(text, '\0')};  // a process that was taken over may have left no end
}

}  // namespace

void SlotTable::SetCall(Slot& slot, std::string_view call) {
    slot.has_call = false;
    slot.call.fill('\0');
    call.copy(slot.call.data(), slot.call.size() - 1);
    slot.has_call = true;
}

void SlotTable::SetAccount(Slot& slot, std::string_view account) {
    slot.account.fill('\0');
    account.copy(slot.account.data(), slot.account.size() - 1);
}

void SlotTable::SetSession(Slot& slot, std::string_view handle) {
    if (handle.size() >= slot.session.size()) {
        throw std::length_error("a session handle is too long");
    }
    slot.session.fill('\0');
    handle.copy(slot.session.data(), handle.size());
    slot.has_session = true;
}

std::string_view SessionOf(const Slot& slot) {
    return slot.has_session ? TextIn(slot.session) : std::string_view{};
}

std::string_view CallOf(const Slot& slot) {
    const std::string_view call = slot.has_call ? TextIn(slot.call) : std::string_view{};
    // The slot is its process's to write.
    const bool is_name = std::ranges::all_of(call, [](char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '.' || c == '/';
    });
    return is_name ? call : std::string_view{};
}

std::string_view AccountOf(const Slot& slot) {
    return TextIn(slot.account);
}

}  // namespace lookhaven::control
