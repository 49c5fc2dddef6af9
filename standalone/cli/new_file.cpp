// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/new_file.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/cli/console.h"

namespace lookhaven::cli {

namespace {

[[noreturn]] void ThrowExists(const std::string& file) {
    throw Failure(kCannotCreate, "there is already a file ", file, ": name another one");
}

// Gives the file its name, unless there is one of that name. 0, or the error.
int Publish(const std::string& unfinished, const std::string& file) {
    if (::renameat2(AT_FDCWD, unfinished.c_str(), AT_FDCWD, file.c_str(), RENAME_NOREPLACE) == 0) {
        return 0;
    }
    // Some file systems, such as NFS, cannot do it in one step.
    if (errno != EINVAL || ::link(unfinished.c_str(), file.c_str()) != 0) {
        return errno;
    }
    ::unlink(unfinished.c_str());
    return 0;
}

// Signals that end a process wait while it exists.
class SignalsWait {
  public:
    SignalsWait() {
        sigset_t all;
        ::sigfillset(&all);
        ::sigprocmask(SIG_BLOCK, &all, &before_);
    }
    SignalsWait(const SignalsWait&) = delete;
    SignalsWait& operator=(const SignalsWait&) = delete;
    ~SignalsWait() { ::sigprocmask(SIG_SETMASK, &before_, nullptr); }

  private:
    sigset_t before_{};
};

// A file without its name, and a process that gives it the name or removes it, with the rights of whoever made it; it
// outlives this one, however that ends.
class UnfinishedFile {
  public:
    explicit UnfinishedFile(const std::string& file)
        : file_(file),
          unfinished_(std::filesystem::path(file).parent_path() / ".lookhaven-XXXXXX") {
        std::array<int, 2> ends{};
        if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
            base::ThrowErrno("cannot make a pipe");
        }
        const base::FileDescriptor told(ends[0]);
        tell_ = base::FileDescriptor(ends[1]);
        const SignalsWait no_signal;
        output_ = base::FileDescriptor(::mkostemp(unfinished_.data(), O_CLOEXEC));
        if (!output_) {
            base::ThrowErrno("cannot make " + file);
        }
        keeper_ = ::fork();
        if (keeper_ == 0) {
            tell_ = base::FileDescriptor();
            Keep(told.Get());
        }
        if (keeper_ < 0) {
            const int error = errno;
            ::unlink(unfinished_.c_str());
            throw std::system_error(error, std::generic_category(), "cannot make " + file);
        }
    }
    UnfinishedFile(const UnfinishedFile&) = delete;
    UnfinishedFile& operator=(const UnfinishedFile&) = delete;
    ~UnfinishedFile() {
        if (keeper_ > 0) {
            End();
        }
    }

    int Descriptor() const { return output_.Get(); }

    void Finish() {
        const int error = base::WriteAll(tell_.Get(), "x", 1) ? End() : errno;
        if (error == EEXIST) {
            ThrowExists(file_);
        }
        if (error != 0) {
            throw std::system_error(error, std::generic_category(), "cannot make " + file_);
        }
    }

  private:
    // Signals still wait here, and do so until the end.
    [[noreturn]] void Keep(int told) const {
        char finished = 0;
        const int error = base::ReadAll(told, &finished, 1) == 1 ? Publish(unfinished_, file_) : ECANCELED;
        if (error != 0) {
            ::unlink(unfinished_.c_str());
            ::_exit(error);
        }
        // The name, too, is on the disk then.
        const std::filesystem::path folder = std::filesystem::absolute(file_).parent_path();
        const base::FileDescriptor opened(::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
        ::_exit(opened && ::fsync(opened.Get()) == 0 ? 0 : errno);
    }

    int End() {
        tell_ = base::FileDescriptor();
        int status = 0;
        while (::waitpid(keeper_, &status, 0) < 0 && errno == EINTR) {
        }
        keeper_ = -1;
        return WIFEXITED(status) ? WEXITSTATUS(status) : EIO;
    }

    const std::string file_;
    std::string unfinished_;
    base::FileDescriptor tell_;
    base::FileDescriptor output_;
    pid_t keeper_ = -1;
};

}  // namespace

std::int64_t WriteNewFile(const std::string& file, const std::function<void(int descriptor)>& write) {
    if (::faccessat(AT_FDCWD, file.c_str(), F_OK, AT_SYMLINK_NOFOLLOW) == 0) {
        ThrowExists(file);
    }
    UnfinishedFile unfinished(file);
    write(unfinished.Descriptor());
    struct stat found {};
    if (::fsync(unfinished.Descriptor()) != 0 || ::fstat(unfinished.Descriptor(), &found) != 0) {
        base::ThrowErrno("cannot write " + file);
    }
    unfinished.Finish();
    return found.st_size;
}

}  // namespace lookhaven::cli
