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
    EXPECT_EQ(pictures_.Read(first), "<svg/>") << "a map has it";
    namespace fs = std::filesystem;
    const auto make_old = [&] {
        fs::last_write_time(folder_ / "emaps" / first, fs::file_time_type::clock::now() - std::chrono::hours(1));
    };
    make_old();
    Put(map, "\xff\xd8\xff\xe0");
    EXPECT_NE(emaps_.Find(map)->image, first);
    EXPECT_EQ(pictures_.Read(first), "<svg/>") << "whoever has just been told of it";
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

INSTANTIATE_TEST_SUITE_P(, PicturesTest, testing::Values(store::Engine::kSqlite), store::EngineName);

}  // namespace
}  // namespace lookhaven::emap
