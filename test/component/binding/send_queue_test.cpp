// SPDX-License-Identifier: Apache-2.0
//
// What waits on the way to a viewer, and what a live stream leaves out for it.
#include "standalone/binding/send_queue.h"

#include <array>

#include <netinet/in.h>
#include <sys/socket.h>

#include "platform/live/livestream.h"
#include "standalone/base/clock.h"
#include "standalone/ring/reader.h"
#include "standalone/ring/writer.h"
#include "test/component/binding/binding_fixture.h"
#include "test/support/folder.h"
#include "test/support/wait.h"

namespace lookhaven::binding {
namespace {

using namespace std::chrono_literals;

// The connection to the web server.
class SendQueueTest : public testing::Test {
  protected:
    SendQueueTest() {
        std::array<int, 2> pair{};
        socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, pair.data());
        server_.Reset(pair[0]);
        client_.Reset(pair[1]);
        const int large = 200'000;
        setsockopt(server_.Get(), SOL_SOCKET, SO_SNDBUF, &large, sizeof large);
    }

    base::FileDescriptor server_;
    base::FileDescriptor client_;
};

// A TCP connection over the loopback; the server's end is the first.
std::pair<base::FileDescriptor, base::FileDescriptor> ConnectTcp(const std::string& address, TcpConnection& names) {
    const int family = address.find(':') == address.npos ? AF_INET : AF_INET6;
    const base::FileDescriptor listener(socket(family, SOCK_STREAM | SOCK_CLOEXEC, 0));
    listen(listener.Get(), 1);
    const auto port_of = [](int descriptor, auto ask) {
        sockaddr_in6 name{};  // the port lies at the same place for both families
        socklen_t size = sizeof name;
        ask(descriptor, reinterpret_cast<sockaddr*>(&name), &size);
        return name.sin6_port;
    };
    sockaddr_in6 any{};  // no address: this host
    any.sin6_family = static_cast<sa_family_t>(family);
    any.sin6_port = port_of(listener.Get(), getsockname);
    base::FileDescriptor client(socket(family, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const int small = 4096;
    setsockopt(client.Get(), SOL_SOCKET, SO_RCVBUF, &small, sizeof small);
    EXPECT_EQ(connect(client.Get(), reinterpret_cast<const sockaddr*>(&any), sizeof any), 0);
    base::FileDescriptor server(accept(listener.Get(), nullptr, nullptr));
    names = {address, ntohs(any.sin6_port), address, ntohs(port_of(server.Get(), getpeername))};
    return {std::move(server), std::move(client)};
}

TEST_F(SendQueueTest, KnowsWhatIsStillOnItsWay) {
    const std::string much(400'000, 'x');
    std::array<char, 65536> block{};
    for (const char* address : {"127.0.0.1", "::1"}) {
        TcpConnection names;
        const auto [server, client] = ConnectTcp(address, names);
        SendQueue queue(server_.Get(), names);
        EXPECT_TRUE(queue.IsDrained()) << address;
        const ssize_t on_its_way = send(server.Get(), much.data(), much.size(), MSG_DONTWAIT);
        EXPECT_FALSE(queue.IsDrained()) << address << ": " << on_its_way << " bytes";
        for (ssize_t left = on_its_way; left > 0;) {
            left -= recv(client.Get(), block.data(), block.size(), 0);
        }
        EXPECT_TRUE(test::Eventually(2s, [&] { return queue.IsDrained(); })) << address;
    }
    SendQueue unknown(server_.Get(), {"203.0.113.1", 1, "203.0.113.1", 2});
    EXPECT_TRUE(unknown.IsDrained());
    ASSERT_GT(send(server_.Get(), much.data(), much.size(), MSG_DONTWAIT), 65'536);
    EXPECT_FALSE(unknown.IsDrained()) << "the web server has not taken it";
    recv(client_.Get(), block.data(), block.size(), MSG_DONTWAIT);
    while (recv(client_.Get(), block.data(), block.size(), MSG_DONTWAIT) > 0) {
    }
    EXPECT_TRUE(unknown.IsDrained());
}

TEST_F(SendQueueTest, TheSlowestViewerGetsAPictureEveryTenSeconds) {
    std::int64_t now_ms = 1;
    SendQueue queue(server_.Get(), {"203.0.113.1", 1, "203.0.113.1", 2}, [&] { return 1000 * now_ms; });
    std::array<char, 100'000> block{};
    ASSERT_GT(send(server_.Get(), block.data(), block.size(), MSG_DONTWAIT), 65'536);
    std::string turns;
    for (; now_ms < 35'000; now_ms += 500) {
        EXPECT_FALSE(queue.IsDrained());
        turns += queue.TakeOverduePicture() ? std::to_string(now_ms / 1000) + " " : "";
    }
    EXPECT_EQ(turns, "10 20 31 ");
    while (recv(client_.Get(), block.data(), block.size(), MSG_DONTWAIT) > 0) {
    }
    EXPECT_TRUE(queue.IsDrained());
    now_ms += 60'000;
    EXPECT_FALSE(queue.TakeOverduePicture()) << "it is drained";
}

TEST_F(SendQueueTest, AMuxedStreamThatASlowConnectionMadeLateGoesOnAtAFreshKeyFrame) {
    SendQueue queue(server_.Get(), {"203.0.113.1", 1, "203.0.113.1", 2});
    RequestContext::Current().SetQueue(&queue);
    const test::TemporaryFolder folder;
    const base::Installation home{(base::Installation::CreateFolders(folder), folder)};
    const ring::StreamId id{1, 0, base::Medium::kVideo};
    ring::Writer writer(home, id, {"H264", {}, 64, 48, false}, {.index_slots = 64, .arena_bytes = 1 << 16});
    const std::int64_t now_ms = base::WallMillis();
    const auto write = [&](bool key, std::int64_t age_ms) {
        const unsigned char byte = 0;
        ASSERT_TRUE(writer.Write({{&byte, 1}, 0, key, 0, now_ms - age_ms}));
    };
    write(true, 4000);
    auto* stream = static_cast<ShmStreamFifo*>(ring::Attach(home, id));
    __tag_DATA_ENTRY_INFO position;
    stream->StartRead(&position);
    const auto next = [&](int last) {
        DataEntry* entry = stream->ReadNext(last, &position);
        const int sequence = entry == nullptr ? -1 : entry->m_SeqNo;
        stream->ReadFinish(entry, true, &position);
        return sequence;
    };
    ring::Writer sound_writer(home, {1, 0, base::Medium::kAudio}, {"AAC", {}, 0, 0, true},
                              {.index_slots = 64, .arena_bytes = 1 << 16});
    auto* sound = static_cast<ShmStreamFifo*>(ring::Attach(home, {1, 0, base::Medium::kAudio}));
    const auto write_sound = [&](std::int64_t age_ms) {
        const unsigned char byte = 0;
        ASSERT_TRUE(sound_writer.Write({{&byte, 1}, 0, true, 0, now_ms - age_ms}));
    };
    __tag_DATA_ENTRY_INFO sound_position;
    sound->StartRead(&sound_position);
    const auto next_sound = [&](int last) {
        DataEntry* entry = sound->ReadNext(last, &sound_position);
        const int sequence = entry == nullptr ? -1 : entry->m_SeqNo;
        sound->ReadFinish(entry, false, &sound_position);
        return sequence;
    };
    for (const std::int64_t age_ms : {5000, 4000, 3000, 1500, 1000}) {
        write_sound(age_ms);
    }
    for (const auto& [key, age_ms] : {std::pair{false, 3000}, {false, 4500}, {true, 2500}, {false, 1500}}) {
        write(key, age_ms);
    }
    EXPECT_EQ(next(0), 1) << "the group that it begins with is sent whatever its age";
    EXPECT_EQ(next_sound(0), 1) << "nothing has held it back";
    std::array<char, 100'000> block{};
    ASSERT_GT(send(server_.Get(), block.data(), block.size(), MSG_DONTWAIT), 65'536);
    EXPECT_EQ(next(1), -1) << "the connection is not drained";
    EXPECT_EQ(next_sound(1), -1);
    while (recv(client_.Get(), block.data(), block.size(), MSG_DONTWAIT) > 0) {
    }
    EXPECT_EQ(next(1), -1) << "one that has waited, one that is old, and one that needs it";
    EXPECT_EQ(next_sound(1), 4) << "the newest";
    EXPECT_EQ(next_sound(4), -1);
    write(true, 500);
    write(false, 400);
    EXPECT_EQ(next(1), 5);
    EXPECT_EQ(next(5), 6) << "and on from there, frame by frame";
    EXPECT_EQ(next(6), -1);
    RequestContext::Current().SetQueue(nullptr);
    stream->StopRead(&position);
    sound->StopRead(&sound_position);
    ring::Detach(stream);
    ring::Detach(sound);
}

}  // namespace
}  // namespace lookhaven::binding
