// SPDX-License-Identifier: Apache-2.0
//
// Takes away from the calling process what reading a camera does not need.
//
// Why so        See docs/design/cameras.md.
// Invariants    Afterwards the process can (1) read no files but those that resolve names and public certificates, (2)
//               start no process or program, reach no other process's memory and signal none, (3) attach no shared
//               memory, (4) open no sockets but those to TCP and UDP, and listen on none, (5) execute no memory that
//               was not executable before. None of it can be taken back.
#pragma once

namespace lookhaven::camera {

// What this kernel, or what emulates it, could do. Without Landlock, (1) does not hold: files can be read, not written.
// Without a system-call filter, none but (1) holds.
struct Confinement {
    bool has_landlock = false;
    bool has_system_call_filter = false;
};

// Call it with one thread, after all libraries are loaded. Throws std::system_error when something fails that the
// kernel should be able to do.
Confinement ConfineThisProcess();

}  // namespace lookhaven::camera
