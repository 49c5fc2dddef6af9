// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/new_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/cli/console.h"

namespace lookhaven::cli {

namespace {

// What a failed attempt left.
bool IsOwnEmptyFile(const struct stat& found) {
    return S_ISREG(found.st_mode) && found.st_size == 0 && found.st_uid == ::geteuid();
}

}  // namespace

std::int64_t WriteNewFile(const std::string& file, const std::function<void(int descriptor)>& write) {
    struct stat found {};
    if (::lstat(file.c_str(), &found) == 0 && (!IsOwnEmptyFile(found) || ::unlink(file.c_str()) != 0)) {
        throw Failure(kCannotCreate, "there is already a file ", file, ": name another one");
    }
    // A new one, which nobody has open.
    const base::FileDescriptor output = base::OpenFile(file, O_RDWR | O_CREAT | O_EXCL, 0600);
    try {
        write(output.Get());
        if (::fsync(output.Get()) != 0 || ::fstat(output.Get(), &found) != 0) {
            base::ThrowErrno("cannot write " + file);
        }
        return found.st_size;
    } catch (...) {
        if (::unlink(file.c_str()) != 0) {
            [[maybe_unused]] const int ignored = ::ftruncate(output.Get(), 0);  // no longer ours to remove
        }
        throw;
    }
}

}  // namespace lookhaven::cli
