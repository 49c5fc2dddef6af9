// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/new_file.h"

#include <fcntl.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/cli/console.h"

namespace lookhaven::cli {

void WriteNewFile(const std::string& file, const std::function<void(int descriptor)>& write) {
    if (::access(file.c_str(), F_OK) == 0) {
        throw Failure(kCannotCreate, "there is already a file ", file, ": name another one");
    }
    const base::FileDescriptor output = base::OpenFile(file, O_RDWR | O_CREAT | O_EXCL, 0600);
    try {
        write(output.Get());
        if (::fsync(output.Get()) != 0) {
            base::ThrowErrno("cannot write " + file);
        }
    } catch (...) {
        if (::unlink(file.c_str()) != 0) {
            [[maybe_unused]] const int ignored = ::ftruncate(output.Get(), 0);  // no longer ours to remove
        }
        throw;
    }
}

}  // namespace lookhaven::cli
