// SPDX-License-Identifier: Apache-2.0
#include "test/component/cli/program.h"

#include <algorithm>
#include <array>
#include <cstdlib>

#include <fcntl.h>
#include <poll.h>
#include <pty.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/installation.h"
#include "standalone/store/connection.h"
#include "test/support/process.h"

namespace lookhaven::cli {

namespace {

constexpr uid_t kNobody = 65534;
constexpr int kLimitMs = 90'000;  // only a hang exceeds it, under a sanitizer too

[[noreturn]] void Execute(const std::filesystem::path& program, const std::string& line,
                          const std::filesystem::path& home) {
    ::setenv("LOOKHAVEN_HOME", home.c_str(), 1);
    ::execl("/bin/sh", "sh", "-c", ("exec \"$0\" " + line).c_str(), program.c_str(), nullptr);
    _exit(127);
}

int ExitCode(pid_t child) {
    const int status = test::WaitFor(child);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

// What comes until the end, or until the text ends with that prompt.
std::string ReadUntil(int descriptor, const std::string& prompt) {
    std::string text;
    std::array<char, 4096> block{};
    while (prompt.empty() || !text.ends_with(prompt)) {
        pollfd wait{descriptor, POLLIN, 0};
        const ssize_t got = ::poll(&wait, 1, kLimitMs) == 1 ? ::read(descriptor, block.data(), block.size()) : -1;
        if (got <= 0) {
            return text;
        }
        text.append(block.data(), static_cast<std::size_t>(got));
    }
    return text;
}

}  // namespace

CliTest::CliTest() {
    std::filesystem::permissions(folder_, std::filesystem::perms(0755));
}

Outcome CliTest::Run(const std::string& line, const std::string& input, bool as_nobody) {
    const std::filesystem::path input_file = folder_ / "input";
    base::WriteFileAtomically(input_file, input);
    int ends[2] = {-1, -1};
    EXPECT_EQ(::pipe2(ends, O_CLOEXEC), 0);
    std::filesystem::path program = LOOKHAVEN_PROGRAM;
    if (as_nobody) {
        // The build folder may be closed to other users.
        program = folder_ / "lookhaven";
        std::filesystem::copy_file(LOOKHAVEN_PROGRAM, program, std::filesystem::copy_options::skip_existing);
        std::filesystem::permissions(program, std::filesystem::perms(0755));
    }
    const pid_t child = ::fork();
    if (child == 0) {
        ::dup2(base::OpenFile(input_file, O_RDONLY).Get(), STDIN_FILENO);
        ::dup2(ends[1], STDOUT_FILENO);
        ::dup2(ends[1], STDERR_FILENO);
        if (as_nobody && ::geteuid() == 0 && ::setuid(kNobody) != 0) {
            _exit(126);
        }
        Execute(program, line, home_);
    }
    ::close(ends[1]);
    const base::FileDescriptor output(ends[0]);
    std::string text = ReadUntil(output.Get(), "");
    return {ExitCode(child), std::move(text)};
}

Outcome CliTest::RunOnTerminal(const std::string& line, const std::vector<std::string>& answers) {
    int terminal = -1;
    const pid_t child = ::forkpty(&terminal, nullptr, nullptr, nullptr);
    if (child == 0) {
        Execute(LOOKHAVEN_PROGRAM, line, home_);
    }
    const base::FileDescriptor owner(terminal);
    std::string text;
    for (const std::string& answer : answers) {
        text += ReadUntil(terminal, ": ");
        const std::string typed = answer + "\n";
        EXPECT_EQ(::write(terminal, typed.data(), typed.size()), static_cast<ssize_t>(typed.size()));
    }
    text += ReadUntil(terminal, "");
    return {ExitCode(child), std::move(text)};
}

void CliTest::Play(const std::vector<Row>& rows) {
    for (const Row& row : rows) {
        const Outcome outcome = Run(row.line, row.input);
        EXPECT_EQ(outcome.code, row.code) << row.line << "\n" << outcome.text;
        EXPECT_THAT(outcome.text, testing::HasSubstr(row.has)) << row.line;
        if (!row.has_not.empty()) {
            EXPECT_THAT(outcome.text, testing::Not(testing::HasSubstr(row.has_not))) << row.line;
        }
        if (outcome.code >= 64 && row.line.find("--json") != std::string::npos) {
            EXPECT_THAT(outcome.text, testing::StartsWith("{")) << row.line;
        } else if (outcome.code >= 64) {
            EXPECT_EQ(std::count(outcome.text.begin(), outcome.text.end(), '\n'), 1) << row.line << outcome.text;
        }
        EXPECT_THAT(outcome.text, testing::Not(testing::HasSubstr("s3cret"))) << row.line;
    }
}

store::Store CliTest::Open() {
    return store::Store::Open(base::Installation(home_).StoreUrl());
}

void CliTest::Sql(const std::vector<std::string>& statements) {
    const std::string url = base::Installation(home_).StoreUrl();
    store::Connection(store::StoreAddress::Parse(url)).Write([&](soci::session& sql) {
        for (const std::string& statement : statements) {
            sql << statement;
        }
    });
}

void CliTest::UndoLastMigrations() {
    // The last step changes PostgreSQL alone, so the one before it, too.
    Sql({"drop table event_id_blocks", "drop table mount_leases", "drop table shared_mount_hosts",
         "alter table events_pending_deletion drop column host_id", "alter table events drop column host_id",
         "update schema_version set version = version - 2"});
}

void CliTest::SetUpDemo() {
    ASSERT_EQ(Run("init --admin admin", "admin-s3cret\n").code, 0);
    ASSERT_EQ(Run("demo setup", "viewer-s3cret\n").code, 0);
}

}  // namespace lookhaven::cli
