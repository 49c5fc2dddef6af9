// SPDX-License-Identifier: Apache-2.0
//
// The file that names the process of a session's newest player. Players write it; the host reads it and sweeps it.
#pragma once

#include <string_view>

#include <sys/types.h>

namespace lookhaven::control {

// The process that the session's file names; 0 when there is no file of this user, or nothing readable in it. Never
// waits.
pid_t ReadPlayerFile(std::string_view session);

// Has the session's file name the calling process. Throws std::system_error: the name may be taken by another user's
// file, since the folder is open to every local user.
void WritePlayerFile(std::string_view session);

// Removes the files of this user that name no living process of this user: a host that was killed left them.
void SweepPlayerFiles();

// Removes the file when it names the process, which has ended: one that was killed could not.
void SweepPlayerFile(std::string_view session, pid_t process);

}  // namespace lookhaven::control
