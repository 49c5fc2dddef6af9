// SPDX-License-Identifier: Apache-2.0
//
// A web API module whose methods behave in every way that a host must be ready for.
#include <atomic>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <list>
#include <stdexcept>
#include <string>
#include <vector>

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include "platform/admission/pairauth.h"
#include "platform/log/dbglogcfg.h"
#include "platform/output/multipartresponse.h"
#include "platform/recording/eventsearch.h"
#include "platform/webapi/apirequest.h"
#include "platform/webapi/apiresponse.h"
#include "test/support/host/test_player.h"

namespace {

using VEXO::APIRequest;
using VEXO::APIResponse;

std::atomic<bool> g_stop;

void StopOnSigterm() {
    struct sigaction action {};
    action.sa_handler = [](int) { g_stop = true; };
    sigaction(SIGTERM, &action, nullptr);
}

// Leaves SIGTERM alone until that many pictures are sent; -1: for good.
void Stream(int deaf_pictures) {
    MultipartResponse response;
    for (int sent = 0; !g_stop; ++sent) {
        if (sent == deaf_pictures) {
            StopOnSigterm();
        }
        response.Write("image/jpeg", "picture", 7, nullptr);
        usleep(10'000);
    }
}

Json::Value SetOfSignals(const sigset_t& signals) {
    Json::Value numbers(Json::arrayValue);
    for (int number = 1; number < 32; ++number) {
        if (sigismember(&signals, number) == 1) {
            numbers.append(number);
        }
    }
    return numbers;
}

// What a request process finds around itself.
Json::Value Surroundings() {
    Json::Value found;
    sigset_t mask;
    sigset_t ignored;
    sigemptyset(&ignored);
    sigprocmask(SIG_SETMASK, nullptr, &mask);
    for (int number = 1; number < 32; ++number) {
        struct sigaction action {};
        if (sigaction(number, nullptr, &action) == 0 && action.sa_handler == SIG_IGN) {
            sigaddset(&ignored, number);
        }
    }
    found["masked"] = SetOfSignals(mask);
    found["ignored"] = SetOfSignals(ignored);
    found["nonblocking"] = (fcntl(STDOUT_FILENO, F_GETFL) & O_NONBLOCK) != 0;
    found["log_pid"] = g_DbgLogPid;
    found["highest_descriptor"] = 0;
    for (int descriptor = 0; descriptor < 1024; ++descriptor) {
        if (fcntl(descriptor, F_GETFD) >= 0) {
            found["highest_descriptor"] = descriptor;
        }
    }
    return found;
}

Json::Value Caller(const APIRequest& request) {
    Json::Value caller;
    caller["uid"] = request.GetLoginUID();
    caller["name"] = request.GetLoginUserName();
    caller["session"] = request.GetSessionID();
    caller["ip"] = request.GetRemoteIP();
    caller["admin"] = request.IsAdmin();
    caller["authorized"] = request.IsAuthorized();
    caller["pid"] = getpid();
    return caller;
}

void Play(APIRequest* request, APIResponse*) {
    PlayTest(*request);
}

void Serve(APIRequest* request, APIResponse* response) {
    const std::string method = request->GetAPIMethod();
    if (method == "Success") {
        response->SetSuccess(request->GetParam("", Json::nullValue));
    } else if (method == "Error") {
        response->SetSuccess(1);
        response->SetError(401, "param");
    } else if (method == "Silenced") {
        response->SetSuccess(1);
        response->SetEnableOutput(false);
    } else if (method == "Throw") {
        throw std::runtime_error("thrown on purpose");
    } else if (method == "ThrowNumber") {
        throw 5;
    } else if (method == "WrongType") {
        request->GetParam("text", 0).asInt();
    } else if (method == "Raw") {
        std::printf("Content-Type: text/plain\r\n\r\nraw");
        response->SetSuccess("not after raw bytes");
    } else if (method == "RawThenThrow") {
        std::printf("Content-Type: text/plain\r\n\r\nhalf");
        throw std::runtime_error("thrown on purpose");
    } else if (method == "EmptyStream") {
        const MultipartResponse nothing;
    } else if (method == "PeerStream") {
        if (IsAuthPairMatch(request->GetParam("cookie", "").asString(),
                            request->GetParam("timestamp", "").asString())) {
            Stream(-1);
        }
    } else if (method == "Stream") {
        Stream(0);
    } else if (method == "LateStream" || method == "DeafStream") {
        signal(SIGTERM, SIG_IGN);
        Stream(method == "LateStream" ? 30 : -1);
    } else if (method == "Hang") {
        for (;;) {
            pause();
        }
    } else if (method == "Devour") {
        if (request->GetParam("stream", false).asBool()) {
            const MultipartResponse nothing;
        }
        std::vector<char> much;
        much.reserve(std::size_t{300} << 20);
        response->SetSuccess(much.emplace_back());
    } else if (method == "Search") {
        std::list<Event> events;
        EventFilterParam everything;
        EventListGetAll(events, everything);
        response->SetSuccess(static_cast<Json::UInt>(events.size()));
    } else if (method == "Crash") {
        std::abort();
    } else if (method == "Surroundings") {
        response->SetSuccess(Surroundings());
    } else if (method == "Caller") {
        response->SetSuccess(Caller(*request));
    }
}

struct Row {
    const char* api;
    int version;
    const char* method;
    void (*entry)(APIRequest*, APIResponse*);
};

const Row kTable[] = {{"Test", 1, "Nothing", Serve},
                      {"Test", 1, "Success", Serve},
                      {"Test", 1, "Error", Serve},
                      {"Test", 1, "Silenced", Serve},
                      {"Test", 1, "Throw", Serve},
                      {"Test", 1, "ThrowNumber", Serve},
                      {"Test", 1, "WrongType", Serve},
                      {"Test", 1, "Raw", Serve},
                      {"Test", 1, "RawThenThrow", Serve},
                      {"Test", 1, "EmptyStream", Serve},
                      {"Test", 1, "Stream", Serve},
                      {"Test", 1, "LateStream", Serve},
                      {"Test", 1, "DeafStream", Serve},
                      {"Test", 1, "Hang", Serve},
                      {"Test", 1, "Devour", Serve},
                      {"Test", 1, "Search", Serve},
                      {"Test", 1, "Crash", Serve},
                      {"Test", 1, "Surroundings", Serve},
                      {"Test", 1, "Caller", Serve},
                      {"VEXO.Lookhaven.Player.LiveviewSrc", 1, "Nothing", Serve},
                      {"VEXO.Lookhaven.Player.LiveviewSrc", 1, "EmptyStream", Serve},
                      {"VEXO.Lookhaven.Player.LiveviewSrc", 1, "Success", Serve},
                      {"VEXO.Lookhaven.Player.LiveviewSrc", 1, "PeerStream", Serve},
                      {"VEXO.Lookhaven.Player", 1, "PlayMjpegEvent", Play},
                      {"VEXO.Lookhaven.Player", 1, "PlayMjpegEventNoFrameId", Play},
                      {nullptr, 0, nullptr, nullptr}};

}  // namespace

extern "C" LH_PLATFORM_API const void* GetAPITable() {
    return kTable;
}
