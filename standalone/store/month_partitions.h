// SPDX-License-Identifier: Apache-2.0
//
// The monthly partitions of events and marks in PostgreSQL, by their start, in UTC. SQLite has none.
//
// Why so        What names a span of time reads its months alone, and a month that retention has emptied is dropped as
//               a whole. What is dated in a month without a partition goes to the default one, so that recording never
//               waits for this work. Clients may report marks of any time, so marks alone make no partition.
// See           month_partitions_schema.h
#pragma once

#include <cstdint>
#include <map>

#include "standalone/store/store.h"

namespace soci {
class session;
}

namespace lookhaven::store {

// Makes the partitions of this month and the next by the server's clock, and those of earlier months that have from
// kMinEvents events on in the default partition; what that has of a month is moved. Leaves a month that has so many
// rows there that moving them would hold up others for long. Drops partitions of past months that are empty. Nothing to
// do for SQLite.
//
// Any number of programs may call it at once: they take turns. It waits at most 1.5 s for a table's lock, since what
// comes after it queues up behind; others then wait for the one or two seconds in which rows are moved. Throws
// StoreError, also when a lock is not to be had, after it has done what it can of the rest.
void MaintainPartitions(Store& store);
constexpr std::int64_t kMinEvents = 1'000;  // a few of a wrong clock, or of a month long ago, are not worth a partition

// How many events start on each day, by its number since 1970-01-01.
std::map<std::int64_t, std::int64_t> EventsByDay(soci::session& sql, const char* table);

// For a store of PostgreSQL that is about to be filled with those: the partitions of months that have from kMinEvents
// on, but of none after the next month. Inside Write, after LockSchema, only.
void MakePartitionsFor(soci::session& sql, const std::map<std::int64_t, std::int64_t>& events_by_day);

}  // namespace lookhaven::store
