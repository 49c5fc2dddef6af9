// SPDX-License-Identifier: Apache-2.0
#include "standalone/camera/camera_process.h"

#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <utility>

#include <fcntl.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/sanitizers.h"
#include "standalone/media/source.h"

namespace lookhaven::camera {

namespace {

// What the new process starts with.
class SpawnPlan {
  public:
    explicit SpawnPlan(int socket) {
        ::posix_spawn_file_actions_init(&files_);
        ::posix_spawn_file_actions_adddup2(&files_, socket, kSocketOfProcess);
        for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
            if (!base::kSanitized || standard != STDERR_FILENO) {  // a sanitizer reports there
                ::posix_spawn_file_actions_addopen(&files_, standard, "/dev/null", O_RDWR, 0);
            }
        }
        ::posix_spawn_file_actions_addclosefrom_np(&files_, kSocketOfProcess + 1);
        // A terminal sends these to all processes in its foreground; the caller decides when this one ends.
        sigset_t blocked;
        sigemptyset(&blocked);
        for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT}) {
            sigaddset(&blocked, signal);
        }
        ::posix_spawnattr_init(&attributes_);
        ::posix_spawnattr_setsigmask(&attributes_, &blocked);
        ::posix_spawnattr_setflags(&attributes_, POSIX_SPAWN_SETSIGMASK);
    }
    SpawnPlan(const SpawnPlan&) = delete;
    SpawnPlan& operator=(const SpawnPlan&) = delete;
    ~SpawnPlan() {
        ::posix_spawn_file_actions_destroy(&files_);
        ::posix_spawnattr_destroy(&attributes_);
    }

    int Spawn(const std::string& program, pid_t* pid) const {
        char* arguments[] = {const_cast<char*>("lookhaven-camera"), nullptr};
        char* nothing[] = {nullptr};
        return ::posix_spawn(pid, program.c_str(), &files_, &attributes_, arguments,
                             base::kSanitized ? environ : nothing);
    }

  private:
    posix_spawn_file_actions_t files_{};
    posix_spawnattr_t attributes_{};
};

std::string ProgramPath() {
    return std::filesystem::read_symlink("/proc/self/exe").replace_filename("lookhaven-camera").string();
}

}  // namespace

CameraProcess::CameraProcess() {
    int ends[2];
    if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) {
        throw media::SourceError(std::string("cannot make a socket: ") + std::strerror(errno));
    }
    socket_.Reset(ends[0]);
    const base::FileDescriptor other_end(ends[1]);
    const std::string program = ProgramPath();
    if (const int error = SpawnPlan(other_end.Get()).Spawn(program, &pid_)) {
        pid_ = -1;
        throw media::SourceError("cannot start " + program + ": " + std::strerror(error));
    }
}

std::string CameraProcess::End() {
    int status = 0;
    if (pid_ <= 0 || ::kill(pid_, SIGKILL) != 0 || ::waitpid(std::exchange(pid_, -1), &status, 0) < 0) {
        return "its process is gone";
    }
    if (WIFSIGNALED(status)) {
        return "its process was ended by signal " + std::to_string(WTERMSIG(status)) + " (" +
               ::strsignal(WTERMSIG(status)) + ")";
    }
    return "its process ended with status " + std::to_string(WEXITSTATUS(status));
}

}  // namespace lookhaven::camera
