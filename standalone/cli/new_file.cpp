// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/new_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/cli/console.h"

namespace lookhaven::cli {

std::int64_t WriteNewFile(const std::string& file, const std::function<void(int descriptor)>& write) {
    if (::faccessat(AT_FDCWD, file.c_str(), F_OK, AT_SYMLINK_NOFOLLOW) == 0) {
        throw Failure(kCannotCreate, "there is already a file ", file, ": name another one");
    }
    const base::FileDescriptor output = base::OpenFile(file, O_RDWR | O_CREAT | O_EXCL, 0600);
    try {
        write(output.Get());
        struct stat found {};
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
