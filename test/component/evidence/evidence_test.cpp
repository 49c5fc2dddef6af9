// SPDX-License-Identifier: Apache-2.0
//
// Exports as others read them: ffprobe, Python's zipfile, sha256sum and openssl.
#include <fcntl.h>
#include <unistd.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/evidence/manifest.h"
#include "standalone/evidence/signing_key.h"
#include "standalone/evidence/write.h"
#include "standalone/evidence/zip_writer.h"
#include "standalone/media/source.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/footage/clips.h"

namespace lookhaven::test {
namespace {

using namespace evidence;
using testing::HasSubstr;
using testing::MatchesRegex;

constexpr std::int64_t kStartMs = 1'772'352'930'000;  // 2026-03-01T08:15:30Z

class Evidence : public testing::Test {
  protected:
    std::filesystem::path Footage(const char* name, std::int64_t after_ms, const char* video,
                                  const char* audio = "") const {
        const std::filesystem::path path = folder_ / "2026-03-01" / name;
        Record(MakeClip(video, audio), path, true, SIZE_MAX, kStartMs + after_ms);
        return path;
    }

    // Writes it, and finds it as large as announced.
    std::filesystem::path Export(const Request& request) {
        const media::RemuxLibrary& remux = media::LoadRemuxLibrary();
        plan_ = MakePlan(request, remux);
        const std::filesystem::path out = folder_ / plan_.name;
        const base::FileDescriptor file = base::OpenFile(out, O_WRONLY | O_CREAT | O_TRUNC);
        const auto sink = [&](auto bytes) { return base::WriteAll(file.Get(), bytes.data(), bytes.size()); };
        evidence::Write(plan_, remux, sink, Sign());
        EXPECT_EQ(static_cast<std::int64_t>(std::filesystem::file_size(out)), plan_.size_bytes);
        return out;
    }

    Signer Sign() const {
        RequireSigningKey(key_);
        return [this](std::string_view manifest) { return SignBy(key_, manifest); };
    }

    static Request Ask(std::vector<CameraFootage> cameras, std::int64_t begin_ms, std::int64_t end_ms) {
        return {.cameras = std::move(cameras),
                .span = {kStartMs + begin_ms, kStartMs + end_ms},
                .exporter = "admin",
                .now_ms = kStartMs + 86'400'000,
                .utc_offset_min = 60};
    }

    static std::string Quoted(const std::filesystem::path& path) { return "'" + path.string() + "'"; }

    ArchiveFolder folder_;
    const std::filesystem::path key_ = folder_ / "signing" / "key.pem";
    Plan plan_;
};

TEST_F(Evidence, OneCameraBecomesOneFileInWhichItsRecordingsFollowEachOther) {
    const struct {
        const char* video;
        const char* audio;
        bool with_sound;
        const char* name;
        const char* probed;
    } rows[] = {
        {kH264, "-c:a aac -ar 16000", true, "Yard_ 2026-03-01 09.15.31.mp4", "h264,163\naac,[0-9]+\n"},
        {kH264, "-c:a aac -ar 16000", false, "Yard_ 2026-03-01 09.15.31.mp4", "h264,163\n"},
        {kH264, "-c:a pcm_mulaw -ar 8000", true, "Yard_ 2026-03-01 09.15.31.mkv", "h264,163\npcm_mulaw,[0-9]+\n"},
        {kH264Reordered, "", true, "Yard_ 2026-03-01 09.15.31.mp4", "h264,16[0-9]\n"},
        {kH265, "", true, "Yard_ 2026-03-01 09.15.31.mp4", "hevc,16[0-9]\n"},
        {kMjpeg, "", true, "Yard_ 2026-03-01 09.15.31.mkv", "mjpeg,15[0-9]\n"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.probed);
        std::filesystem::remove_all(folder_ / "2026-03-01");
        const auto first = Footage("081530-1.mkv", 0, row.video, row.audio);
        const auto second = Footage("081540-2.mkv", 10'000, row.video, row.audio);
        const auto gone = folder_ / "2026-03-01/081550-3.mkv";
        const auto out = Export(Ask({{1, "Yard?", row.with_sound, {first, second, gone}}}, 1500, 13'500));
        EXPECT_EQ(plan_.name, row.name);
        EXPECT_THAT(Probe(Quoted(out)), MatchesRegex(row.probed));
        // The gap stays in the file, and times go by the clock.
        EXPECT_THAT(
            Shell("ffprobe -v error -select_streams v -show_entries packet=pts_time -of csv=p=0 " + Quoted(out) +
                  " | sort -n | awk -F, 'NR == 1 {first = $1} NR > 1 && $1 - last > 1 {print \"gap of\", $1 - last}"
                  " {last = $1} END {print \"length\", last - first}'"),
            MatchesRegex("gap of 6.04\nlength 12(.48|.52)?\n"));
        ASSERT_EQ(plan_.cameras[0].gaps.size(), 1U);
        EXPECT_EQ(plan_.cameras[0].gaps[0], (archive::TimeSpan{kStartMs + 3960, kStartMs + 10'000}));
    }
}

TEST_F(Evidence, SeveralBecomeAnArchiveWhoseManifestIsTrue) {
    const auto silent = Footage("081530-1.mkv", 0, kH264);
    const auto loud = Footage("081534-2.mkv", 4000, kH264, "-c:a aac -ar 16000");
    const auto other = Footage("081530-3.mkv", 0, kMjpeg);
    const auto later = Footage("101530-4.mkv", 7'200'000, kMjpeg);
    const auto out = Export(Ask(
        {{1, "Yard", true, {silent, loud}}, {2, "Gäte", true, {other, later}}, {3, "Shed", true, {}}}, 0, 7'204'000));
    EXPECT_EQ(plan_.content_type, std::string("application/zip"));
    // Unpacks into the folder, and compares sizes and checksums by itself.
    EXPECT_EQ(Shell("cd " + Quoted(folder_.Path()) +
                    " && python3 -c \"import zipfile, sys; z = zipfile.ZipFile(sys.argv[1]);"
                    " print(z.testzip(), len(z.namelist())); z.extractall()\" " +
                    Quoted(out)),
              "None 7\n");
    EXPECT_EQ(Shell("cd " + Quoted(folder_.Path()) +
                    " && openssl pkeyutl -verify -pubin -inkey manifest.json.pub -rawin -in manifest.json"
                    " -sigfile manifest.json.sig && stat -c %a signing signing/key.pem"),
              "Signature Verified Successfully\n700\n600\n");
    EXPECT_EQ(Shell("cd " + Quoted(folder_.Path()) +
                    " && openssl pkey -pubin -in manifest.json.pub -outform DER | sha256sum"),
              LoadSignatureLibrary().FingerprintOf(Contents(folder_ / kPublicKeyName)) + "  -\n");
    Json::Value manifest;
    std::istringstream(Contents(folder_ / kManifestName)) >> manifest;
    EXPECT_EQ(manifest["exported"]["by"], "admin");
    EXPECT_EQ(manifest["camera"][1]["name"], "Gäte");
    EXPECT_EQ(manifest["camera"][1]["gap"][0]["begin"]["utc"], "2026-03-01T08:15:33.960Z");
    EXPECT_EQ(manifest["camera"][2]["gap"][0]["end"]["local"], "2026-03-01T11:15:34.000+01:00");
    EXPECT_EQ(manifest["camera"][0]["file"][1]["first_frame"]["local"], "2026-03-01T09:15:34.000+01:00");
    EXPECT_EQ(manifest["camera"][0]["file"][1]["last_frame"]["utc"], "2026-03-01T08:15:37.960Z");
    std::string probed;
    for (const Json::Value& camera : manifest["camera"]) {
        for (const Json::Value& file : camera["file"]) {
            const std::filesystem::path path = folder_ / file["name"].asString();
            EXPECT_EQ(Shell("sha256sum <" + Quoted(path)), file["sha256"].asString() + "  -\n");
            probed += Probe(Quoted(path)) + file["sound"].asString() + ' ';
        }
    }
    EXPECT_THAT(probed, MatchesRegex("h264,100\n h264,100\naac,[0-9]+\nAAC mjpeg,100\n mjpeg,100\n "));
}

TEST_F(Evidence, WhatCannotBeReadIsLeftOutAndTold) {
    const auto first = Footage("081530-1.mkv", 0, kH264, "-c:a aac -ar 16000");
    const auto second = Footage("081534-2.mkv", 4000, kH264, "-c:a aac -ar 16000");
    const auto other = Footage("081530-3.mkv", 0, kMjpeg);
    const auto no_file = folder_ / "2026-03-01/081538-4.mkv";
    std::filesystem::create_directory(no_file);
    Request request = Ask({{1, "Yard", true, {first, second, no_file}}, {2, "Gate", true, {other}}}, 0, 8000);
    const std::string whole = Contents(second);
    Write(second, std::string(whole.size(), 'x'));  // its index is as it was
    Export(request);
    ASSERT_EQ(plan_.cameras[0].files.size(), 1U);
    EXPECT_EQ(plan_.cameras[0].gaps.back(), (archive::TimeSpan{kStartMs + 3960, kStartMs + 8000}));
    Write(second, whole);
    // What is lost once the plan is made: half of one recording, and all of another.
    const media::RemuxLibrary& remux = media::LoadRemuxLibrary();
    const Plan plan = MakePlan(request, remux);
    Write(second, whole.substr(0, whole.size() / 4) + std::string(whole.size() - whole.size() / 4, '\0'));
    std::filesystem::remove(other);
    const std::filesystem::path out = folder_ / "lossy.zip";
    const base::FileDescriptor file = base::OpenFile(out, O_WRONLY | O_CREAT);
    evidence::Write(
        plan, remux, [&](auto bytes) { return base::WriteAll(file.Get(), bytes.data(), bytes.size()); }, Sign());
    EXPECT_EQ(static_cast<std::int64_t>(std::filesystem::file_size(out)), plan.size_bytes);
    EXPECT_EQ(Shell("cd " + Quoted(folder_.Path()) +
                    " && python3 -c \"import zipfile, sys;"
                    " z = zipfile.ZipFile(sys.argv[1]); print(z.testzip()); z.extractall()\" " +
                    Quoted(out)),
              "None\n");
    Json::Value manifest;
    std::istringstream(Contents(folder_ / kManifestName)) >> manifest;
    const Json::Value& cut = manifest["camera"][0]["file"][0];
    EXPECT_THAT(Probe(Quoted(folder_ / cut["name"].asString())), MatchesRegex("(.|\n)*h264,1[0-4][0-9]\naac,[0-9]+\n"));
    EXPECT_THAT(cut["missing"][0]["begin"]["utc"].asString(), MatchesRegex("2026-03-01T08:15:3[45].*"));
    EXPECT_EQ(cut["missing"][0]["end"], cut["last_frame"]);
    const Json::Value& lost = manifest["camera"][1]["file"][0];
    EXPECT_EQ(lost["missing"][0]["begin"], lost["first_frame"]);
    EXPECT_EQ(Shell("sha256sum <" + Quoted(folder_ / lost["name"].asString())), lost["sha256"].asString() + "  -\n");
    request.cameras.pop_back();
    EXPECT_THROW(evidence::Write(MakePlan(request, remux), remux, [](auto) { return true; }, {}), media::SourceError)
        << "one file has no manifest to tell it in";
}

TEST_F(Evidence, WhatIsCutOrCannotBeTakenThrows) {
    const auto first = Footage("081530-1.mkv", 0, kH264);
    const auto second = Footage("081534-2.mkv", 4000, kH264);
    const media::RemuxLibrary& remux = media::LoadRemuxLibrary();
    const Plan plan = MakePlan(Ask({{1, "Yard", true, {first, second}}}, 0, 8000), remux);
    std::int64_t taken = 0;
    EXPECT_THROW(evidence::Write(plan, remux, [&](auto) { return errno = EPIPE, false; }, {}), std::system_error);
    std::filesystem::remove(second);
    EXPECT_THROW(evidence::Write(plan, remux, [&](auto bytes) { return taken += std::ssize(bytes), true; }, {}),
                 media::SourceError);
    EXPECT_LT(taken, plan.size_bytes);
    Write(first, "damaged");
    EXPECT_TRUE(MakePlan(Ask({{1, "Yard", true, {first, second}}}, 0, 8000), remux).cameras[0].files.empty());
}

TEST_F(Evidence, ASignatureIsOfOneTextAndOneKeyAlone) {
    const SignatureLibrary& library = LoadSignatureLibrary();
    RequireSigningKey(key_);
    const std::string key = Contents(key_);
    RequireSigningKey(key_);
    EXPECT_EQ(Contents(key_), key) << "a key that is there stays";
    const Signature signature = SignBy(key_, "text");
    const std::filesystem::path other_key = folder_ / "other" / "key.pem";
    RequireSigningKey(other_key);
    const Signature other = SignBy(other_key, "text");
    EXPECT_NE(library.FingerprintOf(other.public_key), library.FingerprintOf(signature.public_key));
    std::string changed = signature.bytes;
    changed[63] = static_cast<char>(changed[63] ^ 1);
    const std::string rsa = Shell("openssl genpkey -quiet -algorithm RSA 2>/dev/null | openssl pkey -pubout");
    const struct {
        const char* what;
        std::string text;
        Signature signature;
        bool is_valid;
    } rows[] = {
        {"as signed", "text", signature, true},
        {"other text", "texT", signature, false},
        {"changed signature", "text", {changed, signature.public_key}, false},
        {"cut signature", "text", {signature.bytes.substr(1), signature.public_key}, false},
        {"no signature", "text", {"", signature.public_key}, false},
        {"other key", "text", {signature.bytes, other.public_key}, false},
        {"other kind of key", "text", {signature.bytes, rsa}, false},
        {"no key", "text", {signature.bytes, "none"}, false},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(library.IsSignatureOf(row.text, row.signature), row.is_valid) << row.what;
    }
    EXPECT_EQ(library.FingerprintOf(rsa), "");
    Write(other_key, rsa);
    EXPECT_THROW(SignBy(other_key, "text"), std::runtime_error);
    std::filesystem::remove(other_key);
    EXPECT_THROW(SignBy(other_key, "text"), std::system_error);
}

TEST_F(Evidence, ArchivesMayBeLargerThan4GiB) {
    const std::filesystem::path out = folder_ / "large.zip";
    const base::FileDescriptor file = base::OpenFile(out, O_WRONLY | O_CREAT);
    const ZipWriter* writer = nullptr;
    const auto at_its_place = [&](std::span<const std::uint8_t> bytes) {
        return base::WriteAllAt(file.Get(), bytes.data(), bytes.size(), static_cast<std::uint64_t>(writer->Position()));
    };
    ZipWriter zip(at_its_place, kStartMs);
    writer = &zip;
    zip.Skip("hole", std::int64_t{5} << 30);
    const std::string text = "behind it";
    zip.BeginFile("small", std::ssize(text));
    for (const char& c : text) {
        zip.WriteData({reinterpret_cast<const std::uint8_t*>(&c), 1});
    }
    zip.EndFile();
    zip.End();
    EXPECT_EQ(Shell("python3 -c \"import zipfile, sys; z = zipfile.ZipFile(sys.argv[1]);"
                    " print(z.getinfo('hole').file_size, z.read('small'), z.getinfo('small').date_time)\" " +
                    Quoted(out)),
              "5368709120 b'behind it' (2026, 3, 1, 8, 15, 30)\n");
}

}  // namespace
}  // namespace lookhaven::test
