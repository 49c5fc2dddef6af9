// SPDX-License-Identifier: Apache-2.0
//
// Pictures of e-maps: what is taken for one, what is read, and when a file goes.
#include "standalone/emap/pictures.h"

#include <fstream>

#include "test/component/store/store_fixture.h"

namespace lookhaven::emap {
namespace {

class PicturesTest : public store::StoreTest {
  protected:
    void Put(int map, const std::string& bytes) {
        pictures_.Touch(emaps_.Find(map)->image);
        emaps_.SetImage(map, pictures_.Write(bytes));
        pictures_.Sweep();
    }

    store::Emaps emaps_{store_};
    Pictures pictures_{store_, folder_};
};

TEST(PictureType, IsKnownByWhatTheFileHolds) {
    const struct {
        std::string bytes;
        std::string_view type;
    } rows[] = {
        {"\x89PNG\r\n\x1a\n....", "png"},
        {"\xff\xd8\xff\xe0..", "jpg"},
        {std::string("RIFF\0\0\0\0WEBPVP8 ", 16), "webp"},
        {std::string("RIFF\0\0\0\0WAVEfmt ", 16), ""},
        {"<svg/>", "svg"},
        {"\xef\xbb\xbf<?xml version=\"1.0\"?>\n<!-- a -->\n<!DOCTYPE svg PUBLIC \"a\" \"b\">\n<svg width=\"1\">",
         "svg"},
        {"<!DOCTYPE svg [<!ENTITY a \"b\">]><svg>", ""},
        {"<svgx>", ""},
        {"<svg", ""},
        {"<!-- <svg>", ""},
        {"<?xml", ""},
        {"<html><svg>", ""},
        {"GIF89a", ""},
        {"", ""}};
    for (const auto& row : rows) {
        EXPECT_EQ(PictureType(row.bytes), row.type) << row.bytes;
    }
}

TEST_P(PicturesTest, AMapsPictureIsReplacedWholeAndNothingElseIsRead) {
    const int map = emaps_.Add({.name = "Ground floor"});
    Put(map, "<svg/>");
    const std::string first = emaps_.Find(map)->image;
    EXPECT_EQ(pictures_.Read(first), "<svg/>");
    EXPECT_THROW(pictures_.Write("MZ"), store::InvalidRecord);
    EXPECT_THROW(pictures_.Write("<svg>" + std::string(kMaxPictureBytes, ' ')), store::InvalidRecord);
    const std::string unused = pictures_.Write("<svg/>");
    pictures_.Withdraw(unused);
    pictures_.Withdraw(first);
    EXPECT_THROW(pictures_.Read(unused), std::system_error);
    EXPECT_EQ(pictures_.Read(first), "<svg/>") << "a map uses it";
    namespace fs = std::filesystem;
    const auto make_old = [&] {
        fs::last_write_time(folder_ / "emaps" / first, fs::file_time_type::clock::now() - std::chrono::hours(1));
        Force("update emap_pictures set touched_s = touched_s - 3600");
    };
    make_old();
    Put(map, "\xff\xd8\xff\xe0");
    EXPECT_NE(emaps_.Find(map)->image, first);
    EXPECT_EQ(pictures_.Read(first), "<svg/>") << "a client that has just read its name may still load it";
    make_old();
    Put(map, "\xff\xd8\xff\xe0");
    EXPECT_FALSE(fs::exists(folder_ / "emaps" / first));

    std::ofstream(folder_ / "secret.svg") << "<svg/>";
    const std::string ours = "1-0123456789abcdef.svg";
    fs::create_symlink(folder_ / "secret.svg", folder_ / "emaps" / ours);
    for (const std::string& name :
         {ours, std::string("../secret.svg"), std::string("1-0123456789abcdef.png"), std::string("."), std::string(),
          "/" + ours, std::string("1-0123456789abcde/.svg"), ours + std::string("\0x", 2), first}) {
        EXPECT_THROW(pictures_.Read(name), std::system_error) << name;
    }
}

TEST_P(PicturesTest, HostsOfOneStoreHaveEachOthersPictures) {
    const bool is_shared = GetParam() == store::Engine::kPostgresql;
    const test::TemporaryFolder other_folder{"lookhaven other host"};
    Pictures other{store_, other_folder};
    const auto can_read = [&other](const std::string& name, const std::string& bytes) {
        try {
            return other.Read(name) == bytes;
        } catch (const std::system_error&) {
            return false;
        }
    };
    const std::string png = "\x89PNG\r\n\x1a\n" + std::string("\0\xff'", 3);
    const int map = emaps_.Add({.name = "Ground floor"});
    Put(map, png);
    const std::string first = emaps_.Find(map)->image;
    EXPECT_EQ(can_read(first, png), is_shared);
    other.Withdraw(first);
    other.Sweep();
    EXPECT_EQ(can_read(first, png), is_shared) << "a map uses it";

    Force("delete from emap_pictures");  // as on a host that was alone until now
    EXPECT_EQ(can_read(first, png), is_shared) << "it was kept";
    std::filesystem::remove_all(other_folder / "emaps");
    other.Share();
    EXPECT_FALSE(can_read(first, png)) << "its host has not shared it";
    pictures_.Share();
    pictures_.Share();
    EXPECT_EQ(can_read(first, png), is_shared);
    EXPECT_EQ(Ask("select count(*) from emap_pictures"), is_shared ? "1" : "0");

    Force("update emap_pictures set touched_s = touched_s - 3600");
    Put(map, "\xff\xd8\xff\xe0");
    EXPECT_EQ(can_read(first, png), is_shared) << "a client that has just read its name may still load it";
    Force("update emap_pictures set touched_s = touched_s - 3600");
    const auto kept = other_folder / "emaps" / first;
    std::error_code ignored;
    std::filesystem::last_write_time(kept, std::filesystem::file_time_type::clock::now() - std::chrono::hours(1),
                                     ignored);
    const std::string second = emaps_.Find(map)->image;
    EXPECT_EQ(can_read(second, "\xff\xd8\xff\xe0"), is_shared);
    EXPECT_FALSE(std::filesystem::exists(kept)) << "no map uses it any more";
    other.Sweep();
    EXPECT_FALSE(can_read(first, png));

    const std::string unused = pictures_.Write(png);
    pictures_.Withdraw(unused);
    EXPECT_FALSE(can_read(unused, png));
}

INSTANTIATE_TEST_SUITE_P(, PicturesTest, testing::Values(store::Engine::kSqlite, store::Engine::kPostgresql),
                         store::EngineName);

}  // namespace
}  // namespace lookhaven::emap
