// SPDX-License-Identifier: Apache-2.0
//
// Runs a player of recorded events against the scripted platform.
#pragma once

#include <csignal>
#include <cstdio>
#include <fstream>
#include <functional>
#include <map>
#include <sstream>
#include <string>

#include <unistd.h>

#include "player/mjpegstreamer/mjpegstreamer.h"
#include "player/mjpegstreamer/player_session.h"
#include "test/support/platform/scripted_platform.h"

namespace lookhaven::test {

inline const char* const kByIndex = "PlayMjpegEvent";
inline const char* const kByTime = "PlayMjpegEventNoFrameId";
inline const std::string kSession = "unit" + std::to_string(getpid());
inline const std::string kPidFile = "/tmp/player_src.pid." + kSession;
inline constexpr char kRedirect[] =
    "Location: /webman/3rdparty/Lookhaven/resources/images/2x/components/icon_indicator_warning.png\r\n\r\n";

inline void WritePidFile(const std::string& text) {
    std::ofstream(kPidFile) << text;
}

// The file's text, "none" without one.
inline std::string PidFile() {
    std::ifstream file(kPidFile);
    std::ostringstream text;
    text << file.rdbuf();
    return file ? text.str() : "none";
}

// A request to play event 3, of 100 frames at 10 fps, as stream 5.
struct Player : ScriptedPlatform {
    explicit Player(const char* played) {
        g_PlayerStop = g_PlayerCheckPid = g_PlayerPause = 0;
        method = played;
        session_id = kSession;
        log_cfg.m_CategLevel[68] = 1;
        events[3] = MakeEvent(3, 100, 110);
        params = {{"eventid", 3}, {"timestamp", 5}};
    }
    ~Player() { std::remove(kPidFile.c_str()); }

    // Returns what was written to standard output. plan: changes by the number of the picture, from 1, at which they
    // happen; 0: before the first; -2: in the wait after the second. SIGTERM is raised at the last picture.
    std::string Run(const std::map<int, Change>& plan, int last_picture) {
        int pictures = 0;
        on_call = [&](const std::string& call) {
            const bool is_picture = call.rfind("Write(image/jpeg", 0) == 0;
            pictures += is_picture;
            const bool is_wait = call == "Delay()";
            const auto planned = plan.find(is_wait ? -pictures : pictures);
            if ((is_picture || is_wait || call == "BeginTiming()") && planned != plan.end()) {
                planned->second(*this);
            }
            if (is_picture && pictures == last_picture) {
                std::raise(SIGTERM);
            }
        };
        StdoutCapture capture;
        MjpegStreamHandler(Request(), Response()).HandleProcess();
        on_call = nullptr;  // gtest flushes standard output too
        return capture.Text();
    }

    // What follows the text up to the next comma or bracket, in each call that begins with it; joined.
    std::string All(const std::string& text) const {
        std::string all;
        for (const auto& call : CallsOf(text)) {
            all += call.substr(text.size(), call.find_first_of(",)", text.size()) - text.size()) + " ";
        }
        return all;
    }

    // The pictures sent: 4:P4 for one after its index, P4 for one without.
    std::string Frames() const {
        std::string sent;
        for (const auto& call : calls) {
            if (call.rfind("Write(text/plain,", 0) == 0) {
                sent += call.substr(17, call.find("\r\n,") - 17) + ":";
            } else if (call.rfind("Write(image/jpeg,", 0) == 0) {
                sent += call.substr(17, call.find(',', 17) - 17) + " ";
            }
        }
        return sent;
    }
};

inline Change Frames(int count) {
    return [count](ScriptedPlatform& p) { p.frame_count = count; };
}
inline Change ClientSets(int number) {
    return [number](ScriptedPlatform& p) { p.client_number = number; };
}
inline Change Signal(int signal) {
    return [signal](ScriptedPlatform&) { std::raise(signal); };
}

inline const Calls kSignals = {"sigaction(15,0,no mask)", "sigaction(10,0,no mask)", "sigaction(12,0,no mask)"};
inline const Calls kOpen = {"Event::Load(3,0,0,0)", "IsFileExist(/rec/3)", "ProgressIndicator(5,1,1)",
                            "DelayTimer(0)",        "Init(/rec/3)",        "GetFrameInfo()"};
inline const Calls kPace = {"SetDelayTime(100000)", "BeginTiming()"};
inline const Calls kPicture = {"Write(image/jpeg,P0,2,null)", "fflush()"};

}  // namespace lookhaven::test
