// SPDX-License-Identifier: Apache-2.0
//
// lookhaven user: what each line answers, and that no password shows on a terminal.
#include "standalone/base/installation.h"
#include "standalone/store/users.h"
#include "test/component/cli/program.h"

namespace lookhaven::cli {
namespace {

using testing::HasSubstr;
using testing::Not;

TEST_F(DemoTest, AccountsAreAddedChangedAndRemoved) {
    Play({{"user add bob --privilege manager", 0, "as manager", "", "first-s3cret\n"},
          {"user add BOB", 65, "already", "", "first-s3cret\n"},
          {"user add eve", 65, "no password"},
          {"user add eve --password eve-s3cret", 64, "does not take"},
          {"user add eve --privilege king", 64, "--privilege"},
          {"user set bob --privilege viewer", 0, "is viewer now"},
          {"user set bob --privilege manager --json", 0, "\"privilege\" : 1"},
          {"user set bob", 64, "--privilege"},
          {"user set nobody --privilege viewer", 66, "no such account"},
          {"user set admin --privilege viewer", 65, "owner"},
          {"user passwd bob", 0, "new password", "", "second-s3cret\n"},
          {"user passwd nobody", 66, "no such account", "", "second-s3cret\n"},
          {"user deny bob 1 --kind audio --kind live", 0, "denied"},
          {"user deny --kind playback bob 4", 0, "denied"},
          {"user deny --kind export bob 2", 0, "denied"},
          {"user allow --kind export bob 2", 0, "allowed to bob.\n"},
          {"user allow --kind export bob 4", 0, "playback of it is denied"},
          {"user deny bob 99", 66, "no camera 99"},
          {"user deny bob 1 --kind smell", 64, "--kind"},
          {"user list", 0, "audio 1; export 4; live 1; playback 4"},
          {"user allow bob 1", 0, "allowed"},
          {"user list", 0, "playback 4", "live 1"},
          {"user add ann", 0, "as viewer", "", "third-s3cret\n"},
          {"user deny bob --mark", 65, "is manager"},
          {"user allow ann --mark", 0, "allowed to ann"},
          {"user allow ann 1 --mark", 64, "name one"},
          {"user allow ann --mark --kind live", 64, "--kind"},
          {"user list", 0, "yes"},
          {"user deny ann --mark --json", 0, "\"may_mark\" : false"},
          {"user remove admin", 65, "only owner"},
          {"user remove bob --json", 0, "\"bob\""},
          {"user remove bob", 66, "no such account"},
          {"user remove bob --json", 66, "\"code\" : 66"}});
}

TEST_F(DemoTest, AccessTokensAreAddedListedAndRemoved) {
    Play({{"token add Till --camera 1 --kind pos --expires 90d", 0, "\nlht_"},
          {"token add Till --camera 1", 65, "already an access token"},
          {"token add Box --camera 1 --camera 2 --json", 0, "\"expires\" : 0"},
          {"token add Other --camera 99", 66, "no camera 99"},
          {"token add Other --camera 1 --kind fire", 64, "--kind"},
          {"token add Other --camera 1 --expires 0", 64, "without --expires"},
          {"token add Other --camera 1 --expires 9999d", 65, "3650 days"},
          {"token add Other", 64, "--camera"},
          {"token list", 0, "alert pos", "lht_"},
          {"token list --json", 0, "\"Till\"", "lht_"},
          {"audit --json", 0, "token.add", "lht_"},
          {"token remove Till", 0, "stays"},
          {"token remove Till", 66, "no access token Till"},
          {"token list", 0, "never", "Till"}});
}

TEST_F(DemoTest, ATerminalNeverShowsAPassword) {
    Outcome outcome = RunOnTerminal("user add bob", {"bob-s3cret", "bob-s3cret"});
    EXPECT_EQ(outcome.code, 0) << outcome.text;
    EXPECT_THAT(outcome.text, Not(HasSubstr("s3cret")));
    outcome = RunOnTerminal("user passwd bob", {"other-s3cret", "a typo-s3cret"});
    EXPECT_EQ(outcome.code, 65) << outcome.text;
    EXPECT_THAT(outcome.text, HasSubstr("differ"));
    EXPECT_THAT(outcome.text, Not(HasSubstr("s3cret")));
    store::Store store = store::Store::Open(base::Installation(home_).StoreUrl());
    EXPECT_TRUE(store::Users(store).CheckPassword("bob", "bob-s3cret"));
}

}  // namespace
}  // namespace lookhaven::cli
