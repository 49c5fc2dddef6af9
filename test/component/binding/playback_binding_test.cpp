// SPDX-License-Identifier: Apache-2.0
//
// What the platform does for players: the pace, and the pictures of recordings that are whole, broken or still growing.
#include <array>
#include <chrono>
#include <fstream>
#include <functional>
#include <thread>

#include "platform/recording/event.h"
#include "platform/recording/pacing.h"
#include "standalone/archive/layout.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "test/component/binding/footage_fixture.h"

namespace lookhaven::binding {
namespace {

using namespace std::chrono_literals;
using base::MonotonicMicros;

std::int64_t MillisOf(const std::function<void()>& act) {
    const std::int64_t began = MonotonicMicros();
    act();
    return (MonotonicMicros() - began) / 1000;
}

TEST(DelayTimer, KeepsItsPaceWhateverTheWorkBetween) {
    DelayTimer timer(0);
    timer.SetDelayTime(20'000);
    const std::int64_t took = MillisOf([&] {
        timer.BeginTiming();
        for (int i = 0; i < 50; ++i) {
            std::this_thread::sleep_for(std::chrono::milliseconds(i % 3 * 5));
            timer.Delay();
        }
    });
    EXPECT_GE(took, 999) << "never ahead of its time";
    EXPECT_LT(took, 1100) << "relative delays would add up to 1.25 s";
}

TEST(DelayTimer, MakesNoBurstAfterABlock) {
    DelayTimer timer(50'000);
    timer.BeginTiming();
    std::this_thread::sleep_for(500ms);
    timer.Delay();
    EXPECT_GE(MillisOf([&] {
                  timer.Delay();
                  timer.Delay();
              }),
              95);
}

TEST(DelayTimer, TakesANewPeriodAtOnceAndBoundsIt) {
    DelayTimer timer(10'000'000);
    timer.BeginTiming();
    timer.SetDelayTime(50'000);
    const std::int64_t first = MillisOf([&] { timer.Delay(); });
    EXPECT_TRUE(first >= 40 && first < 1000) << first;
    for (const int period : {0, -5, -2'147'483'647 - 1}) {
        timer.SetDelayTime(period);
        timer.BeginTiming();
        EXPECT_GE(MillisOf([&] {
                      for (int i = 0; i < 20; ++i) {
                          timer.Delay();
                      }
                  }),
                  19)
            << period;
    }
    const Ticks ticks(100ms);
    timer.SetDelayTime(2'147'483'647);
    timer.BeginTiming();
    EXPECT_LT(MillisOf([&] { timer.Delay(); }), 2000) << "a signal ends a wait of 10 s";
}

TEST_F(FootageBinding, ReadsPicturesByNumberAndTime) {
    Event event;
    ASSERT_EQ(event.Load(footage_.Record(1, kNoon, 3), 0, 0, 0), 0);
    ASSERT_TRUE(event.IsSaved() && IsFileExist(event.GetFullPath()));
    JpegExtractor extractor;
    EXPECT_EQ(Picture(extractor, 0), "none") << "nothing is open";
    ASSERT_EQ(extractor.Init(event.GetFullPath()), 0);
    __tag_JPEG_FRAME_INFO info{};
    ASSERT_EQ(extractor.GetFrameInfo(info), 0);
    EXPECT_NEAR(info.m_FrameRate, 10.0, 0.01);
    EXPECT_EQ(info.m_FrameCount, 30);
    for (const int index : {0, 7, 29, 3}) {
        EXPECT_EQ(Picture(extractor, index), "picture " + std::to_string(index));
        EXPECT_EQ(extractor.GetFrameIdx(extractor.GetTimeMS(index)), index);
        EXPECT_EQ(RequestContext::Current().LastRecorded().captured_ms, kNoon * 1000 + index * 100);
    }
    for (const int index : {-1, 30, 1'000'000, 2'147'483'647, -2'147'483'647 - 1}) {
        EXPECT_LT(MillisOf([&] { EXPECT_EQ(Picture(extractor, index), "none") << index; }), 1000);
    }
    EXPECT_EQ(Picture(extractor, 7, 8), "none") << "larger than the buffer";
    for (const auto& [time_ms, index] : {std::pair{-1, -1}, {-2'147'483'647, -1}, {99, 0}, {100, 1}, {999'999, 29}}) {
        EXPECT_EQ(extractor.GetFrameIdx(time_ms), index) << time_ms;
    }
    std::filesystem::remove(event.GetFullPath());
    EXPECT_EQ(Picture(extractor, 12), "picture 12") << "plays on while it is being deleted";
}

TEST_F(FootageBinding, NeverSpinsOnOnePicture) {
    JpegExtractor extractor;
    ASSERT_EQ(extractor.Init(footage_.FileOf(footage_.Record(1, kNoon, 1))), 0);
    EXPECT_LT(MillisOf([&] {
                  Picture(extractor, 4);
                  EXPECT_EQ(Picture(extractor, 4), "picture 4");
              }),
              150)
        << "the first repeat belongs to ordinary playback";
    std::ofstream(footage_.FileOf(1)) << "gone";
    EXPECT_GE(MillisOf([&] {
                  for (int i = 0; i < 3; ++i) {
                      EXPECT_EQ(Picture(extractor, 4), "picture 4") << "from memory";
                  }
              }),
              590);
    const Ticks ticks(20ms);
    EXPECT_LT(MillisOf([&] { EXPECT_EQ(Picture(extractor, 4), "picture 4"); }), 150) << "a signal ends the wait";
}

TEST_F(FootageBinding, FollowsARecordingThatGrows) {
    const std::int64_t now_ms = base::WallMillis();
    test::WrittenRecording recording(Path("grows.mkv"), now_ms, 100);
    recording.Append(10);
    JpegExtractor extractor;
    ASSERT_EQ(extractor.Init(Path("grows.mkv")), 0);
    EXPECT_EQ(extractor.GetFrameIdx(60'000), 600) << "the number that the time would have";
    std::thread writer([&] {
        sigset_t all;
        sigfillset(&all);
        pthread_sigmask(SIG_SETMASK, &all, nullptr);
        std::this_thread::sleep_for(300ms);
        recording.Append(5);
    });
    EXPECT_EQ(Picture(extractor, 12), "picture 12") << "waits for it";
    writer.join();
    const std::int64_t waited = MillisOf([&] { EXPECT_EQ(Picture(extractor, 15), "none"); });
    EXPECT_TRUE(waited >= 1900 && waited < 3500) << waited;
    {
        const Ticks ticks(50ms);
        EXPECT_LT(MillisOf([&] { EXPECT_EQ(Picture(extractor, 15), "picture 14"); }), 1000)
            << "a signal ends the wait, not the player";
    }
    recording.Finish();
    EXPECT_LT(MillisOf([&] { EXPECT_EQ(Picture(extractor, 15), "none"); }), 1000) << "it has ended";
}

TEST_F(FootageBinding, RefusesBrokenRecordings) {
    const std::string whole = footage_.FileOf(footage_.Record(1, kNoon, 2));
    const auto damage = [&](const char* name, const std::function<void(std::string & index)>& act) {
        std::string index = base::ReadFile(archive::IndexPathOf(whole));
        act(index);
        std::filesystem::copy_file(whole, Path(name));
        std::ofstream(archive::IndexPathOf(Path(name)), std::ios::binary) << index;
    };
    damage("empty.mkv", [](std::string& index) { index.clear(); });
    damage("short.mkv", [](std::string& index) { index.resize(30); });
    damage("flipped.mkv", [](std::string& index) { index[9] = static_cast<char>(index[9] ^ 8); });
    damage("none.mkv", [](std::string& index) { index.resize(64); });
    std::ofstream(Path("foreign.span")) << "lookhaven span 1\nbegin 1\nend 9\nrecording ../../etc/passwd\n";
    std::ofstream(Path("noindex.mkv")) << "data";
    for (const char* name : {"empty.mkv", "short.mkv", "flipped.mkv", "none.mkv", "foreign.span", "noindex.mkv",
                             "missing.mkv", "", ".", "/dev/null"}) {
        JpegExtractor extractor;
        __tag_JPEG_FRAME_INFO info{};
        EXPECT_TRUE(extractor.Init(Path(name)) != 0 || extractor.GetFrameInfo(info) != 0) << name;
    }
    EXPECT_FALSE(IsFileExist(""));
    EXPECT_FALSE(IsFileExist(std::string(5000, 'x')));
}

}  // namespace
}  // namespace lookhaven::binding
