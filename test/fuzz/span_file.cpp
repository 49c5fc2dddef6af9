// SPDX-License-Identifier: Apache-2.0
//
// Feeds any bytes to the reader of span files: no recording that they name leads out of the camera's folder, and what
// was read can be written.
#include "standalone/archive/span_file.h"

#include "test/fuzz/fuzz.h"
#include "test/support/folder.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const test::TemporaryFolder folder;
    fuzz::WriteFile(folder / "span", {data, size});
    try {
        const archive::Span span = archive::ReadSpan(folder / "span");
        fuzz::Require(span.begin_ms >= 0 && span.begin_ms <= span.end_ms);
        for (const std::string& recording : span.recordings) {
            fuzz::Require(recording.find('/') == recording.rfind('/') && recording.find("..") == recording.npos);
        }
        archive::WriteSpan(folder / "copy", span);
        fuzz::Require(archive::ReadSpan(folder / "copy") == span);
    } catch (const archive::ArchiveError&) {
    }
    return 0;
}
