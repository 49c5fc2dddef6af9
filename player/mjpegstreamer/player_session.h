// SPDX-License-Identifier: Apache-2.0
//
// A player and its login session: the flags that signals set, and the pid file that names the session's player.
//
// Why so        A newer player of the session writes its own process id to the file. An older one, told by a signal to
//               check, finds another id, stops, and leaves the file to the newer one.
// Thread safety One thread; signal handlers store the flags.
#pragma once

#include <atomic>
#include <string>

// The login session that this process plays for; empty when the request has none.
extern std::string g_PlayerSessionId;

// The stream is to end: SIGTERM was received, or another player owns the session.
extern std::atomic<unsigned char> g_PlayerStop;
// SIGUSR1 was received, and no check since has found this process's id in the pid file.
extern std::atomic<unsigned char> g_PlayerCheckPid;
// 1 after an odd number of SIGUSR2, else 0.
extern std::atomic<unsigned char> g_PlayerPause;
static_assert(std::atomic<unsigned char>::is_always_lock_free, "signal handlers store them");

// Makes SIGTERM, SIGUSR1 and SIGUSR2 set the flags. False when a handler cannot be installed.
bool SetupPlayerSignals();

// The session's pid file.
std::string PlayerPidFile();
// Makes this process the session's player in place of any other. False when the file cannot be opened.
bool WritePlayerPidFile();
// Sets the stop flag when the file does not name this process, else clears the check flag. Returns 0, or -1 when there
// is no session or no file.
int CheckPlayerPidFile();
// False when there is no session, or the file cannot be removed.
bool RemovePlayerPidFile();
