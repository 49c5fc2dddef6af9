// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Event Watch: what is told to whom, in which order, and what a client finds that comes back.
#include <string>
#include <vector>

#include "standalone/base/clock.h"
#include "standalone/store/marks.h"
#include "test/component/api/event_fixture.h"
#include "test/component/api/stream_reader.h"

namespace lookhaven::api {

namespace {

using host::Eventually;

// A watch, read by the test.
class Watcher {
  public:
    Watcher(const HostUnderTest& host, const std::string& cookie, const std::string& after = "")
        : stream_(host.OpenQuery("api=VEXO.Event&version=1&method=Watch&after=" + after, cookie)) {}

    // The texts of the marks told so far, once that many were; what was told instead after five seconds.
    std::string Texts(std::size_t marks) {
        std::string told;
        Eventually([&] {
            stream_.Read();
            told.clear();
            std::size_t count = 0;
            for (std::size_t at = 0; (at = stream_.text.find(R"("text":[")", at)) != stream_.text.npos; ++count) {
                at += 9;
                told += stream_.text.substr(at, stream_.text.find('"', at) - at) + ' ';
            }
            return count >= marks;
        });
        return told;
    }
    // Waits for the first event.
    bool IsResumed() {
        Eventually([&] {
            stream_.Read();
            return stream_.text.find("\"resumed\":") != stream_.text.npos;
        });
        return stream_.text.find("\"resumed\":true") != stream_.text.npos;
    }
    // False for an answer that is no stream.
    bool Begins() {
        Eventually([&] {
            stream_.Read();
            return stream_.HasEnded() || stream_.text.find("event: start") != stream_.text.npos;
        });
        return !stream_.HasEnded();
    }
    // The place of the last event.
    std::string Place() const {
        const std::size_t at = stream_.text.rfind("\nid: ") + 5;
        return stream_.text.substr(at, stream_.text.find('\n', at) - at);
    }
    bool Ends() {
        return Eventually([&] {
            stream_.Read();
            return stream_.HasEnded();
        });
    }

  private:
    StreamReader stream_;
};

class WatchApi : public EventApi {
  protected:
    int Report(int camera, const std::string& text, std::int64_t ago_s = 0) {
        const std::int64_t now_s = base::WallSeconds() - ago_s;
        return store::Marks(footage_.Records()).Add(store::MarkKind::kAlert, camera, now_s, 0, text, {}, now_s).id;
    }
};

TEST_F(WatchApi, TellsEachWhatItMaySeeInTheOrderOfBeingReported) {
    Report(1, "before");
    Watcher all(host_, admin_);
    Watcher some(host_, viewer_);
    EXPECT_FALSE(all.IsResumed() || some.IsResumed());
    for (const auto& [camera, text] : {std::pair{1, "a"}, {2, "hidden"}, {1, "b"}, {3, "hidden"}, {1, "c"}}) {
        Report(camera, text);
    }
    EXPECT_EQ(all.Texts(5), "a hidden b hidden c ");
    EXPECT_EQ(some.Texts(3), "a b c ");
    const std::string place = some.Place();
    Report(2, "hidden");
    EXPECT_EQ(all.Texts(6), "a hidden b hidden c hidden ");
    EXPECT_EQ(some.Place(), place) << "tells nothing of what is hidden";
    store::Users(footage_.Records()).Deny(2, 1);
    Report(1, "denied");
    EXPECT_EQ(all.Texts(7), "a hidden b hidden c hidden denied ");
    EXPECT_TRUE(some.Ends()) << "with the session";
    EXPECT_EQ(some.Texts(3), "a b c ");
}

TEST_F(WatchApi, GoesOnWhereTheClientWasWithoutLossOrRepetition) {
    const std::int64_t now_s = base::WallSeconds();
    Watcher first(host_, viewer_);
    first.IsResumed();
    const std::string start = first.Place();
    for (const auto& [camera, text] : {std::pair{1, "a"}, {2, "hidden"}, {1, "b"}}) {
        Report(camera, text);
    }
    EXPECT_EQ(first.Texts(2), "a b ");
    const std::string told = first.Place();
    const int hidden = Report(3, "hidden");
    EXPECT_FALSE(Watcher(host_, viewer_, std::to_string(hidden) + '-' + std::to_string(now_s)).IsResumed())
        << "as for an event that does not exist";
    Report(1, "c");
    const std::string yesterday = std::to_string(now_s - 90'000);
    const std::string id = told.substr(0, told.find('-'));
    const struct {
        std::string after;
        bool is_resumed;
        std::string told;
    } rows[] = {
        {start, true, "a b c d "},
        {told, true, "c d "},
        {first.Place(), true, "c d "},
        {id + '-' + yesterday, false, "d "},
        {"999999-" + std::to_string(now_s), false, "d "},  // of a store that is not this one
        {"", false, "d "},
    };
    std::vector<Watcher> watchers;
    watchers.reserve(std::size(rows));
    for (const auto& row : rows) {
        EXPECT_EQ(watchers.emplace_back(host_, viewer_, row.after).IsResumed(), row.is_resumed) << row.after;
    }
    Report(1, "d");
    for (std::size_t i = 0; i < std::size(rows); ++i) {
        EXPECT_EQ(watchers[i].Texts(rows[i].told.size() / 2), rows[i].told) << rows[i].after;
    }
    store::Mark mark;
    mark.camera_id = 1, mark.start_s = mark.end_s = mark.moment_s = mark.reported_s = now_s;
    store::Marks(footage_.Records()).AddAll(std::vector(1'001, mark));
    EXPECT_FALSE(Watcher(host_, viewer_, told).IsResumed()) << "more reports than are repeated";
    for (const char* bad : {"x", "5", "-5-5", "5-", "5-x", "5-5x", "99999999999-5"}) {
        EXPECT_EQ(Ask(std::string("Event&version=1&method=Watch&after=") + bad).status, 400) << bad;
    }
}

TEST_F(WatchApi, OneAccountWatchesInFewPlaces) {
    std::vector<Watcher> watchers;
    watchers.reserve(16);
    for (int i = 0; i < 16; ++i) {
        watchers.emplace_back(host_, viewer_).IsResumed();
    }
    const std::string watch = "Event&version=1&method=Watch";
    EXPECT_EQ(Ask(watch, "", true).status, 503);
    EXPECT_FALSE(Watcher(host_, admin_).IsResumed()) << "others have theirs";
    EXPECT_EQ(Ask("Event&version=1&method=List", "", true).status, 200) << "a watch is no search";
    watchers.pop_back();
    EXPECT_TRUE(Eventually([&] { return Watcher(host_, viewer_).Begins(); }))
        << "one that is left gives its place back";
}

}  // namespace
}  // namespace lookhaven::api
