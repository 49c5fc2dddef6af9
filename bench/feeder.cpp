// SPDX-License-Identifier: Apache-2.0
//
// Stands in for the recorder: fills one camera's ring with stamped pictures at a steady rate until it gets SIGTERM.
//
// Arguments: camera, codec's name, bytes of a picture, pictures a second. Other codecs than MJPEG have a key frame a
// second. The installation is the one of LOOKHAVEN_HOME.
#include <atomic>
#include <csignal>
#include <cstdlib>
#include <iostream>
#include <string>

#include <time.h>

#include "bench/frame_stamp.h"
#include "standalone/base/clock.h"
#include "standalone/control/common_config.h"
#include "standalone/ring/writer.h"

namespace {

using namespace lookhaven;

volatile std::sig_atomic_t g_stop = 0;

int Run(int camera, const std::string& codec, std::size_t frame_bytes, int frames_per_second) {
    const auto installation = base::Installation::FromEnvironment();
    control::CommonConfigKeeper common(installation);
    ring::StreamFormat format;
    format.codec = codec;
    format.width = 1280;
    format.height = 720;
    format.every_frame_is_key = codec == "MJPEG";
    ring::StreamEstimate estimate;
    estimate.every_frame_is_key = format.every_frame_is_key;
    estimate.largest_frame_bytes = static_cast<std::int64_t>(frame_bytes);
    estimate.bits_per_second = estimate.largest_frame_bytes * 8 * frames_per_second;
    estimate.frames_per_second = frames_per_second;
    ring::Writer writer(installation, {camera, 0, base::Medium::kVideo}, format, ring::GeometryFor(estimate));

    std::vector<char> picture = bench::MakeFrame(frame_bytes);
    ring::Frame frame;
    frame.data = {reinterpret_cast<const unsigned char*>(picture.data()), picture.size()};
    timespec next{};
    clock_gettime(CLOCK_MONOTONIC, &next);
    for (int number = 0; g_stop == 0; ++number) {
        if (number % frames_per_second == 0) {
            common.Refresh(false);
        }
        frame.is_key = format.every_frame_is_key || number % frames_per_second == 0;
        frame.timestamp_micros = base::MonotonicMicros();
        frame.capture_millis = base::WallMillis();
        bench::WriteStamp(picture.data(), frame.timestamp_micros);
        writer.Write(frame);
        next.tv_nsec += 1'000'000'000 / frames_per_second;
        next.tv_sec += next.tv_nsec / 1'000'000'000;
        next.tv_nsec %= 1'000'000'000;
        clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &next, nullptr);
    }
    return 0;
}

}  // namespace

int main(int count, char** arguments) try {
    if (count != 5) {
        std::cerr << "usage: bench_feeder CAMERA CODEC FRAME_BYTES FRAMES_PER_SECOND\n";
        return 64;
    }
    struct sigaction stop {};
    stop.sa_handler = [](int) { g_stop = 1; };
    sigaction(SIGTERM, &stop, nullptr);
    return Run(std::atoi(arguments[1]), arguments[2], std::strtoull(arguments[3], nullptr, 10),
               std::atoi(arguments[4]));
} catch (const std::exception& error) {
    std::cerr << "bench_feeder: " << error.what() << '\n';
    return 1;
}
