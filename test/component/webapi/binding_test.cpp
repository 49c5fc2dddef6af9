// SPDX-License-Identifier: Apache-2.0
//
// What the platform does for players and searches: pace, pictures, what the caller may see, days and lists.
#include <array>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <thread>

#include <gtest/gtest.h>
#include <sys/time.h>

#include "platform/camera/camgroup.h"
#include "platform/privilege/privprofile.h"
#include "platform/recording/eventsearch.h"
#include "platform/recording/jpegextractor.h"
#include "platform/recording/pacing.h"
#include "standalone/archive/layout.h"
#include "standalone/archive/recording_log.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/store/groups.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/users.h"
#include "test/support/footage/footage.h"

namespace lookhaven::binding {
namespace {

using namespace std::chrono_literals;
using base::MonotonicMicros;

constexpr std::int64_t kNoon = 1772366400;

// Sends this process a signal every so often, as a host does.
class Ticks {
  public:
    explicit Ticks(std::chrono::microseconds period) {
        struct sigaction action {};
        action.sa_handler = [](int) {};
        sigaction(SIGALRM, &action, nullptr);
        Set(period);
    }
    ~Ticks() { Set(0us); }

  private:
    static void Set(std::chrono::microseconds period) {
        const itimerval timer{{0, period.count()}, {0, period.count()}};
        setitimer(ITIMER_REAL, &timer, nullptr);
    }
};

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

// A caller of a store with recordings.
class Binding : public testing::Test {
  protected:
    Binding() {
        std::string folder = "/tmp/lookhaven-binding.XXXXXX";
        folder_ = mkdtemp(folder.data());
        base::Installation::CreateFolders(folder_);
        home_ = std::make_unique<base::Installation>(folder_);
        store::Store::Migrate(home_->StoreUrl());
        footage_ = std::make_unique<test::Footage>(home_->StoreUrl(), folder_);
        for (const char* name : {"admin", "guest"}) {
            store::Users(footage_->Records()).Add(name, "long enough", store::Privilege::kViewer);
        }
        Call(1);
    }
    ~Binding() override {
        Call(0);
        std::filesystem::remove_all(folder_);
    }

    void Call(unsigned int user) const {
        RequestContext& context = RequestContext::Current();
        context.CloseRecords();
        context.Begin(*home_, nullptr);
        context.SetCaller(user);
        context.Renounce({});
    }
    static std::string Picture(JpegExtractor& extractor, int index, int size = 100) {
        std::string buffer(static_cast<std::size_t>(size), '\0');
        const int result = extractor.ReadFrame(index, reinterpret_cast<unsigned char*>(buffer.data()), size);
        return result == 0 ? buffer.substr(0, static_cast<std::size_t>(size)) : "none";
    }
    std::filesystem::path Path(const char* name) const { return footage_->Mount() / name; }

    std::filesystem::path folder_;
    std::unique_ptr<base::Installation> home_;
    std::unique_ptr<test::Footage> footage_;
};

TEST_F(Binding, ReadsPicturesByNumberAndTime) {
    Event event;
    ASSERT_EQ(event.Load(footage_->Record(1, kNoon, 3), 0, 0, 0), 0);
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

TEST_F(Binding, NeverSpinsOnOnePicture) {
    JpegExtractor extractor;
    ASSERT_EQ(extractor.Init(footage_->FileOf(footage_->Record(1, kNoon, 1))), 0);
    EXPECT_LT(MillisOf([&] {
                  Picture(extractor, 4);
                  EXPECT_EQ(Picture(extractor, 4), "picture 4");
              }),
              150)
        << "the first repeat belongs to ordinary playback";
    std::ofstream(footage_->FileOf(1)) << "gone";
    EXPECT_GE(MillisOf([&] {
                  for (int i = 0; i < 3; ++i) {
                      EXPECT_EQ(Picture(extractor, 4), "picture 4") << "from memory";
                  }
              }),
              590);
    const Ticks ticks(20ms);
    EXPECT_LT(MillisOf([&] { EXPECT_EQ(Picture(extractor, 4), "picture 4"); }), 150) << "a signal ends the wait";
}

TEST_F(Binding, FollowsARecordingThatGrows) {
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

TEST_F(Binding, RefusesBrokenRecordings) {
    const std::string whole = footage_->FileOf(footage_->Record(1, kNoon, 2));
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

TEST_F(Binding, RefusesWhatTheCallerMayNotPlayBack) {
    const int event = footage_->Record(2, kNoon, 3);
    const int alert = footage_->Mark(REC_EVENT_ALERT, 2, kNoon, 2, "door", event);
    const int sale = footage_->Mark(REC_EVENT_POS, 2, kNoon, 2, "1 coffee", event);
    store::Users(footage_->Records()).Deny(2, 2, {store::CameraAccess::kPlayback});
    const int group = store::Groups(footage_->Records()).Add({0, "all", {1, 2}});
    struct Case {
        const char* who;
        unsigned int caller;
        std::set<int> renounced;
        bool sees;
    };
    const Case cases[] = {{"one who may", 1, {}, true},
                          {"one who may not", 2, {}, false},
                          {"nobody", 0, {}, false},
                          {"a peer", PAIR_AUTH_UID, {}, true},
                          {"a peer narrowed", PAIR_AUTH_UID, {2}, false},
                          {"one who renounces it", 1, {2}, false},
                          {"an account that is gone", 77, {}, false}};
    for (const Case& each : cases) {
        Call(each.caller);
        RequestContext::Current().Renounce(each.renounced);
        const int refused = each.sees ? 0 : -1;
        EXPECT_EQ(Event().Load(event, 0, 0, 0), refused) << each.who;
        EXPECT_EQ(AlertEvent().Load(alert, 0, 0, 0), refused) << each.who;
        EXPECT_EQ(PosEvent().Load(sale, 0, 0, 0), refused) << each.who;
        Camera camera;
        ASSERT_EQ(camera.Load(2, 0, 0), 0) << "handlers filter the records themselves";
        EXPECT_EQ(camera.GetStoragePath().empty(), !each.sees) << each.who;
        if (each.caller == 0 || each.caller == 77) {
            continue;  // has no lists
        }
        EventFilterParam filter;
        filter.m_CamIds = {1, 2};
        std::list<Event> events;
        EXPECT_EQ(EventListGetAll(events, filter), 0);
        EXPECT_EQ(events.size(), each.sees ? 1U : 0U) << each.who;
        EXPECT_EQ(GetCamMountMap(0, "", true).contains(2), each.sees) << each.who;
        CamGroup cameras;
        EXPECT_EQ(cameras.Load(group), 0);
        EXPECT_EQ(cameras.GetCamMap().contains(2), each.sees) << each.who;
    }
    Call(1);
    for (const auto& [id, mount, server, archive] : {std::array{event, 99, 0, 0},
                                                     {event, 0, 1, 0},
                                                     {event, 0, 0, 1},
                                                     {alert, 0, 0, 0},
                                                     {0, 0, 0, 0},
                                                     {-1, 0, 0, 0}}) {
        EXPECT_NE(Event().Load(id, mount, server, archive), 0) << id << ' ' << mount << ' ' << server << ' ' << archive;
    }
    EXPECT_NE(AlertEvent().Load(sale, 0, 0, 0), 0) << "another kind";
    EXPECT_NE(CamGroup().Load(99), 0);
    AlertEvent loaded;
    ASSERT_EQ(loaded.Load(alert, 0, 0, 0), 0);
    JpegExtractor extractor;
    ASSERT_EQ(extractor.Init(loaded.GetFullPath()), 0);
    EXPECT_EQ(Picture(extractor, 5), "picture 5") << "the footage of its span";
}

TEST_F(Binding, DeniesGroups) {
    const int group = store::Groups(footage_->Records()).Add({0, "yard", {3}});
    store::Users(footage_->Records()).DenyGroup(2, group, {store::CameraAccess::kPlayback});
    EXPECT_EQ(PrivProfileGetByUid(2).GetInaPrivPerCamGrpIdSet(CAM_PRIV_PLAYBACK), std::set<int>{group});
    EXPECT_EQ(PrivProfileGetByUid(2).GetInaPrivPerCamGrpIdSet(CAM_PRIV_AUDIO), std::set<int>{});
    EXPECT_EQ(PrivProfileGetByUid(PAIR_AUTH_UID).GetInaPrivPerCamGrpIdSet(CAM_PRIV_PLAYBACK), std::set<int>{});
    EXPECT_EQ(PrivProfileGetByUid(77).GetInaPrivPerCamGrpIdSet(CAM_PRIV_PLAYBACK), std::set<int>{});
    Call(2);
    EXPECT_FALSE(GetCamMountMap(0, "", true).contains(3));
    EXPECT_EQ(GetCamLocalList(false, std::to_string(group), "", false, false).size(), 1U);
}

TEST_F(Binding, KnowsTheCamerasOfAMount) {
    footage_->Record(3, kNoon, 1);
    store::Cameras(footage_->Records()).Remove(3);
    const int other = [&] {
        store::Mount mount;
        mount.name = "Other";
        mount.path = "/nowhere";
        return store::Mounts(footage_->Records()).Add(mount);
    }();
    store::RecordingPlan plan;
    plan.mount_id = other;
    store::RecordingPlans(footage_->Records()).Set(2, plan);
    const auto ids = [](int mount, const char* denied, bool with_deleted) {
        std::set<int> found;
        for (const auto& [id, camera] : GetCamMountMap(mount, denied, with_deleted)) {
            EXPECT_EQ(camera.m_Id, id);
            found.insert(id);
        }
        return found;
    };
    const int first = footage_->MountId();
    EXPECT_EQ(ids(0, "", true), (std::set<int>{1, 2, 3}));
    EXPECT_EQ(ids(0, "", false), (std::set<int>{1, 2}));
    EXPECT_EQ(ids(0, "1,3", true), (std::set<int>{2}));
    EXPECT_EQ(ids(first, "", true), (std::set<int>{1, 3}));
    EXPECT_EQ(ids(other, "", true), (std::set<int>{2}));
    EXPECT_EQ(ids(99, "", true), (std::set<int>{}));
    Camera camera;
    ASSERT_EQ(camera.Load(2, 0, 0), 0);
    EXPECT_EQ(camera.GetStoragePath(), "/nowhere/2");
}

TEST_F(Binding, FindsEventsAndTheirSeconds) {
    const int event = footage_->Record(1, kNoon, 5);
    footage_->Record(1, kNoon + 100, 5);
    struct Case {
        int mount, reason, state, offset;
        std::int64_t begin, end;
        std::size_t found;
    };
    const Case cases[] = {{0, 0, 0, 0, 0, kNoon * 2, 2},
                          {0, 0, 2, 0, kNoon + 4, kNoon + 5, 1},
                          {0, 0, 0, 0, kNoon + 5, kNoon + 100, 0},
                          {99, 0, 0, 0, 0, kNoon * 2, 0},
                          {0, REC_METHOD_ALARM, 0, 0, 0, kNoon * 2, 0},
                          {0, REC_METHOD_CONTINUOUS, 0, 1, 0, kNoon * 2, 1},
                          {0, 0, 0, 0, kNoon * 2, 0, 0},
                          {0, 0, 0, -5, -2'147'483'648, 2'147'483'647, 2}};
    for (const Case& each : cases) {
        EventFilterParam filter;
        filter.m_CamIds = {1};
        filter.m_MountId = each.mount;
        filter.m_Reason = static_cast<std::uint8_t>(each.reason);
        filter.m_RecordingState = each.state;
        filter.m_Offset = each.offset;
        filter.m_BeginTm = each.begin;
        filter.m_EndTm = each.end;
        std::list<Event> events;
        EXPECT_EQ(EventListGetAll(events, filter), 0);
        EXPECT_EQ(events.size(), each.found) << &each - cases;
    }
    EventFilterParam fresh;
    std::list<Event> events;
    EXPECT_EQ(EventListGetAll(events, fresh), 0);
    EXPECT_TRUE(events.empty()) << "no camera was named";
    Event found;
    ASSERT_EQ(found.Load(event, footage_->MountId(), 0, 0), 0);
    EXPECT_EQ(found.GetStartTm(), kNoon);
    EXPECT_EQ(found.GetEndTm(), kNoon + 5);
    EXPECT_EQ(found.GetFrameCount(), 50);
    EXPECT_EQ(found.GetSize(), 1'572'864U);
    Camera camera;
    ASSERT_EQ(camera.Load(1, 0, 0), 0);
    std::string seconds(12, 'x');
    auto* bytes = reinterpret_cast<unsigned char*>(seconds.data());
    ASSERT_EQ(ReadRecLog(camera.GetStoragePath(), kNoon - 3, 12, bytes), 0);
    EXPECT_EQ(seconds, std::string("\0\0\0\1\1\1\1\1\0\0\0\0", 12));
    store::Mount former;
    former.name = "Former";
    former.path = (folder_ / "former").string();
    std::filesystem::create_directories(folder_ / "former" / "1");
    store::Mounts(footage_->Records()).Add(former);
    archive::WriteRecordingLog(folder_ / "former" / "1", kNoon + 4, kNoon + 7, 3);
    ASSERT_EQ(ReadRecLog(camera.GetStoragePath(), kNoon - 3, 12, bytes), 0);
    EXPECT_EQ(seconds, std::string("\0\0\0\1\1\1\1\3\3\3\0\0", 12)) << "what it recorded elsewhere before";
    for (const auto& [path, duration] : {std::pair{std::string(), 12},
                                         {std::string("/nowhere/1"), 12},
                                         {camera.GetStoragePath(), 0},
                                         {camera.GetStoragePath(), -1}}) {
        EXPECT_NE(ReadRecLog(path, kNoon, duration, bytes), 0) << path << duration;
    }
}

TEST(FillRecLogMap, GivesRunsOfSteps) {
    struct Case {
        std::string recorded, covered;
        int interval;
        const char* map;
    };
    const Case cases[] = {{"000111000", "000000000", 1, R"({"interval":1,"runs":[[0,3],[1,3],[0,3]]})"},
                          {"000111000", "000011000", 3, R"({"interval":3,"runs":[[0,1],[2,1],[0,1]]})"},
                          {"00000000", "00000001", 5, R"({"interval":5,"runs":[[0,1],[2,1]]})"},
                          {"1111", "0000", 100, R"({"interval":100,"runs":[[1,1]]})"},
                          {"10", "00", 0, R"({"interval":1,"runs":[[1,1],[0,1]]})"},
                          {"10", "00", -2'147'483'647 - 1, R"({"interval":1,"runs":[[1,1],[0,1]]})"},
                          {"10", "00", 2'147'483'647, R"({"interval":2147483647,"runs":[[1,1]]})"},
                          {"", "", 5, R"({"interval":5,"runs":[]})"}};
    const auto bytes = [](std::string digits) {
        for (char& digit : digits) {
            digit = digit == '0' ? '\0' : '\xff';
        }
        return digits;
    };
    for (const Case& each : cases) {
        const std::string recorded = bytes(each.recorded);
        const std::string covered = bytes(each.covered);
        Json::Value map;
        FillRecLogMap(reinterpret_cast<const unsigned char*>(recorded.data()),
                      reinterpret_cast<const unsigned char*>(covered.data()), static_cast<int>(recorded.size()),
                      each.interval, map);
        Json::StreamWriterBuilder compact;
        compact["indentation"] = "";
        EXPECT_EQ(Json::writeString(compact, map), each.map);
    }
}

TEST(String2IntList, KeepsNumbersInOrder) {
    struct Case {
        std::string text, delimiter;
        std::list<int> numbers;
    };
    const Case cases[] = {{"", ",", {}},
                          {",,", ",", {}},
                          {"1,,x,2", ",", {1, 2}},
                          {" 3 ,\t4", ",", {3, 4}},
                          {"5,5,-7,0", ",", {5, 5, -7, 0}},
                          {"1x,0x2,+3,1.5,99999999999,6", ",", {6}},
                          {"1--2-3", "--", {1}},
                          {"1--2--3", "--", {1, 2, 3}},
                          {"12", "", {12}},
                          {std::string("1\0,2", 4), ",", {2}}};
    for (const Case& each : cases) {
        EXPECT_EQ(String2IntList(each.text, each.delimiter), each.numbers) << each.text;
    }
    std::string many;
    for (int i = 0; i < 100'000; ++i) {
        many += "x," + std::to_string(i) + ",";
    }
    const std::list<int> kept = String2IntList(many, ",");
    EXPECT_EQ(kept.size(), 4096U);
    EXPECT_EQ(kept.back(), 4095);
}

}  // namespace
}  // namespace lookhaven::binding
