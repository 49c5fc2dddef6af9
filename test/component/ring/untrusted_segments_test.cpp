// SPDX-License-Identifier: Apache-2.0
//
// Another user takes the keys of a stream with rings that look like ours.
#include <vector>

#include <gmock/gmock.h>
#include <sys/shm.h>

#include "standalone/ring/segment_keys.h"
#include "test/component/ring/ring_fixture.h"

namespace lookhaven::ring {
namespace {

constexpr uid_t kOtherUser = 65534;
constexpr int kTaken = 20;
const StreamId kId{3, 0, Medium::kVideo};

using UntrustedSegmentsTest = RingTest;

// The segments that the process made and that nobody but it has attached.
std::vector<int> UntouchedSegmentsOf(pid_t creator) {
    std::vector<int> segments;
    shm_info totals{};
    const int last = ::shmctl(0, SHM_INFO, reinterpret_cast<shmid_ds*>(&totals));
    for (int i = 0; i <= last; ++i) {
        shmid_ds status{};
        const int shm_id = ::shmctl(i, SHM_STAT, &status);
        if (shm_id >= 0 && status.shm_cpid == creator && status.shm_nattch == 1 && status.shm_lpid == creator) {
            segments.push_back(shm_id);
        }
    }
    return segments;
}

TEST_F(UntrustedSegmentsTest, NeitherShowPicturesNorKeepTheStreamFromStarting) {
    struct Row {
        const char* name;
        uid_t creator;
        uid_t owner;
        unsigned short mode;
    };
    const uid_t us = ::geteuid();
    for (const Row& row : {
             Row{"another user's", kOtherUser, kOtherUser, 0666},
             Row{"given to us by another user", kOtherUser, us, 0600},
             Row{"ours, given to another user", us, kOtherUser, 0600},
             Row{"open to other users", us, us, 0660},
         }) {
        SCOPED_TRACE(row.name);
        if (us != 0 && (row.creator != us || row.owner != us)) {
            continue;  // takes another user's account
        }
        KilledChild attacker([&] {
            ::close(STDERR_FILENO);  // it says of each key that it is taken
            if (row.creator != us && ::setuid(row.creator) != 0) {
                throw std::runtime_error("not another user");
            }
            for (int i = 0; i < kTaken; ++i) {
                Attachment ring = CreateSegment(installation_.Id(), kId, kMjpeg, kSmall);
                shmid_ds status{};
                ::shmctl(ring.ShmId(), IPC_STAT, &status);
                status.shm_perm.uid = row.owner;
                status.shm_perm.mode = row.mode;
                ::shmctl(ring.ShmId(), IPC_SET, &status);
                ring.Release();
            }
        });
        const std::vector<int> taken = UntouchedSegmentsOf(attacker.Pid());
        ASSERT_EQ(taken.size(), std::size_t{kTaken});
        EXPECT_EQ(Attach(installation_, kId), nullptr);
        EXPECT_TRUE(ListSegments(installation_).empty());
        testing::internal::CaptureStderr();
        Writer writer(installation_, kId, kMjpeg, kSmall);
        EXPECT_THAT(testing::internal::GetCapturedStderr(), testing::HasSubstr("another user"));
        writer.Write({.data = MakeData(4'000, 7)});
        EXPECT_EQ(RemoveOrphans(installation_), 0U);
        EXPECT_EQ(UntouchedSegmentsOf(attacker.Pid()), taken);

        for (const int shm_id : taken) {
            ::shmctl(shm_id, IPC_RMID, nullptr);
        }
        attacker.Kill();
        void* ring = Attach(installation_, kId);
        ASSERT_NE(ring, nullptr) << "the keys in front of the ring's became free";
        const Entry* entry = ReadLatest(ring);
        ASSERT_NE(entry, nullptr);
        EXPECT_TRUE(IsFilled(*entry, 7));
        StopRead(ring, nullptr);
        Detach(ring);
    }
}

TEST_F(UntrustedSegmentsTest, GeometryThatChangesUnderAReaderIsNotBelieved) {
    Writer writer(installation_, kId, kH264, kSmall);
    void* ring = Attach(installation_, kId);
    SegmentConstants& shared = View(ring).Head().constants;
    shared.index_slots = 1'000'000;
    shared.arena_blocks = ~0U;
    shared.segment_bytes = ~0ULL;
    shared.extra_length = ~0U;
    Position position;
    StartRead(ring, &position);
    EXPECT_TRUE(writer.Write({.data = MakeData(4'000, 7), .is_key = true}));
    EXPECT_NE(ReadLatest(ring, kNoSequence, &position, 0), nullptr);
    EXPECT_EQ(ExtraData(ring).size(), kH264.extra_data.size());
    View(ring).Slot(1).region = Region{5'000, 100}.Word();
    EXPECT_EQ(ReadLatestIFrame(ring), nullptr) << "an entry beyond the arena";
    StopRead(ring, &position);
    Detach(ring);
}

}  // namespace
}  // namespace lookhaven::ring
