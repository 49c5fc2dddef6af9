// SPDX-License-Identifier: Apache-2.0
//
// What an owner needs to set up the same installation on another machine: its records and pictures of e-maps, and, on
// request, its certificate and the key that signs exports; not its recordings.
//
// Why so        Records are copied row by row into a SQLite file, whatever engine keeps them, so that a backup of
//               either can be restored into either, and an older one into a newer program.
// See           docs/guide/backup.md
#pragma once

#include <cstdint>
#include <string>

#include "standalone/backup/tar_file.h"
#include "standalone/base/installation.h"
#include "standalone/store/store.h"

namespace lookhaven::backup {

enum class Certificate { kLeftOut, kIncluded };  // with it the key that signs exports

struct Summary {
    std::string version;  // of the program that made the backup
    std::int64_t made_s = 0;
    std::int64_t records = 0;
    int pictures = 0;
    bool has_certificate = false;
};

// Writes a backup while the programs go on running. The descriptor is the caller's. What was written before something
// throws is no backup. Throws std::system_error, store::StoreError; std::runtime_error while another backup is made.
Summary Write(const base::Installation& installation, store::Store& store, int descriptor, Certificate certificate,
              const std::string& version);

// Restores into an installation that was just set up and does not run. Throws Malformed for what is no whole backup,
// store::SchemaError for one of a newer program, store::InvalidRecord when the installation has accounts, cameras or
// recordings of its own; std::system_error, store::StoreError. Whatever it throws, the records are as they were.
Summary Restore(const base::Installation& installation, int descriptor);

}  // namespace lookhaven::backup
