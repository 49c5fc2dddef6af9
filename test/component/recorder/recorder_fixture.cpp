// SPDX-License-Identifier: Apache-2.0
#include "test/component/recorder/recorder_fixture.h"

#include <csignal>
#include <cstdlib>
#include <fstream>

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/media/libav.h"
#include "standalone/ring/inventory.h"

namespace lookhaven::test {

Child::Child(const std::vector<std::string>& command, const std::filesystem::path& output) : pid_(::fork()) {
    if (pid_ != 0) {
        return;
    }
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    const int file = ::open(output.c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
    ::dup2(file, STDOUT_FILENO);
    ::dup2(file, STDERR_FILENO);
    std::vector<char*> arguments;
    for (const std::string& argument : command) {
        arguments.push_back(const_cast<char*>(argument.c_str()));
    }
    arguments.push_back(nullptr);
    ::execv(arguments[0], arguments.data());
    ::_exit(127);
}

Child::~Child() {
    if (pid_ > 0) {
        ::kill(pid_, SIGKILL);
        ::waitpid(pid_, nullptr, 0);
    }
}

void Child::Signal(int signal) const {
    ASSERT_EQ(::kill(pid_, signal), 0);
}

std::optional<int> Child::Wait(std::chrono::milliseconds limit) {
    int status = 0;
    if (!Eventually(limit, [&] { return ::waitpid(pid_, &status, WNOHANG) == pid_; })) {
        return std::nullopt;
    }
    pid_ = -1;
    return status;
}

std::size_t Child::Count(const char* kind) const {
    const std::filesystem::directory_iterator entries("/proc/" + std::to_string(pid_) + "/" + kind);
    return static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
}

std::vector<pid_t> Child::Children() const {
    std::vector<pid_t> children;
    for (const auto& thread : std::filesystem::directory_iterator("/proc/" + std::to_string(pid_) + "/task")) {
        std::ifstream file(thread.path() / "children");
        for (pid_t child = 0; file >> child;) {
            children.push_back(child);
        }
    }
    return children;
}

Viewer::Viewer(const base::Installation& installation, int camera, base::Medium medium)
    : installation_(installation),
      id_{camera, 0, medium},
      demand_(installation) {}

bool Viewer::Attach() {
    demand_.Request({id_.camera, id_.stream});
    if (ring_ != nullptr && ring::IsRetired(ring_)) {
        Leave();
    }
    if (ring_ == nullptr && (ring_ = ring::Attach(installation_, id_)) != nullptr) {
        ring::StartRead(ring_, &position_);
    }
    return ring_ != nullptr;
}

void Viewer::Leave() {
    if (ring_ != nullptr) {
        ring::StopRead(ring_, &position_);
        ring::Detach(std::exchange(ring_, nullptr));
        position_ = {};
        last_sequence_ = ring::kNoSequence;
    }
}

Seen Viewer::Next(std::chrono::milliseconds limit) {
    Seen seen;
    const bool found = Eventually(limit, [&] {
        const ring::Entry* entry = Attach() ? ring::ReadNext(ring_, last_sequence_, &position_) : nullptr;
        if (entry != nullptr) {
            last_sequence_ = entry->sequence;
            seen = {{reinterpret_cast<const char*>(entry->Data()), static_cast<std::size_t>(entry->length)},
                    (entry->flags & ring::kKeyFrame) != 0,
                    entry->TimestampMicros()};
            ring::ReadFinish(ring_, entry, &position_);
        }
        return entry != nullptr;
    });
    EXPECT_TRUE(found) << "no frame of camera " << id_.camera;
    return seen;
}

std::vector<Seen> Viewer::Take(std::size_t count) {
    std::vector<Seen> entries;
    while (entries.size() < count && !testing::Test::HasFailure()) {
        entries.push_back(Next());
    }
    return entries;
}

bool Viewer::HasPicture() {
    const ring::Entry* entry = Attach() ? ring::ReadLatest(ring_) : nullptr;
    if (entry != nullptr) {
        ring::ReadFinish(ring_, entry, nullptr);
    }
    return entry != nullptr;
}

RecorderTest::RecorderTest() {
    base::Installation::CreateFolders(home_);
    installation_.emplace(home_);
}

RecorderTest::~RecorderTest() {
    EXPECT_EQ(LogLines("Sanitizer") + LogLines("runtime error:"), 0u) << "a sanitizer stopped the recorder";
    if (HasFailure()) {
        std::printf("%s", Log().c_str());
    }
    ring::RemoveOrphans(*installation_);
}

void RecorderTest::MakeStore() const {
    store::Store::Migrate(installation_->StoreUrl());
}

int RecorderTest::AddCamera(const std::string& source, const std::optional<store::Credentials>& credentials) const {
    MakeStore();
    store::Store store = store::Store::Open(installation_->StoreUrl());
    store::Cameras cameras(store);
    store::Camera camera;
    camera.name = "Camera";
    camera.profiles.push_back({0, source, 0, 0, 0});
    const int id = cameras.Add(camera);
    cameras.SetCredentials(id, credentials);
    return id;
}

void RecorderTest::ChangeCamera(int id, const std::function<void(store::Camera&)>& change) const {
    store::Store store = store::Store::Open(installation_->StoreUrl());
    store::Cameras cameras(store);
    store::Camera camera = cameras.Find(id).value();
    change(camera);
    cameras.Update(camera);
}

Child RecorderTest::StartRecorder(const std::string& no_data_limit_s) const {
    return Child({RECORDER_PATH, "--home", home_.Path().string(), "--no-data-limit", no_data_limit_s},
                 home_ / "log/recorder");
}

std::string RecorderTest::Log() const {
    return std::filesystem::exists(home_ / "log/recorder") ? base::ReadFile(home_ / "log/recorder") : "";
}

std::size_t RecorderTest::LogLines(const std::string& text) const {
    const std::string log = Log();
    std::size_t count = 0;
    for (std::size_t at = log.find(text); at != log.npos; at = log.find(text, at + 1)) {
        ++count;
    }
    return count;
}

std::size_t RecorderTest::Segments() const {
    return ring::ListSegments(*installation_).size();
}

std::size_t Decoded(const char* codec, std::span<const unsigned char> extra_data, std::span<const Seen> entries) {
    using namespace media;
    const AVCodec* decoder = avcodec_find_decoder_by_name(codec);
    const AvPtr<AVCodecContext> context = OwnAv(avcodec_alloc_context3(decoder));
    context->err_recognition = AV_EF_EXPLODE;
    context->thread_count = 1;
    // What a stream without a configuration of its own is taken for.
    av_channel_layout_default(&context->ch_layout, 1);
    context->sample_rate = 8000;
    context->extradata = static_cast<std::uint8_t*>(av_mallocz(extra_data.size() + AV_INPUT_BUFFER_PADDING_SIZE));
    context->extradata_size = static_cast<int>(extra_data.size());
    std::copy(extra_data.begin(), extra_data.end(), context->extradata);
    CheckAv(avcodec_open2(context.get(), decoder, nullptr), "cannot open the decoder");
    const AvPtr<AVPacket> packet = OwnAv(av_packet_alloc());
    const AvPtr<AVFrame> frame = OwnAv(av_frame_alloc());
    std::size_t count = 0;
    const auto drain = [&] {
        while (avcodec_receive_frame(context.get(), frame.get()) == 0) {
            count += frame->decode_error_flags == 0 ? 1 : 0;
        }
    };
    for (const Seen& entry : entries) {
        CheckAv(av_new_packet(packet.get(), static_cast<int>(entry.data.size())), "no memory");
        std::copy(entry.data.begin(), entry.data.end(), packet->data);
        const int result = avcodec_send_packet(context.get(), packet.get());
        av_packet_unref(packet.get());
        if (result < 0) {
            return count;
        }
        drain();
    }
    avcodec_send_packet(context.get(), nullptr);
    drain();
    return count;
}

void ExpectDecodesFromEveryKeyFrame(const std::vector<Seen>& entries, std::size_t min_key_frames, const char* codec) {
    std::size_t key_frames = 0;
    for (std::size_t first = 0; first < entries.size(); ++first) {
        if (entries[first].key_frame) {
            ++key_frames;
            const std::span<const Seen> run = std::span(entries).subspan(first);
            EXPECT_EQ(Decoded(codec, {}, run), run.size()) << "from entry " << first;
        }
    }
    EXPECT_GE(key_frames, min_key_frames);
}

}  // namespace lookhaven::test
