// SPDX-License-Identifier: Apache-2.0
//
// An entry of systemd's journal with fields of ours, in the journal's own protocol: a datagram to its socket.
//
// Why so        What a service writes to standard error becomes text alone: journalctl LOOKHAVEN_CAMERA=5 would find
//               nothing.
#pragma once

#include <string_view>

namespace lookhaven::base {

struct JournalEntry {
    int priority = 6;               // of syslog
    std::string_view program;       // "recorder"
    std::string_view text;          // no line breaks in it, nor in what follows
    int camera = 0;                 // LOOKHAVEN_CAMERA; 0: none
    std::string_view account = {};  // LOOKHAVEN_ACCOUNT
};

constexpr const char* kJournalSocket = "/run/systemd/journal/socket";

// False when the journal does not take it at once, or a confined process may open no socket. Leaves no descriptor
// open. Throws std::bad_alloc.
bool SendToJournal(const JournalEntry& entry, const char* socket = kJournalSocket);

}  // namespace lookhaven::base
