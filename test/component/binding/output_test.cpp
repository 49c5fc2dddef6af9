// SPDX-License-Identifier: Apache-2.0
//
// The output layer against clients that are slow, deaf or gone, and against signals: what arrives is whole parts, and
// nothing blocks for long.
#include "standalone/binding/output.h"

#include <array>
#include <atomic>
#include <csignal>
#include <thread>

#include <sys/socket.h>

#include "platform/output/multipartresponse.h"
#include "standalone/base/file_descriptor.h"
#include "test/component/binding/binding_fixture.h"

namespace lookhaven::binding {
namespace {

using namespace std::chrono_literals;

std::atomic<int> g_terminations;

class OutputTest : public testing::Test {
  protected:
    OutputTest() {
        struct sigaction action {};
        action.sa_handler = [](int) { ++g_terminations; };
        sigaction(SIGTERM, &action, nullptr);
    }
    ~OutputTest() override {
        std::signal(SIGTERM, SIG_DFL);
        if (reader_.joinable()) {
            reader_.join();
        }
    }

    // An output to a client that does not read yet.
    void Open(OutputLimits limits = {}, bool is_to_leave = true) {
        std::array<int, 2> pair{};
        socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, pair.data());
        output_.reset();
        server_.Reset(pair[0]);
        client_.Reset(pair[1]);
        const int small = 4096;
        setsockopt(server_.Get(), SOL_SOCKET, SO_SNDBUF, &small, sizeof small);
        g_terminations = 0;
        output_ = std::make_unique<Output>(server_.Get(), limits, [is_to_leave] { return is_to_leave; });
        RequestContext::Current().Begin(base::Installation("/tmp"), output_.get(), {});
    }
    // Reads all that comes, in a thread of its own that takes no signals.
    void StartReading(std::chrono::microseconds pause) {
        sigset_t all;
        sigset_t before;
        sigfillset(&all);
        pthread_sigmask(SIG_SETMASK, &all, &before);
        reader_ = std::thread([this, pause] {
            std::array<char, 3000> block{};
            for (ssize_t got = 0; (got = read(client_.Get(), block.data(), block.size())) > 0;) {
                received_.append(block.data(), static_cast<std::size_t>(got));
                std::this_thread::sleep_for(pause);
            }
        });
        pthread_sigmask(SIG_SETMASK, &before, nullptr);
    }
    std::string FinishReading() {
        shutdown(server_.Get(), SHUT_WR);
        reader_.join();
        return std::exchange(received_, "");
    }

    base::FileDescriptor server_;
    base::FileDescriptor client_;
    std::unique_ptr<Output> output_;
    std::string received_;
    std::thread reader_;
};

// The parts of a multipart answer by their Content-Length; fails where the boundary is not where it should be.
std::vector<std::string> Parts(const std::string& answer) {
    std::vector<std::string> parts;
    const std::size_t name = answer.find("boundary=") + 9;
    const std::string line = "--" + answer.substr(name, answer.find("\r\n", name) - name) + "\r\n";
    std::size_t at = answer.find("\r\n\r\n") + 4;
    EXPECT_EQ(answer.compare(at, line.size(), line), 0);
    for (at += line.size(); at < answer.size();) {
        const std::size_t length = std::stoul(answer.substr(answer.find("Content-Length: ", at) + 16));
        const std::size_t data = answer.find("\r\n\r\n", at) + 4;
        parts.push_back(answer.substr(data, length));
        at = data + length;
        EXPECT_EQ(answer.compare(at, line.size() + 2, "\r\n" + line), 0) << "part " << parts.size();
        at += line.size() + 2;
    }
    return parts;
}

TEST_F(OutputTest, KeepsPartsWholeInAStormOfSignals) {
    Open();
    StartReading(100us);
    const Ticks ticks(200us);
    MultipartResponse response;
    std::vector<std::string> sent;
    for (int i = 0; i < 300; ++i) {
        sent.emplace_back(static_cast<std::size_t>(i * 97 % 20000), static_cast<char>('a' + i % 26));
        ASSERT_EQ(response.Write("image/jpeg", sent.back().data(), static_cast<int>(sent.back().size()), nullptr), 0);
    }
    EXPECT_EQ(Parts(FinishReading()), sent);
    EXPECT_EQ(g_terminations, 0);
}

TEST_F(OutputTest, KeepsTheOrderOfStdioAndParts) {
    Open();
    StartReading(0us);
    std::printf("Before: %d\r\n", 1);
    MultipartResponse response;
    EXPECT_EQ(response.Write("image/jpeg", nullptr, 0, nullptr), 0);
    EXPECT_EQ(response.Write("image/jpeg", "xyz", 3, "X-Extra: 1\r\n"), 0);
    std::fputs("after", stdout);
    std::fflush(stdout);
    const std::uint64_t counted = output_->BytesSent();
    const std::string answer = FinishReading();
    EXPECT_EQ(counted, answer.size());
    EXPECT_EQ(answer.rfind("Before: 1\r\nContent-Type: multipart/x-mixed-replace; boundary=", 0), 0U);
    EXPECT_NE(answer.find("\r\nCache-Control: no-store\r\nX-Accel-Buffering: no\r\n"), answer.npos);
    EXPECT_NE(answer.find("Content-Length: 3\r\nX-Extra: 1\r\n\r\nxyz\r\n--"), answer.npos);
    EXPECT_TRUE(answer.ends_with("\r\nafter"));
    EXPECT_EQ(answer.find("HTTP/"), answer.npos);
}

TEST_F(OutputTest, TellsWhenARecordedPictureWasCaptured) {
    Open();
    StartReading(0us);
    MultipartResponse response;
    const char number[] = "7";
    const char picture[] = "xyz";
    RequestContext::Current().SetLastRecorded({picture, 1'772'366'400'045});
    response.Write("text/plain", number, 1, nullptr);
    response.Write("image/jpeg", picture, 3, nullptr);
    RequestContext::Current().SetLastRecorded({});
    response.Write("image/jpeg", picture, 3, nullptr);
    const std::string answer = FinishReading();
    EXPECT_NE(answer.find("Content-Length: 3\r\nX-Capture-Time: 1772366400.045\r\n\r\nxyz"), answer.npos);
    EXPECT_EQ(answer.find("X-Capture-Time"), answer.rfind("X-Capture-Time")) << "of nothing else";
}

TEST_F(OutputTest, DescribesAMuxedStreamInEveryPart) {
    Open();
    StartReading(0us);
    MultipartResponse response;
    const std::string extra(1025, '\xff');
    const auto* bytes = reinterpret_cast<const unsigned char*>(extra.data());
    const std::int64_t timestamp = 0x500000001LL;
    response.Write("image/H264", "H264;AAC", bytes, 2, bytes, 1024, timestamp, "abc", 3, nullptr);
    response.Write("audio/AAC", "H264;", bytes, 1025, nullptr, 0, -1, "d", 1, "X-More: 1\r\n");
    const std::string answer = FinishReading();
    EXPECT_EQ(Parts(answer), (std::vector<std::string>{"abc", "d"}));
    const std::string whole = std::string(341 * 4, '/') + "/w==";
    EXPECT_NE(
        answer.find("Content-Type: image/H264\r\nContent-Length: 3\r\nX-Codecs: H264;AAC\r\nX-Video-Extra: //8=\r\n"
                    "X-Audio-Extra: " +
                    whole + "\r\nX-Timestamp: 21474836481\r\n\r\nabc"),
        answer.npos);
    EXPECT_NE(answer.find("Content-Type: audio/AAC\r\nContent-Length: 1\r\nX-Codecs: H264;\r\nX-Video-Extra: \r\n"
                          "X-Audio-Extra: \r\nX-Timestamp: -1\r\nX-More: 1\r\n\r\nd"),
              answer.npos);
}

TEST_F(OutputTest, BreaksForGoodWithADeafOrVanishedClient) {
    const struct {
        const char* name;
        OutputLimits limits;
        std::chrono::microseconds signals;
        bool vanished;
    } cases[] = {
        {"takes nothing", {300ms, 60s}, 0us, false},
        {"takes nothing while signals come", {60s, 300ms}, 5ms, false},
        {"is gone", {60s, 60s}, 0us, true},
    };
    const std::string picture(100'000, 'x');
    for (const auto& each : cases) {
        Open(each.limits);
        MultipartResponse response;
        if (each.vanished) {
            client_.Reset();
        }
        const Ticks ticks(each.signals);
        const auto start = std::chrono::steady_clock::now();
        int result = 0;
        for (int i = 0; i < 100 && result == 0; ++i) {
            result = response.Write("image/jpeg", picture.data(), static_cast<int>(picture.size()), nullptr);
        }
        EXPECT_EQ(result, -1) << each.name;
        EXPECT_LT(std::chrono::steady_clock::now() - start, 5s) << each.name;
        EXPECT_EQ(g_terminations, 1) << each.name;
        EXPECT_NE(std::ferror(stdout), 0) << each.name;
        const std::uint64_t sent = output_->BytesSent();
        EXPECT_EQ(response.Write("image/jpeg", "x", 1, nullptr), -1) << each.name;
        std::fputs("late", stdout);
        EXPECT_NE(std::fflush(stdout), 0) << each.name;
        EXPECT_EQ(output_->BytesSent(), sent) << each.name;
        EXPECT_EQ(g_terminations, 1) << each.name << ": once is enough";
    }
}

TEST_F(OutputTest, FinishesASlowPartUnlessItIsToLeave) {
    const struct {
        const char* name;
        OutputLimits limits;
        std::chrono::microseconds signals;
        bool is_to_leave;
        int result;
    } cases[] = {
        {"takes longer than the limit, but never without progress", {300ms, 300ms}, 0us, true, 0},
        {"is signalled, not to leave", {60s, 50ms}, 5ms, false, 0},
        {"is signalled to leave", {60s, 50ms}, 5ms, true, -1},
    };
    const std::string picture(1'000'000, 'x');
    for (const auto& each : cases) {
        Open(each.limits, each.is_to_leave);
        StartReading(2ms);
        const Ticks ticks(each.signals);
        MultipartResponse response;
        EXPECT_EQ(response.Write("image/jpeg", picture.data(), static_cast<int>(picture.size()), nullptr), each.result)
            << each.name;
        const std::string answer = FinishReading();
        EXPECT_TRUE(each.result != 0 || Parts(answer) == std::vector{picture}) << each.name;
    }
}

}  // namespace
}  // namespace lookhaven::binding
