// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/inventory.h"

#include <algorithm>
#include <functional>
#include <system_error>

#include <sys/ipc.h>
#include <sys/shm.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"
#include "standalone/ring/process_word.h"
#include "standalone/ring/reader_table.h"
#include "standalone/ring/segment_keys.h"

namespace lookhaven::ring {

namespace {

// Calls back for each segment of the installation that the user owns; those that vanish meanwhile are skipped.
void ForEachSegment(std::uint64_t installation, uid_t user,
                    const std::function<void(const Attachment&, SegmentCheck, const shmid_ds&)>& call) {
    ForEachOwnSegment(
        [&](int shm_id, const shmid_ds& status) {
            if (!IsRingKey(status.shm_perm.__key)) {
                return;
            }
            Attachment attachment;
            try {
                attachment = Attachment(shm_id, user);
            } catch (const std::system_error&) {
                return;
            }
            const SegmentCheck check = CheckSegment(attachment.Address());
            const bool has_identity = check != SegmentCheck::kNotARing && check != SegmentCheck::kUnfinished;
            if (has_identity && View(attachment.Address()).Constants().installation == installation) {
                call(attachment, check, status);
            }
        },
        user);
}

// Root lists the segments of the user whose state folder it is.
uid_t UserOf(const base::Installation& installation) {
    struct stat status {};
    const bool is_root = ::geteuid() == 0;
    return is_root && ::stat(installation.Home().c_str(), &status) == 0 ? status.st_uid : ::geteuid();
}

void Retire(const Attachment& attachment) {
    SegmentHead& head = View(attachment.Address()).Head();
    head.retired.store(1);
    base::Wake(head.wake);
    attachment.RemoveSegment();
}

// Becomes the dead writer's successor, so that no new writer adopts the ring meanwhile, and removes it.
bool RemoveDeadWriters(const Attachment& attachment) {
    SegmentHead& head = View(attachment.Address()).Head();
    std::uint64_t writer = head.writer.load();
    if (IsWordAlive(writer) || !head.writer.compare_exchange_strong(writer, OwnWord())) {
        return false;
    }
    Retire(attachment);
    return true;
}

// Approximate: the writer may change the index while it is read.
std::uint64_t UsedBytes(const View& view) {
    std::uint64_t blocks = 0;
    for (std::uint32_t i = 0; i < view.Constants().index_slots; ++i) {
        const IndexSlot& slot = view.Slot(i);
        if (const Region region = Region::FromWord(slot.region.load()); slot.count.load() != 0) {
            blocks += region.blocks;
        }
    }
    return std::min(blocks * kBlockBytes, view.Size().arena_bytes);
}

}  // namespace

std::vector<SegmentState> ListSegments(const base::Installation& installation) {
    std::vector<SegmentState> states;
    const auto add = [&](const Attachment& attachment, SegmentCheck check, const shmid_ds& status) {
        const View view(attachment.Address());
        SegmentState& state = states.emplace_back();
        state.shm_id = attachment.ShmId();
        state.id = view.Id();
        state.size_bytes = status.shm_segsz;
        state.layout_version = view.Constants().layout_version;
        state.attached = status.shm_nattch;
        state.has_known_layout = check == SegmentCheck::kGood;
        if (state.has_known_layout) {
            state.writer_alive = IsWordAlive(view.Head().writer.load());
            state.heartbeat_age_ms = (base::MonotonicMicros() - view.Head().heartbeat_micros.load()) / 1000;
            state.entries_written = view.Head().newest.load();
            state.entries_dropped = view.Head().dropped.load();
            state.arena_bytes = view.Size().arena_bytes;
            state.used_bytes = UsedBytes(view);
            state.readers = ReaderTable(view).Used();
        }
    };
    ForEachSegment(installation.Id(), UserOf(installation), add);
    return states;
}

std::size_t RemoveOrphans(const base::Installation& installation) {
    std::size_t removed = 0;
    const auto remove = [&](const Attachment& attachment, SegmentCheck check, const shmid_ds& status) {
        if (status.shm_nattch != 0) {
            return;
        }
        if (check == SegmentCheck::kGood) {
            removed += RemoveDeadWriters(attachment) ? 1 : 0;
        } else {
            attachment.RemoveSegment();  // a living writer would have it attached
            ++removed;
        }
    };
    ForEachSegment(installation.Id(), ::geteuid(), remove);
    ForEachOwnSegment([&](int shm_id, const shmid_ds& status) {
        removed += IsRingKey(status.shm_perm.__key) && RemoveIfAbandoned(installation.Id(), shm_id) ? 1 : 0;
    });
    return removed;
}

void RetireAll(const base::Installation& installation) {
    const auto retire = [](const Attachment& attachment, SegmentCheck check, const shmid_ds&) {
        if (check != SegmentCheck::kGood) {
            return;
        }
        const std::uint64_t writer = View(attachment.Address()).Head().writer.load();
        if (writer == OwnWord() || !IsWordAlive(writer)) {
            Retire(attachment);
        }
    };
    ForEachSegment(installation.Id(), ::geteuid(), retire);
}

}  // namespace lookhaven::ring
