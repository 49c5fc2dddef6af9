// SPDX-License-Identifier: Apache-2.0
//
// Copies all records of a store into another one, on whatever engine each of them is.
#pragma once

#include <cstdint>
#include <string>

#include "standalone/store/store.h"

namespace lookhaven::store {

enum class CopySessions { kNo, kYes };
enum class CopyPictures { kNo, kYes };  // of e-maps, those that the store has

// Throws InvalidRecord for a store with accounts, cameras or recordings of its own.
void RequireUnused(Store& store);

// For a SQLite file that is untrusted, before it is used in any other way: throws InvalidRecord when it
// holds views, triggers or virtual tables but our own, which would run statements of theirs.
void RequireTablesOnly(const std::string& url);

// What one moment of the source holds, its counters and settings included, while others go on changing it. The target
// was just set up: throws as RequireUnused, since its records would be lost; SchemaError for a source that a newer
// program has added to. Returns the number of rows. Leases of
// recorders and of cameras are not copied, nor are failed log-ins.
std::int64_t CopyRecords(Store& source, Store& target, CopySessions sessions,
                         CopyPictures pictures = CopyPictures::kYes);

// Has all of a SQLite store in its one file, which may be copied once the store is closed. Throws StoreError.
void CheckpointWal(Store& store);

}  // namespace lookhaven::store
