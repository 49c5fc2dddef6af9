// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/inventory.h"

#include <functional>
#include <system_error>

#include <sys/ipc.h>
#include <sys/shm.h>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"
#include "standalone/ring/process_word.h"
#include "standalone/ring/reader_table.h"
#include "standalone/ring/segment.h"

namespace lookhaven::ring {

namespace {

// Calls back for each segment of the system with one of our keys, as it was before we attach it.
void ForEachRingKey(const std::function<void(int shm_id, const shmid_ds&)>& call) {
    shm_info totals{};
    const int last = ::shmctl(0, SHM_INFO, reinterpret_cast<shmid_ds*>(&totals));
    for (int i = 0; i <= last; ++i) {
        shmid_ds status{};
        const int shm_id = ::shmctl(i, SHM_STAT, &status);
        if (shm_id >= 0 && IsRingKey(status.shm_perm.__key)) {
            call(shm_id, status);
        }
    }
}

// Calls back for each segment of the installation; others and those that vanish meanwhile are skipped.
void ForEachSegment(std::uint64_t installation,
                    const std::function<void(const Attachment&, SegmentCheck, const shmid_ds&)>& call) {
    ForEachRingKey([&](int shm_id, const shmid_ds& status) {
        Attachment attachment;
        try {
            attachment = Attachment(shm_id);
        } catch (const std::system_error&) {
            return;
        }
        const SegmentCheck check = CheckSegment(attachment.Address(), status.shm_segsz);
        const bool has_identity = check != SegmentCheck::kNotARing && check != SegmentCheck::kUnfinished;
        if (has_identity && View(attachment.Address()).Head().installation == installation) {
            call(attachment, check, status);
        }
    });
}

// Becomes the dead writer's successor, so that no new writer adopts the ring meanwhile, and removes it.
bool RemoveDeadWriters(const Attachment& attachment) {
    SegmentHead& head = View(attachment.Address()).Head();
    std::uint64_t writer = head.writer.load();
    if (IsWordAlive(writer) || !head.writer.compare_exchange_strong(writer, OwnWord())) {
        return false;
    }
    head.retired.store(1);
    base::Wake(head.wake);
    attachment.RemoveSegment();
    return true;
}

}  // namespace

std::vector<SegmentState> ListSegments(const base::Installation& installation) {
    std::vector<SegmentState> states;
    ForEachSegment(installation.Id(), [&](const Attachment& attachment, SegmentCheck check, const shmid_ds& status) {
        const View view(attachment.Address());
        SegmentState& state = states.emplace_back();
        state.shm_id = attachment.ShmId();
        state.id = view.Id();
        state.size_bytes = status.shm_segsz;
        state.layout_version = view.Head().layout_version;
        state.attached = status.shm_nattch;
        state.has_known_layout = check == SegmentCheck::kGood;
        if (state.has_known_layout) {
            state.writer_alive = IsWordAlive(view.Head().writer.load());
            state.heartbeat_age_ms = (base::MonotonicMicros() - view.Head().heartbeat_micros.load()) / 1000;
            state.entries_written = view.Head().newest.load();
            state.entries_dropped = view.Head().dropped.load();
            state.readers = ReaderTable(view).Used();
        }
    });
    return states;
}

std::size_t RemoveOrphans(const base::Installation& installation) {
    std::size_t removed = 0;
    ForEachSegment(installation.Id(), [&](const Attachment& attachment, SegmentCheck check, const shmid_ds& status) {
        if (status.shm_nattch != 0) {
            return;
        }
        if (check == SegmentCheck::kGood) {
            removed += RemoveDeadWriters(attachment) ? 1 : 0;
        } else {
            attachment.RemoveSegment();  // a living writer would have it attached
            ++removed;
        }
    });
    ForEachRingKey(
        [&](int shm_id, const shmid_ds&) { removed += RemoveIfAbandoned(installation.Id(), shm_id) ? 1 : 0; });
    return removed;
}

}  // namespace lookhaven::ring
