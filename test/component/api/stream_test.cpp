// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Event Stream: what whose stream has, how its parts are framed, when it ends, and what is refused.
#include <algorithm>
#include <fstream>

#include "standalone/archive/layout.h"
#include "standalone/archive/span_file.h"
#include "standalone/base/clock.h"
#include "standalone/base/text.h"
#include "standalone/store/marks.h"
#include "standalone/store/settings.h"
#include "test/component/api/event_fixture.h"
#include "test/component/api/stream_parts.h"
#include "test/component/api/stream_reader.h"
#include "test/support/footage/clips.h"

namespace lookhaven::api {
namespace {

constexpr std::int64_t kNoon = 1'772'366'400;
constexpr const char* kSound = "-c:a aac -ar 16000";

class StreamApi : public EventApi {
  protected:
    // Four seconds as a finished event.
    int Record(int camera, const char* video, const char* audio = "") {
        const int event = footage_.Record(camera, kNoon, 4);
        const std::filesystem::path path = footage_.FileOf(event);
        std::filesystem::remove(path);
        std::filesystem::remove(archive::IndexPathOf(path));
        test::Record(test::MakeClip(video, audio), path, true, SIZE_MAX, kNoon * 1000);
        return event;
    }
    static std::string Query(int event, const std::string& more = "&rate=4") {
        return "Event&version=1&method=Stream&timestamp=1&event=" + std::to_string(event) + more;
    }
    StreamReader Open(const std::string& query) const {
        return StreamReader(host_.OpenQuery("api=VEXO." + query, admin_));
    }
    static std::string Base64(const std::vector<std::uint8_t>& bytes) {
        return base::ToBase64({reinterpret_cast<const char*>(bytes.data()), bytes.size()});
    }
    static bool Holds(StreamReader& stream, const std::string& text) {
        return host::Eventually([&] {
            stream.Read();
            return stream.text.find(text) != stream.text.npos;
        });
    }
    static bool Ends(StreamReader& stream) {
        return host::Eventually([&] {
            stream.Read();
            return stream.HasEnded();
        });
    }
};

TEST_F(StreamApi, SendsVideoAndSoundFromTheKeyFrameOn) {
    const int event = Record(1, test::kH264, kSound);
    const int alert = footage_.Mark(1, 1, kNoon + 1, 2, "door", event);
    const auto of_alert = "Event&version=1&method=Stream&timestamp=1&kind=alert&event=" + std::to_string(alert);
    const struct {
        std::string query;
        std::int64_t first_ms, last_ms;  // since noon
        int number;                      // of the first frame that has one
    } rows[] = {
        {Query(event), 0, 3960, 0},
        {Query(event, "&rate=4&time_ms=" + std::to_string(kNoon * 1000 + 2010)), 2000, 3960, 50},
        {Query(event, "&rate=4&frame=49"), 1000, 3960, 25},
        {Query(event, "&rate=4&time_ms=" + std::to_string(kNoon * 1000 + 99'000)), 3000, 3960, 75},
        {of_alert, 1000, 2960, 0},
        {"Event&version=1&method=Stream&timestamp=1&camera=1&time_ms=" + std::to_string(kNoon * 1000 + 2500), 2000,
         3960, 50},
    };
    const test::Clip& clip = test::MakeClip(test::kH264, kSound);
    for (const auto& row : rows) {
        SCOPED_TRACE(row.query);
        const Answer answer = Ask(row.query);
        ASSERT_EQ(answer.status, 200);
        EXPECT_EQ(answer.headers.at("Cache-Control"), "no-store");
        const Parts parts(answer);
        EXPECT_TRUE(parts.is_whole);
        ASSERT_GT(parts.Count(true), 0U);
        EXPECT_EQ(parts.Count(true), static_cast<std::size_t>(row.last_ms - row.first_ms) / 40 + 1);
        EXPECT_GT(parts.Count(false), parts.Count(true) / 2);
        EXPECT_TRUE(parts.all.front().IsVideo());
        EXPECT_EQ(parts.all.front().CapturedMs(), kNoon * 1000 + row.first_ms);
        EXPECT_EQ(parts.all.front().head.at("X-Frame"), std::to_string(row.number));
        EXPECT_NE(parts.all.front().body.find(std::string("\0\0\1\x67", 4)), std::string::npos) << "a parameter set";
        std::int64_t captured_ms = 0;
        for (const StreamPart& part : parts.all) {
            EXPECT_EQ(part.head.at("X-Codecs"), "H264;AAC");
            EXPECT_EQ(part.head.at("X-Video-Extra"), Base64(clip.format.video.extra_data));
            EXPECT_EQ(part.head.at("X-Audio-Extra"), Base64(clip.format.audio->extra_data));
            if (part.IsVideo()) {
                captured_ms = part.CapturedMs();
            } else {
                EXPECT_NEAR(static_cast<double>(part.CapturedMs()), static_cast<double>(captured_ms), 200);
            }
            EXPECT_EQ(std::stoll(part.head.at("X-Timestamp")) - std::stoll(parts.all.front().head.at("X-Timestamp")),
                      (part.CapturedMs() - parts.all.front().CapturedMs()) * 1000);
        }
        EXPECT_EQ(captured_ms, kNoon * 1000 + row.last_ms);
    }
}

TEST_F(StreamApi, HasWhatItsCallerMaySeeAndHear) {
    const int first = Record(1, test::kH264, kSound);
    const int second = Record(2, test::kH264, kSound);
    EXPECT_GT(Parts(Ask(Query(first), "", true)).Count(false), 0U);
    EXPECT_EQ(Ask(Query(second), "", true).status, 404) << "of a camera that is denied";
    EXPECT_EQ(Ask(Query(second), "", true).body, Ask(Query(99), "", true).body) << "hidden is absent";
    EXPECT_EQ(Ask("Event&version=1&method=Stream&timestamp=1&camera=2&time_ms=9999999999999", "", true).status, 404);
    EXPECT_EQ(host_.Ask("api=VEXO." + Query(first), "").status, 401);
    store::Users(footage_.Records()).Deny(2, 1, {store::CameraAccess::kAudio});
    viewer_ = host_.LogIn("guest").secret;
    const Parts silent(Ask(Query(first), "", true));
    EXPECT_EQ(silent.Count(true), 100U);
    EXPECT_EQ(silent.Count(false), 0U);
    EXPECT_EQ(silent.all.front().head.at("X-Codecs"), "H264;");
    EXPECT_EQ(silent.all.front().head.at("X-Audio-Extra"), "");
    store::Users(footage_.Records()).Deny(2, 1, {store::CameraAccess::kPlayback});
    viewer_ = host_.LogIn("guest").secret;
    EXPECT_EQ(Ask(Query(first), "", true).status, 404);
}

TEST_F(StreamApi, RefusesWhatItCannotSend) {
    const int h264 = Record(1, test::kH264);
    const int h265 = Record(1, test::kH265);
    const int mjpeg = footage_.Record(1, kNoon, 1);
    const auto damaged = [this](auto damage) {
        const int event = Record(1, test::kH264);
        damage(footage_.FileOf(event));
        return event;
    };
    const struct {
        const char* what;
        std::string query;
        int status;
    } rows[] = {
        {"another codec", Query(mjpeg), 406},
        {"and if the client thinks so", Query(mjpeg, "&codecs=MJPEG"), 406},
        {"one that the client does not name", Query(h265), 406},
        {"one that it names", Query(h265, "&rate=4&codecs=H264,H265"), 200},
        {"one that it does not name any more", Query(h264, "&codecs=H265"), 406},
        {"no rate", Query(h264, "&rate=0"), 400},
        {"too fast", Query(h264, "&rate=5"), 400},
        {"too slow", Query(h264, "&rate=-9"), 400},
        {"a number of the wrong type", Query(h264, "&rate=x"), 400},
        {"a frame beyond", Query(h264, "&frame=100"), 404},
        {"no player's number", "Event&version=1&method=Stream&event=" + std::to_string(h264), 400},
        {"no event", "Event&version=1&method=Stream&timestamp=1", 400},
        {"no index", Query(damaged([](auto path) { std::filesystem::remove(archive::IndexPathOf(path)); })), 500},
        {"no file", Query(damaged([](auto path) { std::filesystem::remove(path); })), 404},
        {"an empty file", Query(damaged([](auto path) { std::filesystem::resize_file(path, 0); })), 404},
        {"no head", Query(damaged([](auto path) {
             std::fstream(path, std::ios::in | std::ios::out | std::ios::binary) << std::string(600, 'x');
         })),
         500},
    };
    for (const auto& row : rows) {
        const Answer answer = Ask(row.query);
        EXPECT_EQ(answer.status, row.status) << row.what;
        EXPECT_TRUE(row.status == 200 || answer.Json()["error"]["message"].asString().size() > 10) << row.what;
    }
    EXPECT_TRUE(host::Eventually([&] { return host_.RequestProcesses() == 0; })) << "nothing is left";
}

TEST_F(StreamApi, FollowsAnEventUntilItEnds) {
    const test::Clip& clip = test::MakeClip(test::kH264, kSound);
    store::Event open = store::Events(footage_.Records()).Find(footage_.Record(1, kNoon, 4)).value();
    const std::int64_t start_ms = base::WallMillis();
    open.id = store::Events(footage_.Records()).NextId();
    open.recording = true;
    open.start_s = start_ms / 1000;
    open.end_s = open.start_s + 1;
    const archive::FileName name{1, open.start_s, open.id, archive::FileKind::kRecording};
    open.path = archive::PathOf(name);
    archive::MakeFolderFor(footage_.Mount(), name);
    media::RecordingWriter writer(footage_.Mount() / open.path, clip.format, start_ms, 1);
    std::size_t written = 0;
    for (; written < clip.packets.size() / 2; ++written) {
        writer.Write(clip.At(written));
    }
    writer.Flush();
    store::Events(footage_.Records()).Begin(open);
    StreamReader stream = Open(Query(open.id));
    EXPECT_TRUE(Holds(stream, "X-Frame: 40\r\n"));
    EXPECT_FALSE(stream.HasEnded());
    for (; written < clip.packets.size(); ++written) {
        writer.Write(clip.At(written));
    }
    writer.Flush();
    EXPECT_TRUE(Holds(stream, "X-Frame: 80\r\n"));
    writer.Close();
    EXPECT_TRUE(Ends(stream));
    const std::size_t head_end = stream.text.find("\r\n\r\n");
    const std::string head = stream.text.substr(0, head_end);
    const std::size_t type = head.find("Content-Type: ");
    const Parts parts(head.substr(type, head.find("\r\n", type) - type), stream.text.substr(head_end + 4));
    EXPECT_EQ(parts.Count(true), 100U);
    EXPECT_TRUE(parts.is_whole);
}

TEST_F(StreamApi, SaysWhyItDoesNotGoOn) {
    const int event = Record(1, test::kH264);
    const int other = Record(1, test::kH265);
    const int alert = footage_.Mark(1, 1, kNoon, 8, "door", event);
    const std::filesystem::path first = footage_.FileOf(event), second = footage_.FileOf(other);
    const auto name = [](const std::filesystem::path& path) { return path.parent_path().filename() / path.filename(); };
    archive::WriteSpan(footage_.Mount() / store::Marks(footage_.Records()).Find(store::MarkKind::kAlert, alert)->path,
                       {kNoon * 1000, (kNoon + 8) * 1000, {name(first), name(second)}});
    const Parts span(Ask(Query(alert, "&kind=alert&rate=4")));
    ASSERT_FALSE(span.all.empty());
    EXPECT_EQ(span.Count(true), 100U);
    EXPECT_FALSE(span.is_whole);
    EXPECT_EQ(span.all.back().body, "footage in H265 is not streamed to this client: play its pictures");
    StreamReader stream = Open(Query(event, "&rate=-2"));
    EXPECT_TRUE(Holds(stream, "X-Frame: 0\r\n"));
    std::filesystem::resize_file(first, 1000);
    EXPECT_TRUE(Ends(stream));
    EXPECT_NE(stream.text.find("\r\n\r\nthe recording cannot be read\r\n"), std::string::npos);
}

TEST_F(StreamApi, GoesNoFasterThanItsRateAndABit) {
    StreamReader stream = Open(Query(Record(1, test::kH264), "&rate=-8"));
    // Two seconds ahead: a quarter of a second of the recording.
    EXPECT_TRUE(Holds(stream, "X-Frame: 6\r\n"));
    EXPECT_EQ(stream.text.find("X-Frame: 60\r\n"), stream.text.npos) << "which is due in 17 seconds";
}

TEST_F(StreamApi, IsAPlayerOfItsSession) {
    store::Settings(footage_.Records()).Set("players_per_session", "1");
    const store::NewSession session = host_.LogIn();
    admin_ = session.secret;
    const int event = Record(1, test::kH264);
    const std::string slow = "Event&version=1&method=Stream&rate=-8&event=" + std::to_string(event) + "&timestamp=";
    const auto begin = [&](int key) {
        StreamReader stream = Open(slow + std::to_string(key));
        EXPECT_TRUE(Holds(stream, "X-Frame: 0\r\n"));
        return stream;
    };
    StreamReader older = begin(1);
    StreamReader newer = begin(2);
    EXPECT_TRUE(Ends(older)) << "one at a time";
    EXPECT_TRUE(host::Eventually([&] { return host_.RequestProcesses() == 1; }));
    EXPECT_EQ(Ask("Playback&version=1&method=Stop", "timestamp=1").status, 404);
    EXPECT_EQ(Ask("Playback&version=1&method=SetRate", "timestamp=2&rate=2").status, 409);
    EXPECT_EQ(Ask("Playback&version=1&method=Pause", "timestamp=2&on=true").status, 409);
    EXPECT_EQ(Ask("Playback&version=1&method=CheckOwner", "timestamp=2").Json()["data"]["owner"], true);
    EXPECT_EQ(Ask("Playback&version=1&method=Stop", "timestamp=2").status, 200);
    EXPECT_TRUE(Ends(newer));
    EXPECT_EQ(newer.text.find("--\r\n", newer.text.size() - 4), newer.text.npos) << "which is not the footage's end";
    EXPECT_EQ(Ask(Query(footage_.Record(1, kNoon, 1))).status, 406);
    StreamReader left = begin(3);
    EXPECT_EQ(Ask(Query(footage_.Record(1, kNoon, 1))).status, 406);
    left.Read();
    EXPECT_FALSE(left.HasEnded()) << "what is refused takes nobody's place";
    left.Close();
    EXPECT_TRUE(host::Eventually([&] { return host_.RequestProcesses() == 0; })) << "the client hung up";
    StreamReader last = begin(4);
    EXPECT_EQ(Ask("Auth&version=1&method=Logout", "x=1").status, 200);
    EXPECT_TRUE(Ends(last)) << "with its session";
    EXPECT_TRUE(host::Eventually([&] { return host_.RequestProcesses() == 0; }));
    EXPECT_TRUE(host::Eventually([&] { return !std::filesystem::exists("/tmp/player_src.pid." + session.handle); }));
}

}  // namespace
}  // namespace lookhaven::api
