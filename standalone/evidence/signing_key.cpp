// SPDX-License-Identifier: Apache-2.0
#include "standalone/evidence/signing_key.h"

#include <cstring>
#include <stdexcept>
#include <string>

#include <dlfcn.h>
#include <fcntl.h>

#include "standalone/base/file.h"

namespace lookhaven::evidence {

namespace fs = std::filesystem;

const SignatureLibrary& LoadSignatureLibrary() {
    static const SignatureLibrary& library = []() -> const SignatureLibrary& {
        void* handle = ::dlopen("liblookhaven-signature.so", RTLD_NOW | RTLD_LOCAL);
        void* get = handle == nullptr ? nullptr : ::dlsym(handle, "LookhavenSignature");
        if (get == nullptr) {
            throw std::runtime_error(std::string("cannot load liblookhaven-signature.so: ") + ::dlerror());
        }
        return *reinterpret_cast<const SignatureLibrary* (*)()>(get)();
    }();
    return library;
}

void RequireSigningKey(const fs::path& key_file) {
    if (!fs::exists(key_file)) {
        const fs::path folder = key_file.parent_path();
        if (fs::create_directories(folder)) {
            fs::permissions(folder, fs::perms::owner_all);
        }
        const base::FileDescriptor lock = base::LockFile(folder / "lock");
        if (!fs::exists(key_file)) {
            std::string key = LoadSignatureLibrary().MakeKey();
            base::WriteFileAtomically(key_file, key, 0600);
            ::explicit_bzero(key.data(), key.size());  // this process reads footage next
        }
    }
    base::OpenFile(key_file, O_RDONLY);
}

Signature SignBy(const fs::path& key_file, std::string_view text) {
    return LoadSignatureLibrary().Sign(key_file, text);
}

}  // namespace lookhaven::evidence
