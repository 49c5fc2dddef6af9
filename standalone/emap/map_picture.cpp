// SPDX-License-Identifier: Apache-2.0
#include "standalone/emap/map_picture.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <exception>
#include <new>
#include <span>
#include <system_error>
#include <utility>
#include <vector>

#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/log.h"
#include "standalone/base/process.h"
#include "standalone/base/sanitizers.h"
#include "standalone/emap/pictures.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/media/still_sandbox.h"
#include "standalone/store/store.h"

namespace lookhaven::emap {

namespace {

using Clock = std::chrono::steady_clock;
using Outcome = media::Reencoded::Outcome;

constexpr Outcome kFailed{'x'};  // no fault of the file's

// Less than the host gives a request.
constexpr std::chrono::seconds kMaxTime{25};
constexpr rlim_t kMaxAddressSpace = rlim_t{1} << 30;

void Limit(decltype(RLIMIT_AS) resource, rlim_t most) {
    rlimit limit{};
    if (::getrlimit(resource, &limit) == 0) {
        limit.rlim_cur = limit.rlim_max = std::min(most, limit.rlim_max);
        ::setrlimit(resource, &limit);
    }
}

void Write(std::span<const std::uint8_t> bytes) {
    while (!bytes.empty()) {
        const ssize_t written = ::write(STDOUT_FILENO, bytes.data(), bytes.size());
        if (written <= 0 && errno != EINTR) {
            return;  // who reads it finds out
        }
        bytes = bytes.subspan(written > 0 ? static_cast<std::size_t>(written) : 0);
    }
}

void WriteLetter(Outcome outcome) {
    const auto letter = static_cast<std::uint8_t>(outcome);
    Write({&letter, 1});
}

// Writes the outcome's letter and the file to standard output. What is open beside that and the log is closed.
void ReencodeConfined(std::string_view type, std::string_view file, const std::function<void()>& confine) {
    const media::DecoderLibrary& library = media::LoadDecoderLibrary();
    base::PreferAsOomVictim();
    ::close(STDIN_FILENO);
    base::CloseFrom(STDERR_FILENO + 1);
    Limit(RLIMIT_CORE, 0);
    Limit(RLIMIT_CPU, static_cast<rlim_t>(kMaxTime.count()));
    if (!base::kSanitized) {  // which maps terabytes before main
        Limit(RLIMIT_AS, kMaxAddressSpace);
    }
    if (confine) {
        confine();
    }
    media::EnterStillSandbox();
    const media::Reencoded reencoded =
        library.Reencode(type, {reinterpret_cast<const std::uint8_t*>(file.data()), file.size()}, kMaxPictureBytes);
    WriteLetter(reencoded.outcome);
    Write(reencoded.file);
}

void RunReencode(std::string_view type, std::string_view file, const std::function<void()>& confine) {
    try {
        ReencodeConfined(type, file, confine);
    } catch (const std::bad_alloc&) {
        // Nothing is written, as where the kernel ends the process.
    } catch (const std::exception& error) {
        base::LogError(std::string("a picture cannot be decoded here: ") + error.what());
        WriteLetter(kFailed);
    }
}

// Reads until the end, the deadline, or one byte more than the largest outcome has.
std::string ReadOutcome(int input) {
    const Clock::time_point deadline = Clock::now() + kMaxTime;
    std::string outcome;
    std::vector<char> block(std::size_t{1} << 16U);
    while (outcome.size() <= kMaxPictureBytes + 1) {
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
        pollfd readable{input, POLLIN, 0};
        const int ready = left > 0 ? ::poll(&readable, 1, static_cast<int>(left)) : 0;
        if (ready < 0 && errno == EINTR) {
            continue;
        }
        const ssize_t got = ready > 0 ? ::read(input, block.data(), block.size()) : 0;
        if (got <= 0) {
            return ready > 0 ? outcome : "";
        }
        outcome.append(block.data(), static_cast<std::size_t>(got));
    }
    return outcome;
}

// What the process that decodes the file says of it.
std::string ReencodeInSandbox(std::string_view type, std::string_view file, const std::function<void()>& confine) {
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        base::ThrowErrno("cannot make a pipe");
    }
    const base::FileDescriptor input(ends[0]);
    base::FileDescriptor output(ends[1]);
    const pid_t parent = ::getpid();
    const pid_t child = ::fork();
    if (child < 0) {
        base::ThrowErrno("cannot start a process for a picture");
    }
    if (child == 0) {
        ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        ::dup2(output.Get(), STDOUT_FILENO);
        if (::getppid() == parent) {
            RunReencode(type, file, confine);
        }
        ::_exit(0);
    }
    output.Reset();
    std::string outcome = ReadOutcome(input.Get());
    ::kill(child, SIGKILL);
    while (::waitpid(child, nullptr, 0) < 0 && errno == EINTR) {
    }
    return outcome;
}

}  // namespace

MapPicture MapPicture::Reencoded(std::string_view file, const std::function<void()>& confine) {
    if (file.size() > kMaxUploadBytes) {
        throw store::InvalidRecord("an e-map's picture has at most 20 MiB");
    }
    const std::string_view type = PictureType(file);
    if (type == "svg") {
        throw store::InvalidRecord("an SVG file cannot be drawn here: give a PNG, JPEG or WebP file made from it");
    }
    if (type.empty()) {
        throw store::InvalidRecord("an e-map's picture is a PNG, JPEG or WebP file");
    }
    std::string outcome = ReencodeInSandbox(type, file, confine);
    if (outcome.starts_with(static_cast<char>(kFailed))) {
        throw std::system_error(std::make_error_code(std::errc::io_error), "pictures cannot be decoded");
    }
    const auto letter = outcome.empty() ? Outcome{} : static_cast<Outcome>(outcome.front());
    outcome.erase(0, 1);
    if ((letter == Outcome::kPng || letter == Outcome::kJpeg) && outcome.size() <= kMaxPictureBytes &&
        PictureType(outcome) == (letter == Outcome::kPng ? "png" : "jpg")) {
        return MapPicture(std::move(outcome));
    }
    throw store::InvalidRecord(letter == Outcome::kTooManyPixels ? "the picture has more than 30 million pixels"
                               : letter == Outcome::kTooLarge ? "the picture has more than 16 MiB once it is decoded "
                                                                "and stored again: give one with fewer pixels"
                               : letter == Outcome::kBroken   ? "the picture is damaged: it cannot be decoded"
                                                              : "decoding the picture takes too much time or memory");
}

MapPicture MapPicture::OfOperator(std::string_view file) {
    const std::string_view type = PictureType(file);
    if (type.empty()) {
        throw store::InvalidRecord("an e-map's picture is a PNG, JPEG, WebP or SVG file");
    }
    return type == "svg" ? MapPicture(std::string(file)) : Reencoded(file);
}

}  // namespace lookhaven::emap
