// SPDX-License-Identifier: Apache-2.0
//
// Runs the operator's command line as a user would, in a state folder of the test's own.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/store/store.h"
#include "test/support/folder.h"

namespace lookhaven::cli {

struct Outcome {
    int code = -1;
    std::string text;  // standard output and standard error
};

// A command line and what it must answer; an empty text is not looked for.
struct Row {
    std::string line;
    int code;
    std::string has;
    std::string has_not = {};
    std::string input = {};
};

class CliTest : public testing::Test {
  protected:
    CliTest();

    // A line as in a shell, which splits it. as_nobody: as a user who owns nothing.
    Outcome Run(const std::string& line, const std::string& input = "", bool as_nobody = false);
    // The same on a terminal, where each answer is typed at its prompt.
    Outcome RunOnTerminal(const std::string& line, const std::vector<std::string>& answers);
    // Runs line after line. A failure answers in one sentence or in JSON, and no password is ever printed.
    void Play(const std::vector<Row>& rows);

    // An installation with an owner "admin" and a viewer, and the demo's cameras.
    void SetUpDemo();

    store::Store Open();
    // Runs the statements in the store, whatever version it has.
    void Sql(const std::vector<std::string>& statements);
    // Makes the store that of the version before the last step in store/schema.cpp.
    void UndoLastMigrations();

    test::TemporaryFolder folder_;
    const std::filesystem::path home_ = folder_ / "home";
};

class DemoTest : public CliTest {
  protected:
    void SetUp() override { SetUpDemo(); }
};

}  // namespace lookhaven::cli
