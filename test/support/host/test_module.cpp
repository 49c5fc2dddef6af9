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

// What a request process finds around itself.
Json::Value Environment() {
    Json::Value found;
    found["masked"] = found["ignored"] = Json::arrayValue;
    sigset_t mask;
    sigprocmask(SIG_SETMASK, nullptr, &mask);
    for (int number = 1; number < 32; ++number) {
        if (sigismember(&mask, number) == 1) {
            found["masked"].append(number);
        }
        struct sigaction action {};
        if (sigaction(number, nullptr, &action) == 0 && action.sa_handler == SIG_IGN) {
            found["ignored"].append(number);
        }
    }
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

void Nothing(APIRequest*, APIResponse*) {}

void Success(APIRequest* request, APIResponse* response) {
    response->SetSuccess(request->GetParam("", Json::nullValue));
}

void EmptyStream(APIRequest*, APIResponse*) {
    const MultipartResponse nothing;
}

void Play(APIRequest* request, APIResponse*) {
    PlayTest(*request);
}

struct Row {
    const char* api;
    int version;
    const char* method;
    void (*entry)(APIRequest*, APIResponse*);
};

const Row kTable[] = {
    {"Test", 1, "Nothing", Nothing},
    {"Test", 1, "Success", Success},
    {"Test", 1, "EmptyStream", EmptyStream},
    {"Test", 1, "Error",
     [](APIRequest*, APIResponse* response) {
         response->SetSuccess(1);
         response->SetError(401, "param");
     }},
    {"Test", 1, "Silenced",
     [](APIRequest*, APIResponse* response) {
         response->SetSuccess(1);
         response->SetEnableOutput(false);
     }},
    {"Test", 1, "Throw", [](APIRequest*, APIResponse*) { throw std::runtime_error("thrown on purpose"); }},
    {"Test", 1, "ThrowNumber", [](APIRequest*, APIResponse*) { throw 5; }},
    {"Test", 1, "WrongType", [](APIRequest* request, APIResponse*) { request->GetParam("text", 0).asInt(); }},
    {"Test", 1, "Raw",
     [](APIRequest*, APIResponse* response) {
         std::printf("Content-Type: text/plain\r\n\r\nraw");
         response->SetSuccess("not after raw bytes");
     }},
    {"Test", 1, "RawThenThrow",
     [](APIRequest*, APIResponse*) {
         std::printf("Content-Type: text/plain\r\n\r\nhalf");
         throw std::runtime_error("thrown on purpose");
     }},
    {"Test", 1, "Stream", [](APIRequest*, APIResponse*) { Stream(0); }},
    {"Test", 1, "LateStream",
     [](APIRequest*, APIResponse*) {
         signal(SIGTERM, SIG_IGN);
         Stream(30);
     }},
    {"Test", 1, "DeafStream",
     [](APIRequest*, APIResponse*) {
         signal(SIGTERM, SIG_IGN);
         Stream(-1);
     }},
    {"Test", 1, "Hang",
     [](APIRequest*, APIResponse*) {
         for (;;) {
             pause();
         }
     }},
    {"Test", 1, "Devour",
     [](APIRequest* request, APIResponse* response) {
         if (request->GetParam("stream", false).asBool()) {
             const MultipartResponse nothing;
         }
         std::vector<char> much;
         much.reserve(std::size_t{300} << 20);
         response->SetSuccess(much.emplace_back());
     }},
    {"Test", 1, "Search",
     [](APIRequest*, APIResponse* response) {
         std::list<Event> events;
         EventFilterParam everything;
         EventListGetAll(events, everything);
         response->SetSuccess(static_cast<Json::UInt>(events.size()));
     }},
    {"Test", 1, "Crash", [](APIRequest*, APIResponse*) { std::abort(); }},
    {"Test", 1, "Environment", [](APIRequest*, APIResponse* response) { response->SetSuccess(Environment()); }},
    {"Test", 1, "Caller", [](APIRequest* request, APIResponse* response) { response->SetSuccess(Caller(*request)); }},
    {"VEXO.Lookhaven.Player.LiveviewSrc", 1, "Nothing", Nothing},
    {"VEXO.Lookhaven.Player.LiveviewSrc", 1, "EmptyStream", EmptyStream},
    {"VEXO.Lookhaven.Player.LiveviewSrc", 1, "Success", Success},
    {"VEXO.Lookhaven.Player.LiveviewSrc", 1, "PairedStream",
     [](APIRequest* request, APIResponse*) {
         const auto given = [request](const char* name) { return request->GetParam(name, "").asString(); };
         if (IsAuthPairMatch(given("cookie"), given("timestamp"))) {
             Stream(-1);
         }
     }},
    {"VEXO.Lookhaven.Player", 1, "PlayMjpegEvent", Play},
    {"VEXO.Lookhaven.Player", 1, "PlayMjpegEventNoFrameId", Play},
    {nullptr, 0, nullptr, nullptr}};

}  // namespace

extern "C" LH_PLATFORM_API const void* GetAPITable() {
    return kTable;
}
