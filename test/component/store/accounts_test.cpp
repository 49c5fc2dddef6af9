// SPDX-License-Identifier: Apache-2.0
//
// Accounts, sessions and the slow-down of guessing.
#include <atomic>

#include <dlfcn.h>
#include <sodium.h>

#include "standalone/store/login_throttle.h"
#include "standalone/store/sessions.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::store {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;

constexpr std::int64_t kNow = 4'000'000'000;  // beyond 31 bits
constexpr std::int64_t kHour = 3600;
const std::string kPassword = "correct horse";

// How often a password was verified with the full cost parameters.
int whole_hashes = 0;

class AccountTest : public StoreTest {
  protected:
    Users users_{store_};
    Sessions sessions_{store_};
};

TEST_P(AccountTest, NamesThatCouldMisleadAreRefused) {
    for (const char* name : {"a", "Bob.Smith-2_x@example.org", "0", "lookhaven2"}) {
        EXPECT_EQ(users_.Add(name, kPassword, Privilege::kViewer).name, name);
    }
    for (const char* name : {"Lookhaven", "LOOKHAVEN", ".a", "-a", "a b", "a/b", "a\"b", "ünder", "a<b>", "a:b"}) {
        EXPECT_THROW(users_.Add(name, kPassword, Privilege::kViewer), InvalidRecord) << name;
    }
    for (const std::string& name : kHostileTexts) {
        EXPECT_THROW(users_.Add(name, kPassword, Privilege::kViewer), InvalidRecord) << name;
        EXPECT_FALSE(users_.FindByName(name)) << name;
    }
    EXPECT_THROW(users_.Add("A", kPassword, Privilege::kOwner), AlreadyExists) << "differs in case alone";
    EXPECT_EQ(users_.List().size(), 4U);
}

TEST_P(AccountTest, IdsAreNeverGivenAgainAndNeverThePairedHosts) {
    Force("update counters set value = 1022 where name = 'user'");
    EXPECT_EQ(users_.Add("a", kPassword, Privilege::kViewer).id, 1023);
    EXPECT_EQ(users_.Add("b", kPassword, Privilege::kViewer).id, 1025);
    users_.Deny(1025, 7);
    users_.Remove(1025);
    EXPECT_EQ(users_.Add("b", kPassword, Privilege::kViewer).id, 1026);
    EXPECT_THAT(users_.DeniedCameras(1026, CameraAccess::kLive), IsEmpty()) << "a removed account's denials";
    EXPECT_FALSE(users_.Find(1025));
}

TEST_P(AccountTest, OnlyTheRightPasswordLogsInAndAnUnknownNameCostsAsMuchAsAWrongPassword) {
    const User bob = users_.Add("bob", kPassword, Privilege::kManager);
    users_.Add("eve", std::string("nul\0inside", 10), Privilege::kViewer);
    const struct {
        std::string name, password;
        bool admitted;
    } rows[] = {
        {"bob", kPassword, true},
        {"BOB", kPassword, true},
        {"bob", kPassword + " ", false},
        {"bob", "", false},
        {"bob", "CORRECT HORSE", false},
        {"eve", "nul", false},
        {"eve", std::string("nul\0inside", 10), true},
        {"nobody", kPassword, false},
        {"' or 1=1 --", kPassword, false},
        {"bob", std::string(1'000'000, 'x'), false},
    };
    for (const auto& row : rows) {
        whole_hashes = 0;
        EXPECT_EQ(users_.CheckPassword(row.name, row.password).has_value(), row.admitted) << row.name;
        EXPECT_EQ(whole_hashes, 1) << row.name;
    }
    EXPECT_THAT(Ask("select password_hash from users where id = " + std::to_string(bob.id)),
                StartsWith("$argon2id$v=19$m=65536,"));
    EXPECT_THROW(users_.Add("short", "1234567", Privilege::kViewer), InvalidRecord);
    EXPECT_THROW(users_.SetPassword(999, kPassword), NotFound);
    users_.SetPassword(bob.id, "another one");
    EXPECT_FALSE(users_.CheckPassword("bob", kPassword));
    EXPECT_TRUE(users_.CheckPassword("bob", "another one"));
}

TEST_P(AccountTest, DenialsAreKeptPerKind) {
    const int id = users_.Add("bob", kPassword, Privilege::kViewer).id;
    users_.Deny(id, 2);
    users_.Deny(id, 2, {CameraAccess::kAudio});
    users_.Deny(id, 5, {CameraAccess::kAudio});
    users_.Allow(id, 2, {CameraAccess::kPlayback});
    EXPECT_THAT(users_.DeniedCameras(id, CameraAccess::kLive), ElementsAre(2));
    EXPECT_THAT(users_.DeniedCameras(id, CameraAccess::kPlayback), IsEmpty());
    EXPECT_THAT(users_.DeniedCameras(id, CameraAccess::kAudio), ElementsAre(2, 5));
    users_.Allow(id, 2);
    EXPECT_THAT(users_.DeniedCameras(id, CameraAccess::kAudio), ElementsAre(5));
    EXPECT_THROW(users_.Deny(99, 2), NotFound);

    users_.DenyItem(id, DeniableItem::kDoor, 3);
    users_.DenyItem(id, DeniableItem::kDoor, 3);
    users_.DenyItem(id, DeniableItem::kEmap, 4);
    EXPECT_THAT(users_.DeniedItems(id, DeniableItem::kDoor), ElementsAre(3));
    EXPECT_THAT(users_.DeniedItems(id, DeniableItem::kIoModule), IsEmpty());
    users_.AllowItem(id, DeniableItem::kDoor, 3);
    EXPECT_THAT(users_.DeniedItems(id, DeniableItem::kDoor), IsEmpty());
    EXPECT_THROW(users_.DenyItem(99, DeniableItem::kDoor, 3), NotFound);
}

TEST_P(AccountTest, LosingARightEndsTheUsersSessionsAndNobodyElses) {
    const int id = users_.Add("bob", kPassword, Privilege::kViewer).id;
    const NewSession other = sessions_.Create(users_.Add("eve", kPassword, Privilege::kViewer).id, kNow);
    Denials door;
    door.items[DeniableItem::kDoor] = {3};
    Denials sound;
    sound.cameras[CameraAccess::kAudio] = {2};
    const struct {
        const char* change;
        std::function<void()> make;
        bool ends;
    } rows[] = {
        {"allow", [&] { users_.Allow(id, 2); }, false},
        {"deny", [&] { users_.Deny(id, 2, {CameraAccess::kAudio}); }, true},
        {"deny item", [&] { users_.DenyItem(id, DeniableItem::kDoor, 3); }, true},
        {"allow marks", [&] { users_.AllowMarks(id); }, false},
        {"deny marks", [&] { users_.DenyMarks(id); }, true},
        {"more privilege", [&] { users_.SetPrivilege(id, Privilege::kOwner); }, false},
        {"less privilege", [&] { users_.SetPrivilege(id, Privilege::kManager); }, true},
        {"the same denials", [&] { users_.SetDenials(id, users_.FindDenials(id)); }, false},
        {"fewer denials", [&] { users_.SetDenials(id, door); }, false},
        {"another denial", [&] { users_.SetDenials(id, sound); }, true},
        {"password", [&] { users_.SetPassword(id, "another one"); }, true},
        {"end of user", [&] { EXPECT_EQ(sessions_.EndOfUser(id), 1); }, true},
        {"removal", [&] { users_.Remove(id); }, true},
    };
    for (const auto& row : rows) {
        sessions_.EndOfUser(id);
        const NewSession session = sessions_.Create(id, kNow);
        row.make();
        EXPECT_EQ(sessions_.FindBySecret(session.secret, kNow).has_value(), !row.ends) << row.change;
        EXPECT_EQ(sessions_.EndedAmong({session.handle, other.handle}, kNow).size(), row.ends ? 1U : 0U) << row.change;
    }
    EXPECT_FALSE(sessions_.End(id, other.handle)) << "somebody else's";
    EXPECT_TRUE(sessions_.FindBySecret(other.secret, kNow));
    const auto verified = users_.CheckPassword("eve", kPassword);
    EXPECT_TRUE(sessions_.FindBySecret(sessions_.Create(*verified, kNow).secret, kNow));
    users_.SetPassword(*verified, HashedPassword(kPassword), other.handle);
    EXPECT_THAT(sessions_.OfUser(verified->id, kNow), testing::SizeIs(1)) << "the one in which it was changed";
    EXPECT_TRUE(sessions_.FindBySecret(other.secret, kNow));
    EXPECT_THROW(users_.SetPassword(*verified, HashedPassword(kPassword), ""), NotFound) << "it has changed since";
    EXPECT_THROW(sessions_.Create(*verified, kNow), NotFound) << "a log-in that the change overtook";
    EXPECT_THROW(sessions_.Create(id, kNow), NotFound) << "the account is gone";
}

TEST_P(AccountTest, ASessionOpensBySecretAloneAndTheStoreDoesNotHoldIt) {
    const User bob = users_.Add("bob", kPassword, Privilege::kManager);
    const NewSession made = sessions_.Create(bob.id, kNow);
    const auto found = sessions_.FindBySecret(made.secret, kNow);
    ASSERT_TRUE(found);
    EXPECT_EQ(found->handle, made.handle);
    EXPECT_EQ(found->user.id, bob.id);
    EXPECT_EQ(found->user.name, "bob");
    EXPECT_TRUE(found->user.IsManager());
    const std::string stored = Ask("select secret_hash from sessions");
    EXPECT_NE(stored, made.secret);
    for (const std::string& wrong : {stored, made.handle, made.secret.substr(1), made.secret + "0"}) {
        EXPECT_FALSE(sessions_.FindBySecret(wrong, kNow)) << wrong;
    }
    for (const std::string& wrong : kHostileTexts) {
        EXPECT_FALSE(sessions_.FindBySecret(wrong, kNow)) << wrong;
        EXPECT_FALSE(sessions_.End(wrong)) << wrong;
        EXPECT_EQ(sessions_.EndedAmong({wrong}, kNow).size(), 1U) << wrong;
    }
    const NewSession second = sessions_.Create(bob.id, kNow);
    EXPECT_TRUE(sessions_.End(made.handle));
    EXPECT_FALSE(sessions_.End(made.handle));
    EXPECT_THAT(sessions_.EndedAmong({made.handle, second.handle}, kNow), ElementsAre(made.handle));
}

TEST_P(AccountTest, AUserHasSoManySessionsAndTheOldestEnds) {
    const int id = users_.Add("bob", kPassword, Privilege::kViewer).id;
    const NewSession other = sessions_.Create(users_.Add("eve", kPassword, Privilege::kViewer).id, kNow - 100);
    std::vector<std::string> handles{sessions_.Create(id, kNow - 1).handle};
    for (int i = 1; i <= Sessions::kMaxPerUser; ++i) {
        EXPECT_THAT(sessions_.EndedAmong(handles, kNow), IsEmpty()) << i;
        handles.push_back(sessions_.Create(id, kNow).handle);
    }
    EXPECT_THAT(sessions_.EndedAmong(handles, kNow), ElementsAre(handles.front()));
    EXPECT_TRUE(sessions_.FindBySecret(other.secret, kNow));
}

TEST_P(AccountTest, SessionsEndByIdlenessAndByAge) {
    const int id = users_.Add("bob", kPassword, Privilege::kViewer).id;
    std::vector<std::int64_t> every_11_hours(15);
    std::ranges::generate(every_11_hours, [at = 0]() mutable { return at += 11 * kHour; });
    const struct {
        const char* use;
        std::vector<std::int64_t> seen_after_s;
        std::int64_t last_alive_s;
    } rows[] = {
        {"never used", {}, 12 * kHour - 1},
        {"used once", {11 * kHour}, 23 * kHour - 1},
        {"used within the minute", {59}, 12 * kHour - 1},
        {"used for a week", every_11_hours, 7 * 24 * kHour - 1},
    };
    for (const auto& row : rows) {
        const NewSession made = sessions_.Create(id, kNow);
        for (const std::int64_t seen : row.seen_after_s) {
            const auto session = sessions_.FindBySecret(made.secret, kNow + seen);
            ASSERT_TRUE(session) << row.use;
            EXPECT_EQ(sessions_.Touch(*session, kNow + seen), seen >= 60) << row.use;
            EXPECT_FALSE(sessions_.Touch(*session, kNow + seen)) << "written twice, by a stale reader too: " << row.use;
        }
        EXPECT_TRUE(sessions_.FindBySecret(made.secret, kNow + row.last_alive_s)) << row.use;
        EXPECT_FALSE(sessions_.FindBySecret(made.secret, kNow + row.last_alive_s + 1)) << row.use;
        EXPECT_THAT(sessions_.EndedAmong({made.handle}, kNow + row.last_alive_s), IsEmpty()) << row.use;
        EXPECT_THAT(sessions_.EndedAmong({made.handle}, kNow + row.last_alive_s + 1), ElementsAre(made.handle));
        EXPECT_EQ(sessions_.PurgeExpired(kNow + row.last_alive_s), 0) << row.use;
        EXPECT_EQ(sessions_.PurgeExpired(kNow + row.last_alive_s + 1), 1) << row.use;
    }
}

TEST_P(AccountTest, ALockedStoreHoldsUpNoSession) {
    const int id = users_.Add("bob", kPassword, Privilege::kViewer).id;
    const std::string secret = sessions_.Create(id, kNow).secret;
    const std::optional<Session> session = sessions_.FindBySecret(secret, kNow);
    Connection(StoreAddress::Parse(url_)).Write([&](soci::session& sql) {
        sql << "update sessions set user_id = user_id";
        const auto start = std::chrono::steady_clock::now();
        EXPECT_THROW(sessions_.Touch(*session, kNow + 60), StoreError);
        EXPECT_THROW(sessions_.PurgeExpired(kNow + 31 * 24 * kHour), StoreError);
        EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(2));
        EXPECT_TRUE(sessions_.FindBySecret(secret, kNow));
    });
    EXPECT_TRUE(sessions_.Touch(*session, kNow + 60));
    store_.connection().Read([&](soci::session& sql) {
        const bool is_sqlite = GetParam() == Engine::kSqlite;
        std::string patience;
        std::string durability;
        sql << (is_sqlite ? "pragma busy_timeout" : "show lock_timeout"), soci::into(patience);
        sql << (is_sqlite ? "pragma synchronous" : "show synchronous_commit"), soci::into(durability);
        EXPECT_EQ(patience + durability, is_sqlite ? "50002" : "0on") << "as before for other changes";
    });
}

TEST_P(AccountTest, GuessingIsSlowedDownPerAccountAndAddress) {
    LoginThrottle throttle(store_);
    const struct {
        std::int64_t at_s;
        const char* account;
        const char* address;
        int wait_s;
    } rows[] = {
        {0, "bob", "::1", 0},   {1, "bob", "::1", 0},   {2, "BOB", "::1", 0},       {3, "bob", "::1", 0},
        {20, "bob", "::1", 0},  {21, "bob", "::1", 59}, {21, "bob", "10.0.0.1", 0}, {21, "eve", "::1", 0},
        {79, "bob", "::1", 1},  {80, "bob", "::1", 0},  {81, "bob", "::1", 0},      {150, "bob", "::1", 0},
        {151, "bob", "::1", 0}, {90, "bob", "::1", 0},  // the clock was set back
    };
    for (const auto& row : rows) {
        EXPECT_EQ(throttle.Enter(row.account, row.address, kNow + row.at_s), row.wait_s) << row.at_s << row.account;
    }
    for (int i = 0; i < 20; ++i) {
        EXPECT_EQ(throttle.Enter("eve", "::1", kNow + 200), 0) << "successful log-ins do not count";
        throttle.Clear("eve", "::1");
    }
    for (const std::string& text : kHostileTexts) {
        EXPECT_EQ(throttle.Enter(text, text, kNow + 300), 0);
    }
}

TEST_P(AccountTest, GuessesAtOnceAreCountedEach) {
    std::atomic<int> admitted = 0;
    InParallel(8, [&](Store& store) {
        for (int i = 0; i < 3; ++i) {
            admitted += LoginThrottle(store).Enter("bob", "::1", kNow) == 0 ? 1 : 0;
        }
    });
    EXPECT_EQ(admitted, 5);
}

LOOKHAVEN_ON_BOTH_ENGINES(AccountTest);

}  // namespace
}  // namespace lookhaven::store

// Stands before the library's own, which it counts and calls.
extern "C" int crypto_pwhash_str_verify(const char* hash, const char* password, unsigned long long size) {
    const bool whole = crypto_pwhash_str_needs_rehash(hash, crypto_pwhash_OPSLIMIT_INTERACTIVE,
                                                      crypto_pwhash_MEMLIMIT_INTERACTIVE) == 0;
    lookhaven::store::whole_hashes += whole;
    static const auto original =
        reinterpret_cast<decltype(&crypto_pwhash_str_verify)>(::dlsym(RTLD_NEXT, "crypto_pwhash_str_verify"));
    return original(hash, password, size);
}
