// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/new_file.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <system_error>

#include <fcntl.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/base/text.h"
#include "standalone/cli/console.h"

namespace lookhaven::cli {

namespace {

[[noreturn]] void ThrowExists(const std::string& file) {
    throw Failure(kCannotCreate, "there is already a file ", file, ": name another one");
}

// Gives the file in the folder its name, unless there is one of that name, and waits until the name is on the disk. 0,
// or the error.
int Publish(int folder, const std::string& unfinished, const std::string& name) {
    if (::renameat2(folder, unfinished.c_str(), folder, name.c_str(), RENAME_NOREPLACE) != 0) {
        // Some file systems, such as NFS, cannot do it in one step.
        if (errno != EINVAL || ::linkat(folder, unfinished.c_str(), folder, name.c_str(), 0) != 0) {
            return errno;
        }
        ::unlinkat(folder, unfinished.c_str(), 0);
    }
    return ::fsync(folder) == 0 ? 0 : errno;
}

// Whether the name in the folder is that of the opened file, and not of another that was put there meanwhile.
bool IsNameOf(int folder, const std::string& name, int file) {
    struct stat named {};
    struct stat opened {};
    return ::fstatat(folder, name.c_str(), &named, AT_SYMLINK_NOFOLLOW) == 0 && ::fstat(file, &opened) == 0 &&
           named.st_dev == opened.st_dev && named.st_ino == opened.st_ino;
}

base::FileDescriptor OpenFolderOf(const std::string& file) {
    const std::filesystem::path path = std::filesystem::absolute(file).parent_path();
    base::FileDescriptor folder(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder) {
        base::ThrowErrno("cannot make " + file);
    }
    return folder;
}

std::string UnfinishedName() {
    std::array<unsigned char, 8> random{};
    if (::getrandom(random.data(), random.size(), 0) != static_cast<ssize_t>(random.size())) {
        base::ThrowErrno("cannot choose a name");
    }
    return ".lookhaven-" + base::ToHex(random);
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

// A file under a temporary name, and a process that renames or removes it at the end, with the rights of the user who
// made it. That process outlives this one, however this one ends. The folder is opened once: another one that is put
// in its place gets nothing.
class UnfinishedFile {
  public:
    explicit UnfinishedFile(const std::string& file)
        : file_(file),
          folder_(OpenFolderOf(file)),
          unfinished_(UnfinishedName()) {
        std::array<int, 2> ends{};
        if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
            base::ThrowErrno("cannot make a pipe");
        }
        const base::FileDescriptor told(ends[0]);
        tell_ = base::FileDescriptor(ends[1]);
        const SignalsWait no_signal;
        output_ = base::FileDescriptor(
            ::openat(folder_.Get(), unfinished_.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
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
            ::unlinkat(folder_.Get(), unfinished_.c_str(), 0);
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
        const std::string name = std::filesystem::path(file_).filename();
        char finished = 0;
        int error = ECANCELED;
        if (base::ReadAll(told, &finished, 1) == 1) {
            error = IsNameOf(folder_.Get(), unfinished_, output_.Get()) ? Publish(folder_.Get(), unfinished_, name)
                                                                        : ESTALE;
        }
        if (error != 0) {
            ::unlinkat(folder_.Get(), unfinished_.c_str(), 0);
        }
        ::_exit(error);
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
    const base::FileDescriptor folder_;
    const std::string unfinished_;
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
