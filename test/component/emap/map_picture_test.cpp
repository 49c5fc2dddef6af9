// SPDX-License-Identifier: Apache-2.0
//
// What becomes of a file that is to be a map's picture: its pixels go on, and nothing else.
#include "standalone/emap/map_picture.h"

#include <array>
#include <vector>

#include <gmock/gmock.h>
#include <turbojpeg.h>

#include "standalone/base/text.h"
#include "standalone/emap/pictures.h"
#include "standalone/store/store.h"
#include "test/support/png.h"

namespace lookhaven::emap {
namespace {

using test::BigEndian;
using test::Png;
using test::PngChunk;
using test::Stored;
using testing::HasSubstr;
using testing::Not;

constexpr std::array<std::uint8_t, 3> kRed{250, 10, 10};

// As wide as it is high times two; the left half is red, the right one white.
std::string Jpeg(const std::string& segment) {
    constexpr int kHeight = 16;
    constexpr int kWidth = 2 * kHeight;
    std::vector<std::uint8_t> pixels;
    for (int at = 0; at < kWidth * kHeight; ++at) {
        const bool is_red = at % kWidth < kHeight;
        pixels.insert(pixels.end(), {std::uint8_t(is_red ? 250 : 255), std::uint8_t(is_red ? 10 : 255),
                                     std::uint8_t(is_red ? 10 : 255)});
    }
    const tjhandle encoder = tjInitCompress();
    std::vector<unsigned char> bytes(tjBufSize(kWidth, kHeight, TJSAMP_444));
    unsigned char* output = bytes.data();
    unsigned long size = bytes.size();
    tjCompress2(encoder, pixels.data(), kWidth, 0, kHeight, TJPF_RGB, &output, &size, TJSAMP_444, 95, TJFLAG_NOREALLOC);
    tjDestroy(encoder);
    const std::string file(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(size));
    return file.substr(0, 2) + segment + file.substr(2);
}

struct Picture {
    int width = 0;
    int height = 0;
    std::vector<std::uint8_t> rgb = {};

    bool IsRed(int x, int y) const {
        const std::size_t at = 3 * static_cast<std::size_t>(y * width + x);
        return rgb[at] > 200 && rgb[at + 1] < 60 && rgb[at + 2] < 60;
    }
};

Picture ReadJpeg(const std::string& file) {
    const tjhandle decoder = tjInitDecompress();
    const auto* bytes = reinterpret_cast<const unsigned char*>(file.data());
    Picture picture;
    int sampling = 0;
    int colours = 0;
    EXPECT_EQ(tjDecompressHeader3(decoder, bytes, file.size(), &picture.width, &picture.height, &sampling, &colours),
              0);
    picture.rgb.resize(3 * static_cast<std::size_t>(picture.width * picture.height));
    EXPECT_EQ(
        tjDecompress2(decoder, bytes, file.size(), picture.rgb.data(), picture.width, 0, picture.height, TJPF_RGB, 0),
        0);
    tjDestroy(decoder);
    return picture;
}

// EXIF that says how the camera was held, in either byte order, and that has more to say.
std::string Exif(int orientation, bool is_big_endian) {
    const auto number = [is_big_endian](std::uint32_t value, int size) {
        std::string text = BigEndian(value).substr(static_cast<std::size_t>(4 - size));
        return is_big_endian ? text : std::string(text.rbegin(), text.rend());
    };
    const std::string tiff = (is_big_endian ? "MM" : "II") + number(42, 2) + number(8, 4) + number(1, 2) +
                             number(0x0112, 2) + number(3, 2) + number(1, 4) +
                             number(static_cast<std::uint32_t>(orientation), 2) + number(0, 2) + number(0, 4) +
                             "taken at home";
    const std::string segment = std::string("Exif\0\0", 6) + tiff;
    return "\xff\xe1" + BigEndian(static_cast<std::uint32_t>(segment.size() + 2)).substr(2) + segment;
}

TEST(MapPicture, KeepsThePixelsOfAPngAndNothingElse) {
    const std::string secret = PngChunk("tEXt", std::string("Comment\0secret", 14)) +
                               PngChunk("zTXt", std::string("Comment\0\0", 9) + Stored("secret"));
    const std::string file = MapPicture::Reencoded(Png(40, 30, kRed, secret) + "secret").File();
    EXPECT_EQ(PictureType(file), "png");
    EXPECT_EQ(file.substr(16, 8), BigEndian(40) + BigEndian(30));
    EXPECT_THAT(file, Not(HasSubstr("secret")));
    EXPECT_EQ(MapPicture::Reencoded(file).File(), file) << "and once more";
}

TEST(MapPicture, OfAJpegIsUpright) {
    const struct {
        int orientation;
        bool is_high;
        std::array<int, 2> red, white;
    } rows[] = {
        {1, false, {8, 8}, {24, 8}}, {2, false, {24, 8}, {8, 8}}, {3, false, {24, 8}, {8, 8}},
        {4, false, {8, 8}, {24, 8}}, {5, true, {8, 8}, {8, 24}},  {6, true, {8, 8}, {8, 24}},
        {7, true, {8, 24}, {8, 8}},  {8, true, {8, 24}, {8, 8}},  {9, false, {8, 8}, {24, 8}},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.orientation);
        const std::string file = MapPicture::Reencoded(Jpeg(Exif(row.orientation, row.orientation % 2 == 0))).File();
        EXPECT_THAT(file, Not(HasSubstr("taken at home")));
        const Picture picture = ReadJpeg(file);
        ASSERT_EQ(picture.width, row.is_high ? 16 : 32);
        EXPECT_TRUE(picture.IsRed(row.red[0], row.red[1]));
        EXPECT_FALSE(picture.IsRed(row.white[0], row.white[1]));
    }
}

TEST(MapPicture, OfAWebpIsAPngWhereItMayBeTransparent) {
    const auto drawn = [](const char* base64) {
        return std::string(PictureType(MapPicture::Reencoded(*base::FromBase64(base64)).File()));
    };
    EXPECT_EQ(drawn("UklGRhoAAABXRUJQVlA4TA0AAAAvAAAAEAcQERGIiP4HAA=="), "png");
    EXPECT_EQ(drawn("UklGRiIAAABXRUJQVlA4IBYAAAAwAQCdASoBAAEADsD+JaQAA3AAAAAA"), "jpg");
}

TEST(MapPicture, IsRefusedWhereTheFileIsNoneOrMeansHarm) {
    const std::string png = Png(40, 30, kRed);
    std::string jpeg = Jpeg("");
    const std::string whole_jpeg = jpeg;
    const std::size_t frame = jpeg.find("\xff\xc0");
    jpeg.replace(frame + 5, 4, "\xff\xdc\xff\xdc");  // height and width
    const struct {
        const char* what;
        std::string file;
        const char* problem;
    } rows[] = {
        {"nothing", "", "PNG, JPEG or WebP"},
        {"a text", "hello", "PNG, JPEG or WebP"},
        {"a program", "MZ\x90", "PNG, JPEG or WebP"},
        {"a drawing", "<svg width='4' height='3'/>", "SVG"},
        {"a head alone", "\x89PNG\r\n\x1a\nand nothing more", "damaged"},
        {"half a picture", png.substr(0, png.size() / 2), "damaged"},
        {"a head alone of JPEG", "\xff\xd8\xff\xe0", "damaged"},
        {"a head alone of WebP", std::string("RIFF\0\0\0\0WEBPVP8 ", 16), "damaged"},
        {"a bomb", Png(1, 1, kRed, "", {100'000, 100'000}), "30 million"},
        {"a bomb that counts below zero", Png(1, 1, kRed, "", {~0U, ~0U}), "30 million"},
        {"one row too many", Png(1, 1, kRed, "", {6'000, 5'001}), "30 million"},
        {"too long", Png(1, 1, kRed, "", {16'385, 1}), "30 million"},
        {"the most pixels, of which there is one", Png(1, 1, kRed, "", {6'000, 5'000}), "damaged"},
        {"a bomb of JPEG", jpeg, "30 million"},
        {"a large file", png + std::string(kMaxUploadBytes, ' '), "20 MiB"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.what);
        try {
            MapPicture::Reencoded(row.file);
            ADD_FAILURE() << "was taken";
        } catch (const store::InvalidRecord& error) {
            EXPECT_THAT(error.what(), HasSubstr(row.problem));
        }
    }
    EXPECT_NO_THROW(MapPicture::Reencoded(whole_jpeg));
    EXPECT_EQ(MapPicture::OfOperator("<svg/>").File(), "<svg/>");
    EXPECT_THROW(MapPicture::OfOperator("hello"), store::InvalidRecord);
    EXPECT_THROW(MapPicture::OfOperator(png.substr(0, 60)), store::InvalidRecord);
}

TEST(MapPicture, IsDecodedByAProcessThatGaveUpWhatItWasTold) {
    bool gave_up_here = false;
    MapPicture::Reencoded(Png(4, 3, kRed), [&] { gave_up_here = true; });
    EXPECT_FALSE(gave_up_here);
    EXPECT_THROW(MapPicture::Reencoded(Png(4, 3, kRed), [] { throw std::runtime_error("cannot"); }), std::system_error)
        << "decodes nothing unconfined";
}

}  // namespace
}  // namespace lookhaven::emap
