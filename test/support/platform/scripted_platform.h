// SPDX-License-Identifier: Apache-2.0
//
// Test double of the platform: answers from a script, and records in order the module's calls of it and of the system.
#pragma once

#include <csignal>
#include <ctime>
#include <deque>
#include <functional>
#include <list>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include <json/json.h>
#include <pthread.h>

#include "platform/camera/camera.h"
#include "platform/emap/emap.h"
#include "platform/live/commoncfg.h"
#include "platform/live/livestream.h"
#include "platform/log/dbglogcfg.h"
#include "platform/recording/event.h"
#include "platform/webapi/apirequest.h"
#include "platform/webapi/apiresponse.h"

namespace lookhaven::test {

using Calls = std::vector<std::string>;
Calls operator+(Calls left, const Calls& right);

struct LogLine {
    std::string categ, level, file;  // "null" for a null pointer
    int line;
    std::string func, text;
};

// The result of one read of a ring.
struct ScriptedFrame {
    int seq = 1;
    std::string data = "JPEG";  // including the offset's bytes
    int offset = 0;
    int length = -1;  // -1: of data
    bool is_key = false;
    long long timestamp = 0;
};

using ScriptedFrames = std::deque<std::optional<ScriptedFrame>>;

enum class Sound { kYes, kNo, kNoTarget, kNoFunctor, kWrongType };

class ScriptedPlatform;
// A change that a test makes to the script.
using Change = std::function<void(ScriptedPlatform&)>;

// While one exists it is the platform of the process, and decides about sleep, usleep, time, sigaction, shmdt and the
// state of standard output. Every call is first recorded, then passed to on_call, which may throw.
class ScriptedPlatform {
  public:
    ScriptedPlatform();
    ~ScriptedPlatform();
    ScriptedPlatform(const ScriptedPlatform&) = delete;
    ScriptedPlatform& operator=(const ScriptedPlatform&) = delete;

    void Record(const std::string& call);
    VEXO::APIRequest* Request();
    VEXO::APIResponse* Response();
    // The recorded calls, from the first that begins with the text.
    Calls CallsFrom(const std::string& text) const;
    // The recorded calls that begin with the text.
    Calls CallsOf(const std::string& text) const;

    Calls calls;
    std::vector<LogLine> logs;
    std::function<void(const std::string& call)> on_call;
    std::map<std::string, Change> at;  // by the text of the call at which the change is made

    std::string method, session_id = "5e55";
    std::map<std::string, Json::Value> params;
    std::map<std::string, std::string> cookies;
    bool is_authorized = false, has_app_priv = false, is_admin = false, has_user_priv = false;
    std::string user_name = "eve";
    unsigned int login_uid = 7;

    bool is_cms_host = false, is_running = true, pair_matches = false;
    int owner_host = 0;

    int profile_id = 1, privilege = 2;
    std::set<int> denied_cameras, muted_cameras, denied_groups;

    std::map<int, Camera> cameras;  // for Load
    std::list<Camera> camera_list;  // for GetCamLocalList
    int login_port = 5000;
    std::set<int> cap_failures;
    std::map<int, Sound> sound;

    bool has_stream = true;
    ScriptedFrames frames;  // after the last, standard output is at its end
    bool has_audio_stream = true;
    ScriptedFrames audio_frames;
    std::optional<ScriptedFrame> newest_key_frame;
    std::string video_codec = "H264", audio_codec = "AAC", video_extra = "V", audio_extra = "A";
    std::map<const void*, std::string> positions = {{nullptr, "null"}};  // readers of a ring, with their names

    std::map<int, Event> events;  // for Load, whatever the kind
    bool has_file = true;         // under any name but the empty one
    int init_result = 0, frame_info_result = 0;
    float frame_rate = 10;
    int frame_count = 100, grown_by = 0;  // as reported, and frames that can be read beyond that
    std::set<int> broken_frames;
    int client_number = -1;  // what the client set on a player's channel
    int progress_result = 0, timely_play_result = 0;
    bool has_memory = true;  // for a block of 2 MiB

    std::list<Event> found_events;
    std::map<int, Camera> group_cameras, mount_cameras;
    int group_result = 0, rec_log_result = 0;

    bool has_emap = true;
    std::string image_name = "floor.old.png";
    std::vector<std::optional<__tag_EMAP_ITEM_INFO>> emap_items;  // nullopt: GetItem fails
    std::set<int> unknown_devices, denied_emaps, denied_doors, denied_modules;

    LHShmCommonCfg common_cfg;
    bool has_common_cfg = true;
    DbgLogCfg log_cfg = {};

    std::time_t now = 1700000000;  // wall clock; sleeping moves both
    long monotonic_now = 1000000;
    int lock_result = 0;  // of common_cfg's mutex, which is locked all the same
    std::set<int> failing_signals;
    bool flush_fails = false;
    int write_result = 0;  // of multipart output
    bool is_eof = false, is_error = false;
    const void* watched_mutex = nullptr;  // its calls are recorded, and destruction of a profile
    std::list<std::vector<std::uint32_t>> entries;
};

// The one that exists, or null.
ScriptedPlatform* CurrentPlatform();

inline void Nothing(ScriptedPlatform&) {}
inline Change Params(const std::map<std::string, Json::Value>& params) {
    return [params](ScriptedPlatform& platform) {
        for (const auto& [name, value] : params) {
            platform.params[name] = value;
        }
    };
}
inline Change At(const std::string& call, const Change& change) {
    return [=](ScriptedPlatform& p) { p.at[call] = change; };
}
inline Change operator+(const Change& first, const Change& second) {
    return [=](ScriptedPlatform& p) { first(p), second(p); };
}

// The address that stands for an audio ring.
ShmStreamFifo* AudioRing();

// A camera with one stream per profile, numbered 10 · id + profile.
Camera MakeCamera(int id, int video_type, bool enabled = true);

// A saved event with sound.
Event MakeEvent(int id, int start, int end, int rec_method = REC_METHOD_CONTINUOUS);

// Redirects standard output to a file while it exists. Its own flushes are not recorded.
class StdoutCapture {
  public:
    StdoutCapture();
    ~StdoutCapture();
    StdoutCapture(const StdoutCapture&) = delete;
    StdoutCapture& operator=(const StdoutCapture&) = delete;
    std::string Text();

  private:
    int saved_;
    std::FILE* file_;
};

}  // namespace lookhaven::test
