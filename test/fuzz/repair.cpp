// SPDX-License-Identifier: Apache-2.0
//
// Repairs a recording of any bytes, with an index of any bytes or none: what is saved must be playable, and repairing
// it again must change nothing.
#include "standalone/archive/repair.h"

#include "standalone/archive/recording_reader.h"
#include "test/fuzz/fuzz.h"
#include "test/support/folder.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const test::TemporaryFolder folder;
    const std::filesystem::path recording = folder / "1.mkv";
    const std::filesystem::path index = folder / "1.index";
    fuzz::Input input(data, size);
    const std::span<const std::uint8_t> index_bytes = input.Take(input.Take<std::uint16_t>());
    std::filesystem::remove(index);
    if (!index_bytes.empty()) {
        fuzz::WriteFile(index, index_bytes);
    }
    fuzz::WriteFile(recording, input.Rest());
    const archive::Contents saved = archive::CloseCrashed(recording);
    if (saved.frame_count == 0) {
        fuzz::Require(std::filesystem::file_size(recording) == input.Rest().size());
        return 0;
    }
    const archive::RecordingReader reader(recording);
    fuzz::Require(reader.Entries(0).size() == static_cast<std::size_t>(saved.frame_count) && !reader.Grows());
    const archive::Contents again = archive::CloseCrashed(recording);
    fuzz::Require(again.header == saved.header && again.frame_count == saved.frame_count &&
                  again.duration_ms == saved.duration_ms && again.size_bytes == saved.size_bytes);
    return 0;
}
