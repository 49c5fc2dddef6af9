// SPDX-License-Identifier: Apache-2.0
//
// Reads the size of a picture from any bytes; libjpeg-turbo must find the same, if any.
#include "standalone/media/jpeg.h"

#include <turbojpeg.h>

#include "test/fuzz/fuzz.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const tjhandle reader = tjInitDecompress();
    const auto found = lookhaven::media::JpegSize({data, size});
    int width = 0;
    int height = 0;
    int subsampling = 0;
    int colours = 0;
    if (found && tjDecompressHeader3(reader, data, size, &width, &height, &subsampling, &colours) == 0) {
        lookhaven::fuzz::Require(found->IsUsable() && found->width == width && found->height == height);
    }
    return 0;
}
