// SPDX-License-Identifier: Apache-2.0
//
// Memory for answers and indexes that consist of a hundred thousand small objects.
#pragma once

namespace lookhaven::binding {

// Lets this process's heap grow into huge pages from here on. A list of thousands of events fills tens of megabytes
// once, the frames of an hour four, and a page fault for every 4 KiB of them costs more than the list itself. Not for
// live streams: the first object takes a whole huge page. Does nothing where the system has none.
void PrepareForManyObjects();

}  // namespace lookhaven::binding
