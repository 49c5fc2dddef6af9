// SPDX-License-Identifier: Apache-2.0
//
// Marks: their footage, their text and their reporters, and that they are found as a look at every one finds them.
#include "standalone/store/marks.h"

#include <algorithm>
#include <atomic>

#include "standalone/store/recording_plans.h"
#include "test/component/store/random_records.h"

namespace lookhaven::store {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

const std::vector<std::string> kWords = {"coffee", "tea", "cake", "milk"};

class MarkTest : public RandomRecords {
  protected:
    Events events_{store_};
    Marks marks_{store_};
};

TEST_P(MarkTest, AMarkHasTheFootageThatItsCamerasPlanAsksFor) {
    const int camera = AddCamera();
    const Mark alert = marks_.Add(MarkKind::kAlert, camera, kDay / 2, 0, "line one\nzwei");
    EXPECT_EQ(alert.start_s, kDay / 2) << "without a plan nothing is recorded before it";
    EXPECT_EQ(alert.end_s, kDay / 2 + RecordingPlan().post_s);
    RecordingPlans(store_).Set(camera, {.pre_s = 300, .post_s = 0});
    const Mark pos = marks_.Add(MarkKind::kPos, camera, 100, kMaxMarkSeconds, "");
    EXPECT_EQ(pos.start_s, 0) << "not before 1970";
    EXPECT_EQ(pos.end_s, 100 + kMaxMarkSeconds);

    EXPECT_THAT(Ids(marks_.Pending()), ElementsAre(pos.id, alert.id));
    EXPECT_EQ(marks_.Find(MarkKind::kAlert, alert.id).value(), alert);
    EXPECT_FALSE(marks_.Find(MarkKind::kPos, alert.id)) << "an alert is no POS transaction";
    EXPECT_FALSE(events_.Find(alert.id));
    EXPECT_GT(events_.NextId(), pos.id) << "one counter for both";
    EXPECT_THAT(marks_.EndedBy(camera, kDay, {}, 9), IsEmpty()) << "pending";
    EXPECT_TRUE(marks_.Save(pos.id, 7, "1/a.span"));
    EXPECT_TRUE(marks_.Miss(alert.id));
    EXPECT_THAT(marks_.Pending(), IsEmpty());
    EXPECT_THAT(Ids(marks_.OnMount(7)), ElementsAre(pos.id));
    EXPECT_EQ(marks_.OnMount(7)[0].path, "1/a.span");
    EXPECT_THAT(Ids(marks_.EndedBy(camera, alert.end_s - 1, {}, 9)), ElementsAre(pos.id));
    EXPECT_THAT(Ids(marks_.EndedBy(camera, alert.end_s, {}, 9)), ElementsAre(pos.id, alert.id));
    EXPECT_THAT(Ids(marks_.EndedBy(camera, alert.end_s, pos, 9)), ElementsAre(alert.id));
    EXPECT_TRUE(marks_.Remove(pos.id));
    EXPECT_FALSE(marks_.Remove(pos.id) || marks_.Save(pos.id, 7, "x") || marks_.Miss(pos.id));

    EXPECT_THROW(marks_.Add(MarkKind::kAlert, 99, 100, 0, ""), NotFound);
    const Mark told = marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {7, "terminal"}, kDay);
    EXPECT_EQ(marks_.Find(MarkKind::kAlert, told.id)->reporter, (Reporter{7, "terminal"}));
    for (int of = 0; of < 2; ++of) {
        EXPECT_NO_THROW(marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {}, kDay, 1)) << "nobody's";
    }
    EXPECT_THROW(marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {7, "terminal"}, 2 * kDay, 1), TooManyMarks)
        << "waits";
    EXPECT_TRUE(marks_.Miss(told.id));
    EXPECT_NO_THROW(marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {7, "terminal"}, 2 * kDay, 1)) << "a day later";
    std::atomic<int> added = 0;
    InParallel(6, [&](Store& store) {
        try {
            Marks(store).Add(MarkKind::kAlert, camera, 100, 0, "", {8, "terminal"}, kDay, 2);
            ++added;
        } catch (const TooManyMarks&) {
        }
    });
    EXPECT_EQ(added, 2);
    for (const auto& [moment, length] : {std::pair<std::int64_t, std::int64_t>{-1, 0},
                                         {kNever, 0},
                                         {1LL << 31, 0},
                                         {100, -1},
                                         {100, kMaxMarkSeconds + 1},
                                         {100, kNever}}) {
        EXPECT_THROW(marks_.Add(MarkKind::kAlert, camera, moment, length, ""), InvalidRecord) << moment << length;
    }
    for (const std::string& text : kHostileTexts) {
        try {
            const Mark kept = marks_.Add(MarkKind::kPos, camera, 100, 0, text);
            EXPECT_EQ(marks_.Find(MarkKind::kPos, kept.id)->text, text);
        } catch (const InvalidRecord&) {
            EXPECT_TRUE(text.size() > kMaxMarkTextBytes ||
                        std::ranges::any_of(text, [](char c) { return c != '\n' && (c < ' ' || c > '~'); }))
                << text;
        }
    }
}

TEST_P(MarkTest, MarksAreFoundAsALookAtEveryMarkFindsThem) {
    std::vector<Mark> all(200);
    std::ranges::generate(all, [this, id = 1]() mutable {
        Mark mark;
        mark.id = id++;
        mark.kind = Draw(0, 1) == 0 ? MarkKind::kAlert : MarkKind::kPos;
        mark.camera_id = Draw(1, 5);
        mark.start_s = kDay / 2 + Draw(0, 40) * 600;
        mark.moment_s = mark.start_s + 5;
        mark.end_s = mark.start_s + (Draw(0, 5) == 0 ? 4200 : Draw(0, 600));
        mark.text = "receipt " + std::to_string(mark.id) + ' ' + kWords[static_cast<std::size_t>(Draw(0, 3))];
        mark.state = Draw(0, 3) == 0 ? MarkState::kMissed : MarkState::kSaved;
        mark.mount_id = 1;
        return mark;
    });
    marks_.AddAll(all);
    int found = 0;
    for (int i = 0; i < 100; ++i) {
        auto filter = RandomSpan<MarkFilter>(kDay / 2);
        filter.kind = Draw(0, 1) == 0 ? std::nullopt : std::optional(MarkKind::kPos);
        const auto expected =
            Naive(all, filter, [&](const Mark& mark) { return !filter.kind || mark.kind == *filter.kind; });
        ASSERT_EQ(marks_.List(filter), expected) << i;
        const Step step = RandomStep(kDay / 2);
        ASSERT_EQ(marks_.Next(step, filter.kind), NaiveNext(all, step,
                                                            [&](const Mark& mark) {
                                                                return mark.state == MarkState::kSaved &&
                                                                       (!filter.kind || mark.kind == *filter.kind);
                                                            }))
            << i;
        found += static_cast<int>(expected.size());
    }
    EXPECT_GT(found, 200);
    // By words, too, and what is removed, by whatever way, is not found by them any more.
    found = 0;
    for (int i = 0; i < 100; ++i) {
        if (const auto at = static_cast<std::size_t>(Draw(0, 199)); i % 3 == 0 && at < all.size()) {
            EXPECT_TRUE(marks_.Remove(all[at].id));
            all.erase(all.begin() + static_cast<std::ptrdiff_t>(at));
        }
        auto filter = RandomSpan<MarkFilter>(kDay / 2);
        const std::string word = kWords[static_cast<std::size_t>(Draw(0, 3))];
        filter.words = TextQuery(word + " receipt");
        filter.kind = Draw(0, 1) == 0 ? std::nullopt : std::optional(MarkKind::kPos);
        const auto expected = Naive(all, filter, [&](const Mark& mark) {
            return mark.text.find(word) != std::string::npos && (!filter.kind || mark.kind == *filter.kind);
        });
        ASSERT_EQ(marks_.List(filter), expected) << i;
        found += static_cast<int>(expected.size());
    }
    EXPECT_GT(found, 100);
    Force("update marks set demo = 1");
    EXPECT_EQ(events_.RemoveDemo(), static_cast<int>(all.size()));
    if (GetParam() == Engine::kSqlite) {
        EXPECT_EQ(Ask("select cast(count(*) as text) from mark_words where mark_words match 'receipt'"), "0");
    }
}

TEST_P(MarkTest, WordsAreFoundInTextsAndNothingThatIsTypedHasAnotherMeaning) {
    const int camera = AddCamera();
    const std::vector<std::string> texts = {"2 x Coffee  6.40\nTotal  12.80",
                                            "Somebody at the front-door",
                                            "TÜR AUF: Hof/Süd (3)",
                                            "say \"NOT coffee\" AND",
                                            "Дверь открыта – 07:15",
                                            "a_b c1 k2 words tags : near 9",
                                            "it's 80 12",
                                            "ΟΔΟΣ"};
    for (const std::string& text : texts) {
        marks_.Add(MarkKind::kPos, camera, 100, 0, text);
    }
    const struct {
        const char* typed;
        std::vector<int> found;  // by their places above
    } rows[] = {
        {"coffee", {0, 3}},
        {"COFFEE total", {0}},
        {"total coffee", {0}},
        {"coff", {}},
        {"coff*", {}},
        {"12.80", {0}},
        {"12 80", {0, 6}},
        {"80-12", {6}},
        {"6.40 Total", {0}},
        {"front-door", {1}},
        {"front door", {1}},
        {"door/front", {}},
        {"tür", {2}},
        {"Tur", {}},
        {"süd hof", {2}},
        {"SÜD 3", {2}},
        {"ДВЕРЬ", {4}},
        {"07:15", {4}},
        {"ΟΔΟΣ", {7}},
        {"\"coffee\" OR total", {}},
        {"NOT coffee", {3}},
        {"coffee AND", {3}},
        {"say (", {3}},
        {"words:tags", {5}},
        {"tags: c1", {5}},
        {"{words}: near(9)", {5}},
        {"it's", {6}},
        {"' & !x", {0}},
        {":name", {}},
        {"$1", {}},
        {"x'; drop table marks; --", {}},
        {"%", {}},
        {"c1", {5}},
    };
    for (const auto& row : rows) {
        std::vector<int> found;
        try {
            for (const Mark& mark : marks_.List({.camera_ids = {camera}, .words = TextQuery(row.typed)})) {
                found.push_back(mark.id - 1);
            }
        } catch (const InvalidRecord&) {
            EXPECT_STREQ(row.typed, "%");
        }
        EXPECT_EQ(found, row.found) << row.typed;
    }
}

TEST(TextQueryTest, MarksWhatWasFoundLineByLine) {
    using Lines = std::vector<std::vector<std::string>>;
    const struct {
        const char* typed;
        const char* text;
        Lines lines;
    } rows[] = {
        {"coffee 6.40", "2 x Coffee  6.40\nTotal 6.40", {{"2 x ", "Coffee", "  ", "6.40", ""}, {"Total ", "6.40", ""}}},
        {"6.40", "6 and 40\n6,40!", {{"6 and 40"}, {"", "6,40", "!"}}},
        {"a.b b.c", "a b c b", {{"", "a b c", " b"}}},
        {"a.b", "x a\nb y", {{"x ", "a", ""}, {"", "b", " y"}}},
        {"tür", "Die TÜR türen", {{"Die ", "TÜR", " türen"}}},
        {"x", "", {}},
        {"x", "none\n\nhere", {{"none"}, {""}, {"here"}}},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(TextQuery(row.typed).Mark(row.text), row.lines) << row.typed;
    }
    const std::string many = "1 2 3 4 5 6 7 8 9 10 11 12 13 14 15 16";
    EXPECT_EQ(TextQuery(many).Phrases().size(), 16U);
    for (const std::string& typed : {std::string(), std::string(" \n"), std::string("-*\""), many + " 17", many + ".17",
                                     std::string("x\xff"), std::string(501, 'x')}) {
        EXPECT_THROW(TextQuery{typed}, InvalidRecord) << typed;
    }
}

LOOKHAVEN_ON_BOTH_ENGINES(MarkTest);

}  // namespace
}  // namespace lookhaven::store
