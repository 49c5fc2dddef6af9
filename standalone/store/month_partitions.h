// SPDX-License-Identifier: Apache-2.0
//
// The partitions of events and marks in PostgreSQL: one for each month, UTC, in which they start. SQLite has none.
//
// Why so        What names a span of time reads the months of that span alone, and a month that retention has emptied
//               is dropped as a whole. What is dated in a month without a partition goes to the default one, so that
//               recording never waits for this work; and so do marks of any time that a client claims, which is why
//               marks alone make no partition.
// See           month_partitions_schema.h
#pragma once

#include "standalone/store/store.h"

namespace lookhaven::store {

// Makes the partitions of this month and the next by the server's clock, and those of earlier months with events in the
// default partition, which are moved; drops those of past months that are empty. One after the other, each in a
// transaction for which others may wait 1.5 s. Nothing to do for SQLite. Throws StoreError, also where somebody else
// works with the table for longer; what was done before stays.
void MaintainPartitions(Store& store);

}  // namespace lookhaven::store
