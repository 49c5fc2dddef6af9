// SPDX-License-Identifier: Apache-2.0
//
// Changes of e-maps: who may, what is refused, and what the audit log tells of it.
#include "standalone/admin/emaps.h"

#include "standalone/admin/change.h"
#include "standalone/emap/pictures.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using store::Emap;
using store::Emaps;
using store::Engine;
using store::EngineName;
using testing::ElementsAre;
using testing::HasSubstr;

class EmapAdminTest : public store::StoreTest {
  protected:
    EmapChange Named(const std::string& name) { return {.name = name, .picture = drawing_}; }

    const emap::MapPicture drawing_ = emap::MapPicture::OfOperator("<svg/>");
    Emaps emaps_{store_};
};

TEST_P(EmapAdminTest, AreAuditedWhoeverMakesThem) {
    const Actor ada{store::Users(store_).Add("ada", "correct horse", store::Privilege::kManager).id, "ada",
                    "192.0.2.7"};
    const Emap added = AddEmap(store_, ada, folder_, Named("Yard"));
    EXPECT_EQ(emap::Pictures(store_, folder_).Read(added.image), "<svg/>");
    const Emap renamed = SetEmap(store_, {}, folder_, added.id, added.revision, {.name = "Court", .small_items = true});
    EXPECT_EQ(renamed.image, added.image);
    const Emap replaced = SetEmap(store_, ada, folder_, added.id, renamed.revision, {.picture = drawing_});
    EXPECT_NE(replaced.image, added.image) << "a browser must not show the last one";
    EXPECT_EQ(replaced.name, "Court");
    SetEmap(store_, ada, folder_, added.id, replaced.revision, {.name = "Court"});
    PlaceItems(store_, ada, *emaps_.Find(added.id), {{.type = store::EmapItemType::kEmap, .device_id = added.id}});
    RemoveEmap(store_, ada, folder_, added.id, {});
    EXPECT_THAT(Audited(),
                ElementsAre(HasSubstr("emap.remove Court (1) {"), HasSubstr("emap.place Court (1) {"),
                            HasSubstr("emap.set Court (1) {"),
                            HasSubstr(R"("name":"Yard","picture":")" + added.image + R"(","smallItemSize":false})"),
                            HasSubstr("emap.add Yard (1)  {")))
        << "what changes nothing leaves no row";
    EXPECT_TRUE(emaps_.List().empty());
}

TEST_P(EmapAdminTest, WhatIsPlacedIsAuditedByWhatHasChanged) {
    AddCamera();
    const Emap map = AddEmap(store_, {}, folder_, Named("Yard"));
    const store::EmapItem camera{.device_id = 1, .name = "Gate", .x = 10};
    const store::EmapItem link{.type = store::EmapItemType::kEmap, .device_id = map.id, .name = "Here"};
    const auto place = [&](const std::vector<store::EmapItem>& items) {
        PlaceItems(store_, {}, *emaps_.Find(map.id), items);
        return Audited().front();
    };
    EXPECT_THAT(place({camera, link}), testing::AllOf(HasSubstr(R"("items":[],)"), HasSubstr(R"("name":"Gate")")));
    EXPECT_THAT(place({store::With(camera, &store::EmapItem::x, 20), link}),
                testing::AllOf(HasSubstr(R"("x":10)"), HasSubstr(R"("x":20)"), testing::Not(HasSubstr("Here"))));
    EXPECT_THAT(place({link, store::With(camera, &store::EmapItem::x, 20)}), HasSubstr(R"("Here")")) << "another order";
    const std::size_t entries = Audited().size();
    place({link, store::With(camera, &store::EmapItem::x, 20)});
    EXPECT_EQ(Audited().size(), entries) << "nothing has changed";
}

TEST_P(EmapAdminTest, AreRefusedWithoutATrace) {
    const Actor eve{store::Users(store_).Add("eve", "correct horse", store::Privilege::kViewer).id, "eve", ""};
    const Emap map = AddEmap(store_, {}, folder_, Named("Yard"));
    const Emap other = AddEmap(store_, {}, folder_, Named("Shed"));
    const std::size_t entries = Audited().size();
    EXPECT_THROW(AddEmap(store_, eve, folder_, Named("Mine")), Forbidden);
    EXPECT_THROW(SetEmap(store_, eve, folder_, map.id, {}, {.picture = drawing_}), Forbidden);
    EXPECT_THROW(RemoveEmap(store_, eve, folder_, map.id, {}), Forbidden);
    EXPECT_THROW(AddEmap(store_, {}, folder_, Named("Shed")), store::AlreadyExists);
    EXPECT_THROW(SetEmap(store_, {}, folder_, map.id, {}, {.name = "Shed", .picture = drawing_}), store::AlreadyExists);
    EXPECT_THROW(SetEmap(store_, {}, folder_, map.id, {}, {.name = ""}), store::InvalidRecord);
    EXPECT_THROW(SetEmap(store_, {}, folder_, 99, {}, {.name = "x"}), store::NotFound);
    EXPECT_THROW(RemoveEmap(store_, {}, folder_, 99, {}), store::NotFound);
    const Emap seen = *emaps_.Find(map.id);
    emaps_.ReplaceItems(seen, {{.type = store::EmapItemType::kEmap, .device_id = other.id}});
    for (const EmapChange& change : {EmapChange{.name = "Court"}, EmapChange{.picture = drawing_}}) {
        EXPECT_THROW(SetEmap(store_, {}, folder_, map.id, seen.revision, change), Stale);
    }
    EXPECT_THROW(RemoveEmap(store_, {}, folder_, map.id, seen.revision), Stale) << "items were placed on it meanwhile";
    EXPECT_EQ(emaps_.Find(map.id)->name, "Yard");
    EXPECT_EQ(emaps_.Find(map.id)->image, map.image);
    EXPECT_EQ(emap::Pictures(store_, folder_).Read(map.image), "<svg/>");
    EXPECT_EQ(Audited().size(), entries);
    const auto files = std::filesystem::directory_iterator(folder_ / "emaps");
    EXPECT_EQ(std::distance(begin(files), end(files)), 2) << "one of each map, none of what was refused";
    EXPECT_THAT(emaps_.Links(), ElementsAre(testing::Pair(other.id, ElementsAre(map.id))));
}

LOOKHAVEN_ON_BOTH_ENGINES(EmapAdminTest);

}  // namespace
}  // namespace lookhaven::admin
