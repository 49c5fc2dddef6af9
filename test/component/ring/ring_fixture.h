// SPDX-License-Identifier: Apache-2.0
//
// What tests of rings share: an installation of their own, frames whose every byte can be foretold, child processes.
#pragma once

#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/installation.h"
#include "standalone/ring/inventory.h"
#include "standalone/ring/reader.h"
#include "standalone/ring/writer.h"

namespace lookhaven::ring {

// An installation in a temporary folder; after the test it must have no segment left.
class RingTest : public testing::Test {
  protected:
    RingTest() : home_(MakeFolder()), installation_((base::Installation::CreateFolders(home_), home_)) {}
    ~RingTest() override {
        RemoveOrphans(installation_);
        EXPECT_TRUE(ListSegments(installation_).empty()) << "a segment was left over";
        std::filesystem::remove_all(home_);
    }

    std::filesystem::path home_;
    base::Installation installation_;

  private:
    static std::filesystem::path MakeFolder() {
        std::string pattern = testing::TempDir() + "lookhaven-ring-XXXXXX";
        return ::mkdtemp(pattern.data());
    }
};

// Fills data with words that follow from the seed and their place.
inline void Fill(std::span<unsigned char> data, std::uint64_t seed) {
    for (std::size_t i = 0; i + 8 <= data.size(); i += 8) {
        const std::uint64_t word = (seed + i) * 0x9e3779b97f4a7c15ULL;
        std::memcpy(&data[i], &word, 8);
    }
}

inline std::vector<unsigned char> MakeData(std::size_t size_bytes, std::uint64_t seed) {
    std::vector<unsigned char> data(size_bytes);
    Fill(data, seed);
    return data;
}

// Every word of the entry's data is as Fill made it from the seed.
inline bool IsFilled(const Entry& entry, std::uint64_t seed) {
    for (std::size_t i = 0; i + 8 <= static_cast<std::size_t>(entry.length); i += 8) {
        std::uint64_t word = 0;
        std::memcpy(&word, entry.Data() + i, 8);
        if (word != (seed + i) * 0x9e3779b97f4a7c15ULL) {
            return false;
        }
    }
    return true;
}

// Runs the body in a child, which never returns from it into the test, and dies with the test.
template <typename Body>
pid_t InChild(Body body) {
    const pid_t child = ::fork();
    if (child == 0) {
        ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        try {
            body();
        } catch (...) {
            ::_exit(99);
        }
        ::_exit(0);
    }
    return child;
}

inline int WaitFor(pid_t child) {
    int status = 0;
    ::waitpid(child, &status, 0);
    return status;
}

inline void KillAndWait(pid_t child) {
    ::kill(child, SIGKILL);
    WaitFor(child);
}

// A child that stays where it is after the body, until the object goes: then it is killed. The constructor returns when
// the body has run.
class KilledChild {
  public:
    template <typename Body>
    explicit KilledChild(Body body) {
        int ready[2];
        EXPECT_EQ(::pipe(ready), 0);
        pid_ = InChild([&] {
            body();
            [[maybe_unused]] const ssize_t written = ::write(ready[1], "x", 1);
            for (;;) {
                ::pause();
            }
        });
        ::close(ready[1]);
        char byte = 0;
        EXPECT_EQ(::read(ready[0], &byte, 1), 1) << "the child failed";
        ::close(ready[0]);
    }
    ~KilledChild() { Kill(); }
    KilledChild(const KilledChild&) = delete;
    KilledChild& operator=(const KilledChild&) = delete;

    void Kill() {
        if (pid_ > 0) {
            KillAndWait(std::exchange(pid_, -1));
        }
    }
    pid_t Pid() const { return pid_; }

  private:
    pid_t pid_ = -1;
};

}  // namespace lookhaven::ring
