// SPDX-License-Identifier: Apache-2.0
//
// The flags that signals set, and the pid file that names a session's player.
#include "player/mjpegstreamer/player_session.h"

#include <csignal>
#include <cstdio>
#include <memory>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

std::string g_PlayerSessionId;
std::atomic<unsigned char> g_PlayerStop{0};
std::atomic<unsigned char> g_PlayerCheckPid{0};
std::atomic<unsigned char> g_PlayerPause{0};

namespace {

struct FileCloser {
    void operator()(std::FILE* file) const { std::fclose(file); }
};

// The folder is open to every local user: only a regular file of this user, under one name, is the pid file.
std::unique_ptr<std::FILE, FileCloser> OpenPidFile(int flags, const char* mode) {
    const int descriptor = open(PlayerPidFile().c_str(), flags | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, 0600);
    if (descriptor < 0) {
        return nullptr;
    }
    struct stat status = {};
    const bool is_own = fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode) && status.st_uid == geteuid() &&
                        status.st_nlink <= 1;
    std::unique_ptr<std::FILE, FileCloser> file(is_own ? fdopen(descriptor, mode) : nullptr);
    if (!file) {
        close(descriptor);
    }
    return file;
}

void OnStopSignal(int) {
    g_PlayerStop = 1;
}

void OnCheckPidSignal(int) {
    g_PlayerCheckPid = 1;
}

void OnPauseSignal(int) {
    g_PlayerPause ^= 1;
}

bool Catch(int signal, void (*handler)(int)) {
    struct sigaction action = {};
    action.sa_handler = handler;
    return sigaction(signal, &action, nullptr) == 0;
}

}  // namespace

bool SetupPlayerSignals() {
    return Catch(SIGTERM, OnStopSignal) && Catch(SIGUSR1, OnCheckPidSignal) && Catch(SIGUSR2, OnPauseSignal);
}

std::string PlayerPidFile() {
    return "/tmp/player_src.pid." + g_PlayerSessionId;
}

bool WritePlayerPidFile() {
    const auto file = OpenPidFile(O_WRONLY | O_CREAT, "w");
    if (!file || ftruncate(fileno(file.get()), 0) != 0) {
        return false;
    }
    std::fprintf(file.get(), "%d", getpid());
    return true;
}

int CheckPlayerPidFile() {
    if (g_PlayerSessionId.empty()) {
        return -1;
    }
    const auto file = OpenPidFile(O_RDONLY, "r");
    if (!file) {
        return -1;
    }
    int pid = 0;
    if (std::fscanf(file.get(), "%d", &pid) == 1 && pid == getpid()) {
        g_PlayerCheckPid = 0;
    } else {
        g_PlayerStop = 1;
    }
    return 0;
}

bool RemovePlayerPidFile() {
    return !g_PlayerSessionId.empty() && std::remove(PlayerPidFile().c_str()) == 0;
}
