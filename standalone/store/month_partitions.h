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
#include <stop_token>

#include "standalone/store/store.h"

namespace soci {
class session;
}

namespace lookhaven::store {

// The number of events in the default partition for which a month gets its own: a few of a wrong clock, or of a month
// long ago, are not worth one.
constexpr std::int64_t kMinEventsForPartition = 1'000;

// Makes the partitions of this month and the next by the server's clock, and those of earlier months with at least
// kMinEventsForPartition events in the default partition, whose rows of that month are moved. A month with so many rows
// there that moving them would hold up others for long is left there. Drops partitions of past months that are empty.
// Nothing to do for SQLite.
//
// Any number of programs may call it at once: they take turns. It waits at most 1.5 s for a table's lock, since what
// comes after it queues up behind; others wait for the one or two seconds in which rows are moved, 15 at most. Throws
// StoreUnavailable at once; any other StoreError, as for a lock not obtained or a month left, after the rest. Begins no
// further step once stop is requested; the one that runs may take a minute.
void MaintainPartitions(Store& store, const std::stop_token& stop = {});

// How many events of the table ("events", or one of its partitions) start on each day, which is given in days since
// 1970-01-01 UTC.
std::map<std::int64_t, std::int64_t> EventsByDay(soci::session& sql, const char* table);

// PostgreSQL only, before these events are inserted: makes the partitions of months with at least
// kMinEventsForPartition of them, but none after the next month. Only inside Write, after LockSchema.
void MakePartitionsFor(soci::session& sql, const std::map<std::int64_t, std::int64_t>& events_by_day);

}  // namespace lookhaven::store
