// SPDX-License-Identifier: Apache-2.0
//
// Live streams as the module attaches them: what ends the wait for a first picture, and the readers of a ring that
// goes.
#include <atomic>
#include <chrono>
#include <csignal>
#include <functional>

#include "platform/live/commoncfg.h"
#include "platform/live/livestream.h"
#include "standalone/base/clock.h"
#include "standalone/control/common_config.h"
#include "standalone/ring/writer.h"
#include "standalone/store/cameras.h"
#include "test/component/binding/binding_fixture.h"

namespace lookhaven::binding {
namespace {

std::atomic<int> g_terminations;

// Camera 1 of a recorder that was seen just now.
class LiveBinding : public Binding {
  protected:
    LiveBinding() {
        store::Camera camera;
        camera.name = "yard";
        camera.profiles = {{0, "test:mjpeg", 0, 0, 0}};
        store::Cameras(records_).Add(camera);
        LHShmCommonCfgAt();  // while there is none
        const control::CommonConfigKeeper recorder(home_);
        SeenSecondsAgo(0);
    }
    static void SeenSecondsAgo(int seconds) { LHShmCommonCfgAt()->m_Timestamp = GetMonoTimeSec() - seconds; }
};

TEST_F(LiveBinding, TheCommonRecordIsMappedOnce) {
    LHShmCommonCfg* const record = LHShmCommonCfgAt();
    EXPECT_NE(record, nullptr);
    EXPECT_EQ(LHShmCommonCfgAt(), record) << "each pass of a stream asks for it";
}

TEST_F(LiveBinding, NobodyWaitsOnForAPictureThatCannotCome) {
    const struct {
        const char* name;
        std::chrono::milliseconds signals;
        int seen_seconds_ago;
    } cases[] = {{"the host's signal", std::chrono::milliseconds(100), 0},
                 {"the recorder dies", std::chrono::milliseconds(0), 5}};
    for (const auto& each : cases) {
        const Ticks ticks(each.signals);
        SeenSecondsAgo(each.seen_seconds_ago);
        const auto start = std::chrono::steady_clock::now();
        EXPECT_EQ(LiveStreamFifoAt(1, 0), nullptr) << each.name;
        EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(4)) << each.name;
    }
}

TEST_F(LiveBinding, AReaderEndsWithItsRing) {
    std::signal(SIGTERM, [](int) { ++g_terminations; });
    const std::function<DataEntry*(ShmStreamFifo&, __tag_DATA_ENTRY_INFO*)> reads[] = {
        [](auto& ring, auto* position) { return ring.ReadLatest(DATA_ENTRY_SEQ_NONE, position); },
        [](auto& ring, auto* position) { return ring.ReadNext(DATA_ENTRY_SEQ_NONE, position); }};
    for (const auto& read : reads) {
        const std::vector<unsigned char> picture(1000);
        auto writer = std::make_unique<ring::Writer>(
            home_, ring::StreamId{1, 0}, ring::StreamFormat{"MJPEG", {}, 8, 8, true}, ring::Geometry{64, 1 << 16});
        writer->Write({.data = picture, .is_key = true, .capture_millis = base::WallMillis()});
        ShmStreamFifo* const ring = LiveStreamFifoAt(1, 0);
        ASSERT_NE(ring, nullptr);
        __tag_DATA_ENTRY_INFO position;
        ring->StartRead(&position);
        g_terminations = 0;
        DataEntry* const entry = read(*ring, &position);
        EXPECT_NE(entry, nullptr);
        ring->ReadFinish(entry, true, &position);
        EXPECT_EQ(g_terminations, 0);
        writer.reset();
        read(*ring, &position);
        EXPECT_EQ(g_terminations, 1);
        ring->StopRead(&position);
    }
    std::signal(SIGTERM, SIG_DFL);
}

}  // namespace
}  // namespace lookhaven::binding
