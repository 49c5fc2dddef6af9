// SPDX-License-Identifier: Apache-2.0
//
// What processes killed while they made a segment leave, and what the sweep takes for such.
#include <cstddef>
#include <cstring>
#include <stdexcept>

#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/shm.h>
#include <sys/syscall.h>

#include "standalone/ring/segment_keys.h"
#include "test/component/ring/ring_fixture.h"

namespace lookhaven::ring {
namespace {

const StreamId kId{3, 0, Medium::kVideo};

using SweepTest = RingTest;

// Makes the system kill the calling process when it is about to attach a segment.
void DieWhenAttaching() {
    sock_filter filter[] = {
        BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
        BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_shmat, 0, 1),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_KILL_PROCESS),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
    };
    const sock_fprog program{4, filter};
    if (::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0 || ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) != 0) {
        throw std::runtime_error("no filter");
    }
}

TEST_F(SweepTest, OnlyUnfinishedSegmentsOfOursAreRemoved) {
    constexpr key_t kUnusedRingKey = 0x4c123457;
    ASSERT_TRUE(IsRingKey(kUnusedRingKey));
    struct Row {
        const char* name;
        int mode;
        std::size_t written_offset;
        std::uint64_t written;
        bool is_removed;
    };
    for (const Row& row : {
             Row{"killed before the first byte", 0600, 0, 0, true},
             Row{"killed in the head", 0600, offsetof(SegmentHead, constants.installation), installation_.Id(), true},
             Row{"of another installation", 0600, offsetof(SegmentHead, constants.installation), ~installation_.Id(),
                 false},
             Row{"another program's data", 0600, 512, 1, false},
             Row{"shared with other users", 0660, 0, 0, false},
         }) {
        SCOPED_TRACE(row.name);
        KilledChild creator([&] {
            void* made = ::shmat(::shmget(kUnusedRingKey, kSmallBytes, IPC_CREAT | IPC_EXCL | row.mode), nullptr, 0);
            std::memcpy(static_cast<char*>(made) + row.written_offset, &row.written, sizeof row.written);
        });
        EXPECT_EQ(RemoveOrphans(installation_), 0U) << "its creator lives";
        creator.Kill();
        EXPECT_EQ(RemoveOrphans(installation_), row.is_removed ? 1U : 0U);
        const int left = ::shmget(kUnusedRingKey, 0, 0);
        EXPECT_EQ(left >= 0, !row.is_removed);
        ::shmctl(left, IPC_RMID, nullptr);
    }
}

// Earlier versions computed other keys.
TEST_F(SweepTest, ARingUnderAnyRingKeyGoesWithItsWriter) {
    constexpr key_t kEarlierKey = 0x4c654321;
    KilledChild writer([&] {
        const Attachment ring = CreateSegment(installation_.Id(), kId, kMjpeg, kSmall);
        void* earlier = ::shmat(::shmget(kEarlierKey, kSmallBytes, IPC_CREAT | IPC_EXCL | 0600), nullptr, 0);
        std::memcpy(earlier, ring.Address(), kSmallBytes);
        ring.RemoveSegment();
    });
    EXPECT_EQ(RemoveOrphans(installation_), 0U) << "it is written to";
    writer.Kill();
    EXPECT_EQ(RemoveOrphans(installation_), 1U);
    EXPECT_LT(::shmget(kEarlierKey, 0, 0), 0);
}

TEST_F(SweepTest, AProcessKilledBeforeItAttachesLeavesNothingForGood) {
    for (const bool has_name : {true, false}) {
        SCOPED_TRACE(has_name);
        const int status = WaitFor(InChild([&] {
            DieWhenAttaching();
            has_name ? CreateSegment(installation_.Id(), kId, kMjpeg, kSmall)
                     : CreatePrivateSegment(kId, kMjpeg, kSmall);
        }));
        EXPECT_TRUE(WIFSIGNALED(status)) << status;
        EXPECT_EQ(RemoveOrphans(installation_), 1U);
    }
}

}  // namespace
}  // namespace lookhaven::ring
