// SPDX-License-Identifier: Apache-2.0
//
// What lookhaven-camera has received of its camera ahead of the reads that ask for it.
#include <algorithm>
#include <string>

#include <gtest/gtest.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::test {
namespace {

using base::FileDescriptor;

class ReadAheadTest : public testing::Test {
  protected:
    void SetUp() override {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address;
        auto* generic = reinterpret_cast<sockaddr*>(&address);
        ASSERT_EQ(::bind(listener_.Get(), generic, size), 0);
        ASSERT_EQ(::listen(listener_.Get(), 1), 0);
        ASSERT_EQ(::getsockname(listener_.Get(), generic, &size), 0);
        address_ = address;
    }

    // Connects once more, to a camera that sends this; the connection gets the number of the one before.
    void Connect(const std::string& bytes) {
        socket_.Reset();
        socket_.Reset(::socket(AF_INET, SOCK_STREAM, 0));
        ASSERT_EQ(::connect(socket_.Get(), reinterpret_cast<const sockaddr*>(&address_), sizeof address_), 0);
        camera_.Reset(::accept(listener_.Get(), nullptr, nullptr));
        ASSERT_EQ(::send(camera_.Get(), bytes.data(), bytes.size(), 0), static_cast<ssize_t>(bytes.size()));
    }

    // Empty at the end.
    std::string Receive(std::size_t size) {
        std::string bytes(size, '\0');
        const ssize_t got = ::recv(socket_.Get(), bytes.data(), size, 0);
        EXPECT_GE(got, 0);
        bytes.resize(static_cast<std::size_t>(std::max<ssize_t>(got, 0)));
        return bytes;
    }

    bool HasInput() {
        pollfd asked{socket_.Get(), POLLIN, 0};
        return ::poll(&asked, 1, 0) == 1 && asked.revents == POLLIN;
    }

    int LeftInKernel() {
        int bytes = -1;
        EXPECT_EQ(::ioctl(socket_.Get(), FIONREAD, &bytes), 0);
        return bytes;
    }

    FileDescriptor listener_{::socket(AF_INET, SOCK_STREAM, 0)};
    sockaddr_in address_{};
    FileDescriptor camera_;
    FileDescriptor socket_;
};

TEST_F(ReadAheadTest, SmallReadsTakeOneCallAndGetEverythingInOrder) {
    Connect("$123payload");
    EXPECT_EQ(Receive(1), "$");
    EXPECT_EQ(LeftInKernel(), 0);
    EXPECT_TRUE(HasInput());
    EXPECT_EQ(Receive(3), "123");
    EXPECT_EQ(Receive(100'000), "payload") << "not more than was there";
    EXPECT_FALSE(HasInput());
    const std::string large(60'000, 'x');
    ::send(camera_.Get(), large.data(), large.size(), 0);
    camera_.Reset();
    std::string all = Receive(10);
    for (std::string piece; !(piece = Receive(100'000)).empty();) {
        all += piece;
    }
    EXPECT_EQ(all, large) << "what was received ahead outlives the connection's end";
}

TEST_F(ReadAheadTest, AConnectionGetsNothingOfTheOneBefore) {
    Connect("of the first");
    EXPECT_EQ(Receive(2), "of");
    const int number = socket_.Get();
    Connect("");
    ASSERT_EQ(socket_.Get(), number);
    EXPECT_FALSE(HasInput());
    ::send(camera_.Get(), "new", 3, 0);
    EXPECT_EQ(Receive(100), "new");
}

}  // namespace
}  // namespace lookhaven::test
