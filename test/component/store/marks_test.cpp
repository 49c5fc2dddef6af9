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

class MarkTest : public RandomRecords {
  protected:
    Events events_{store_};
    Marks marks_{store_};
};

TEST_P(MarkTest, AMarkHasTheFootageThatItsCamerasPlanAsksFor) {
    const int camera = AddCamera();
    const Mark alert = marks_.Add(MarkKind::kAlert, camera, kDay / 2, 0, "line one\nzwei");
    EXPECT_EQ(alert.start_s, kDay / 2 - RecordingPlan().pre_s);
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
    const Mark told = marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {7, "till"}, kDay);
    EXPECT_EQ(marks_.Find(MarkKind::kAlert, told.id)->reporter, (Reporter{7, "till"}));
    for (int of = 0; of < 2; ++of) {
        EXPECT_NO_THROW(marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {}, kDay, 1)) << "nobody's";
    }
    EXPECT_THROW(marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {7, "till"}, 2 * kDay, 1), TooManyMarks) << "waits";
    EXPECT_TRUE(marks_.Miss(told.id));
    EXPECT_NO_THROW(marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {7, "till"}, 2 * kDay, 1)) << "a day later";
    std::atomic<int> added = 0;
    InParallel(6, [&](Store& store) {
        try {
            Marks(store).Add(MarkKind::kAlert, camera, 100, 0, "", {8, "till"}, kDay, 2);
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
        mark.text = "receipt " + std::to_string(mark.id);
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
}

LOOKHAVEN_ON_BOTH_ENGINES(MarkTest);

}  // namespace
}  // namespace lookhaven::store
