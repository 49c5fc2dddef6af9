// SPDX-License-Identifier: Apache-2.0
//
// What processes that start at once may occupy together, and what reaches a slot that has changed hands.
#include "standalone/control/slot_table.h"

#include <algorithm>
#include <csignal>
#include <functional>

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

namespace lookhaven::control {
namespace {

// Runs try_it in a process per slot, all released at once; how many of them it was true in.
int SucceedAtOnce(const std::vector<Slot*>& slots, const std::function<bool(Slot&)>& try_it) {
    int gate[2];
    EXPECT_EQ(pipe(gate), 0);
    for (Slot* slot : slots) {
        if (fork() == 0) {
            char byte = 0;
            close(gate[1]);
            while (read(gate[0], &byte, 1) > 0) {
            }
            _exit(try_it(*slot) ? 0 : 1);
        }
    }
    close(gate[0]);
    close(gate[1]);
    int succeeded = 0;
    for (std::size_t i = 0; i < slots.size(); ++i) {
        int status = 0;
        wait(&status);
        succeeded += WIFEXITED(status) && WEXITSTATUS(status) == 0 ? 1 : 0;
    }
    return succeeded;
}

TEST(SlotTable, IsNotOvershotByABurst) {
    SlotTable table(40);
    std::vector<Slot*> slots;
    for (int i = 0; i < 40; ++i) {
        slots.push_back(table.Take());
    }
    ASSERT_EQ(table.Take(), nullptr);
    const auto admit = [&table](Slot& slot) { return table.BeginRequest(slot, 7, 5, 100) == QuotaResult::kGranted; };
    const auto hash = [&table](Slot& slot) { return table.BeginHashing(slot, {4, 4, 4}); };
    EXPECT_EQ(SucceedAtOnce(slots, admit), 5);
    EXPECT_EQ(SucceedAtOnce(slots, hash), 4);
    const auto expected = slots[0]->user == 7 ? QuotaResult::kGranted : QuotaResult::kTooMany;
    EXPECT_EQ(table.BeginRequest(*slots[0], 8, 5, 5), expected);
    const auto other = std::ranges::find(slots, false, [](const Slot* slot) { return slot->is_hashing.load(); });
    EXPECT_FALSE(hash(**other)) << "the host has not reaped those that ended";
    for (Slot* slot : slots) {
        table.Free(*slot);
    }
    Slot* next = table.Take();
    EXPECT_TRUE(hash(*next));
}

TEST(SlotTable, ExportsAreFewAndSearchesUntilTheyAreSent) {
    SlotTable table(5);
    std::vector<Slot*> slots;
    for (const int user : {1, 1, 1, 2, 3}) {
        slots.push_back(table.Take());
        slots.back()->user = user;
    }
    const QuotaResult expected[] = {QuotaResult::kGranted, QuotaResult::kGranted, QuotaResult::kTooManyOfUser,
                                    QuotaResult::kGranted, QuotaResult::kTooMany};
    for (std::size_t i = 0; i < slots.size(); ++i) {
        EXPECT_EQ(table.BeginExport(*slots[i], 2, 3), expected[i]) << i;
    }
    EXPECT_FALSE(table.BeginSearch(*slots[2], 2));
    slots[0]->is_stream = true;
    EXPECT_TRUE(table.BeginSearch(*slots[2], 2));
    EXPECT_EQ(table.BeginExport(*slots[2], 2, 9), QuotaResult::kTooManyOfUser);
    table.Free(*slots[1]);
    EXPECT_EQ(table.BeginExport(*slots[2], 2, 3), QuotaResult::kGranted);
}

TEST(SlotTable, LeavesLogInsRoomToHashAndSearchesTheirMark) {
    SlotTable table(7);
    Slot* last = nullptr;
    const auto hash = [&](int user) {
        last = table.Take();
        last->user = user;
        last->work = Work::kSearch;
        return table.BeginHashing(*last, {.in_all = 4, .of_users = 2, .of_user = 1});
    };
    EXPECT_TRUE(hash(7));
    EXPECT_FALSE(hash(7)) << "one of a user";
    EXPECT_TRUE(hash(8));
    EXPECT_FALSE(hash(9)) << "two of all users";
    EXPECT_TRUE(hash(0) && hash(0)) << "log-ins have the rest";
    SlotTable::EndHashing(*last);
    EXPECT_EQ(last->work, Work::kSearch);
    EXPECT_TRUE(hash(0));
}

TEST(SlotTable, SurvivesAProcessKilledInTheMidstOfIt) {
    SlotTable table(2);
    Slot& slot = *table.Take();
    for (int i = 0; i < 50; ++i) {
        const pid_t child = fork();
        if (child == 0) {
            for (;;) {
                table.BeginHashing(slot, {1, 1, 1});
            }
        }
        usleep(static_cast<useconds_t>(i * 20));
        kill(child, SIGKILL);
        waitpid(child, nullptr, 0);
        ASSERT_TRUE(table.BeginHashing(slot, {1, 1, 1})) << i;
    }
}

TEST(SlotTable, RequestsForAPlayerDoNotReachItsSuccessor) {
    SlotTable table(1);
    const auto play = [&table] {
        Slot& slot = *table.Take();
        SlotTable::SetSession(slot, "abc");
        table.BeginPlayer(slot, 5);
        return RequestRef(*table.FindPlayer("abc", 5));
    };
    const RequestRef first = play();
    const auto pause = [](Pause& asked) { asked = {true, -8}; };
    EXPECT_TRUE(SlotTable::ChangePause(first, pause));
    EXPECT_EQ(SlotTable::PauseOf(*first.slot).resumed_rate, -8);
    table.Free(*first.slot);
    const RequestRef second = play();
    ASSERT_EQ(second.slot, first.slot);
    table.End(second);
    table.End(first);
    EXPECT_TRUE(second.slot->MustEnd()) << "a late End of its predecessor does not undo it";
    table.Free(*second.slot);
    const RequestRef third = play();
    table.End(first);
    EXPECT_FALSE(SlotTable::ChangePause(first, pause));
    EXPECT_FALSE(SlotTable::PauseOf(*third.slot).on);
    EXPECT_FALSE(third.slot->MustEnd());
    table.EndSession("abc");
    EXPECT_TRUE(third.slot->MustEnd());
}

}  // namespace
}  // namespace lookhaven::control
