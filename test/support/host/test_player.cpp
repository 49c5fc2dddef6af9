// SPDX-License-Identifier: Apache-2.0
#include "test/support/host/test_player.h"

#include <csignal>
#include <cstdio>
#include <fstream>
#include <string>

#include <fcntl.h>
#include <unistd.h>

#include "platform/output/multipartresponse.h"
#include "platform/recording/pacing.h"

namespace {

volatile sig_atomic_t g_stop;
volatile sig_atomic_t g_check;
volatile sig_atomic_t g_pause;
volatile sig_atomic_t g_checks;

void Handle(int number, void (*handler)(int)) {
    struct sigaction action {};
    action.sa_handler = handler;
    sigaction(number, &action, nullptr);
}

// Without O_TRUNC, which players have given up.
void WritePlayerFile(const std::string& path) {
    const int file = ::open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
    if (::ftruncate(file, 0) == 0) {
        ::dprintf(file, "%d", ::getpid());
    }
    ::close(file);
}

void CheckPlayerFile(const std::string& path) {
    pid_t owner = 0;
    std::ifstream(path) >> owner;
    if (owner == getpid()) {
        g_check = 0;
    } else {
        g_stop = 1;
    }
}

}  // namespace

void PlayTest(const VEXO::APIRequest& request) {
    Handle(SIGTERM, [](int) { g_stop = 1; });
    Handle(SIGUSR1, [](int) {
        g_check = 1;
        g_checks = g_checks + 1;
    });
    Handle(SIGUSR2, [](int) { g_pause = g_pause ^ 1; });
    const std::string path = "/tmp/player_src.pid." + request.GetSessionID();
    WritePlayerFile(path);
    const bool follows = request.GetAPIMethod() == "PlayMjpegEvent" || request.GetParam("changerate", 0).asInt() != 0;
    const auto half_opened_us = static_cast<useconds_t>(request.GetParam("opens", 0).asInt() * 500);
    usleep(half_opened_us);
    ProgressIndicator progress(request.GetParam("timestamp", 0).asInt64(), true, true);
    DelayTimer timer(5'000);
    MultipartResponse response;
    int rate = request.GetParam("playrate", 1).asInt();
    int sum = 0;
    usleep(half_opened_us);
    if (follows) {
        progress.Set(rate);
    }
    for (timer.BeginTiming(); g_stop == 0; timer.Delay()) {
        std::string text = "rate=" + std::to_string(rate) + " paused=" + std::to_string(g_pause) +
                           " checks=" + std::to_string(g_checks) + " sum=" + std::to_string(sum) + ";";
        response.Write("text/plain", text.data(), static_cast<int>(text.size()), nullptr);
        const int asked = progress.Get();
        if (follows && asked != -1) {
            rate = asked;
        } else if (!follows && progress.Set(sum) != 0) {
            break;
        }
        sum += g_pause != 0 && rate <= 1 ? 0 : rate;
        if (g_check != 0) {
            CheckPlayerFile(path);
        }
    }
    if (g_check == 0) {
        std::remove(path.c_str());
    }
}
