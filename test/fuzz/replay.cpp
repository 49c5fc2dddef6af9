// SPDX-License-Identifier: Apache-2.0
//
// Feeds a fuzz target with the files that the arguments name, folders with all in them: the main program where there is
// no libFuzzer.
#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

#include "standalone/base/file.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

namespace {

std::vector<std::filesystem::path> FilesAt(const std::filesystem::path& path) {
    if (!std::filesystem::is_directory(path)) {
        return {path};
    }
    std::vector<std::filesystem::path> files;
    for (const auto& entry : std::filesystem::directory_iterator(path)) {
        files.push_back(entry.path());
    }
    std::ranges::sort(files);
    return files;
}

}  // namespace

int main(int count, char** arguments) {
    int replayed = 0;
    for (const char* argument : std::vector<const char*>(arguments + 1, arguments + count)) {
        for (const std::filesystem::path& path : FilesAt(argument)) {
            // Before the call, for a crash to be told by its input.
            std::printf("%s\n", path.c_str());
            std::fflush(stdout);
            const std::string bytes = lookhaven::base::ReadFile(path);
            // On the heap and exactly as long, so that the sanitizer sees a read behind the end.
            const std::vector<std::uint8_t> input(bytes.begin(), bytes.end());
            LLVMFuzzerTestOneInput(input.data(), input.size());
            ++replayed;
        }
    }
    return replayed > 0 ? 0 : 1;
}
