// SPDX-License-Identifier: Apache-2.0
//
// A player's hold on its login session: the flags that signals set, and the pid file that names the session's player.
//
// Why so        A newer player of the session writes its own id into the file. An older one, told by a signal to look,
//               finds a foreign id, stops, and leaves the file to the newer.
// Thread safety One thread; signal handlers store the flags.
#pragma once

#include <atomic>
#include <string>

// The login session that this process plays for; empty when the request has none.
extern std::string g_PlayerSessionId;

// The stream is to end: SIGTERM came, or another player has the session.
extern std::atomic<unsigned char> g_PlayerStop;
// SIGUSR1 came, and the pid file has not been found to be this process's since.
extern std::atomic<unsigned char> g_PlayerCheckPid;
// SIGUSR2 came an odd number of times.
extern std::atomic<unsigned char> g_PlayerPause;
static_assert(std::atomic<unsigned char>::is_always_lock_free, "signal handlers store them");

// Has SIGTERM, SIGUSR1 and SIGUSR2 set the flags. False when one cannot be caught.
bool SetupPlayerSignals();

// The session's pid file.
std::string PlayerPidFile();
// Makes this process the session's player. False when the file cannot be opened.
bool WritePlayerPidFile();
// Sets the stop flag when the file does not name this process, else clears the check flag. Returns 0, or -1 when there is
// no session or no file.
int CheckPlayerPidFile();
// False when there is no session, or the file cannot be removed.
bool RemovePlayerPidFile();
