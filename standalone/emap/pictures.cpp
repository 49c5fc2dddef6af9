// SPDX-License-Identifier: Apache-2.0
#include "standalone/emap/pictures.h"

#include <chrono>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>

#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/base/log.h"
#include "standalone/base/text.h"
#include "standalone/store/emap_pictures.h"
#include "standalone/store/secret.h"

namespace lookhaven::emap {

namespace {

namespace fs = std::filesystem;
using namespace std::string_view_literals;

constexpr auto kMinUnusedAge = std::chrono::minutes(1);
constexpr std::int64_t kMinUnusedSecondsInStore = 600;
constexpr std::uintmax_t kMinFreeBytes = 16 * kMaxPictureBytes;

// Removes spaces, comments and processing instructions; false when one does not end.
bool SkipProlog(std::string_view& text) {
    for (;;) {
        text.remove_prefix(std::min(text.find_first_not_of(" \t\r\n"), text.size()));
        const std::string_view end = text.starts_with("<?") ? "?>"sv : text.starts_with("<!--") ? "-->"sv : ""sv;
        if (end.empty()) {
            return true;
        }
        const std::size_t at = text.find(end);
        if (at == std::string_view::npos) {
            return false;
        }
        text.remove_prefix(at + end.size());
    }
}

bool IsSvg(std::string_view text) {
    if (text.starts_with("\xef\xbb\xbf")) {
        text.remove_prefix(3);
    }
    if (!SkipProlog(text)) {
        return false;
    }
    if (text.starts_with("<!DOCTYPE")) {
        const std::size_t end = text.find_first_of("[>");
        if (end == std::string_view::npos || text[end] == '[') {
            return false;  // entities may grow without bound
        }
        text.remove_prefix(end + 1);
        if (!SkipProlog(text)) {
            return false;
        }
    }
    return text.starts_with("<svg") && text.size() > 4 && " \t\r\n/>"sv.find(text[4]) != std::string_view::npos;
}

}  // namespace

bool IsPictureName(std::string_view name) {
    const std::size_t dash = name.find('-');
    const std::size_t dot = name.find('.');
    if (dash == std::string_view::npos || dot != dash + 17 || dash == 0) {
        return false;
    }
    const std::string_view type = name.substr(dot + 1);
    return name.substr(0, dash).find_first_not_of("0123456789") == std::string_view::npos &&
           base::IsHex(name.substr(dash + 1, 16), 16) &&
           (type == "png" || type == "jpg" || type == "webp" || type == "svg");
}

std::string_view PictureType(std::string_view bytes) {
    if (bytes.starts_with("\x89PNG\r\n\x1a\n"sv)) {
        return "png";
    }
    if (bytes.starts_with("\xff\xd8\xff"sv)) {
        return "jpg";
    }
    if (bytes.starts_with("RIFF") && bytes.substr(0, 12).ends_with("WEBP")) {
        return "webp";
    }
    return IsSvg(bytes) ? "svg" : "";
}

std::string Pictures::Write(std::string_view bytes) {
    if (bytes.size() > kMaxPictureBytes) {
        throw store::InvalidRecord("an e-map's picture has at most 16 MiB");
    }
    const std::string_view type = PictureType(bytes);
    if (type.empty()) {
        throw store::InvalidRecord("an e-map's picture is a PNG, JPEG, WebP or SVG file");
    }
    const std::string name = std::to_string(base::WallSeconds()) + "-" + store::RandomHex(8) + "." + std::string(type);
    fs::create_directories(folder_);
    base::WriteFileAtomically(folder_ / name, bytes);
    if (!store_.IsSqlite()) {
        store::EmapPictures(store_).Put(name, bytes, base::WallSeconds());
    }
    return name;
}

void Pictures::Withdraw(const std::string& name) {
    if (IsPictureName(name) && !Used().contains(name)) {
        std::error_code ignored;
        fs::remove(folder_ / name, ignored);
        store::EmapPictures(store_).Withdraw(name);
    }
}

void Pictures::Touch(const std::string& name) {
    if (IsPictureName(name)) {
        std::error_code ignored;
        fs::last_write_time(folder_ / name, fs::file_time_type::clock::now(), ignored);
        store::EmapPictures(store_).Touch(name, base::WallSeconds());
    }
}

std::set<std::string> Pictures::Used() {
    std::set<std::string> used;
    for (const store::Emap& emap : store::Emaps(store_).List()) {
        used.insert(emap.image);
    }
    return used;
}

void Pictures::SweepFiles(const std::set<std::string>& used) {
    std::error_code error;
    for (const fs::directory_entry& file : fs::directory_iterator(folder_, error)) {
        const fs::file_time_type written = file.last_write_time(error);
        // A young file may be one that another process is about to give to a map.
        if (!error && !used.contains(file.path().filename()) &&
            fs::file_time_type::clock::now() - written > kMinUnusedAge) {
            fs::remove(file.path(), error);
        }
    }
}

void Pictures::Sweep() {
    SweepFiles(Used());
    store::EmapPictures(store_).RemoveUnused(base::WallSeconds() - kMinUnusedSecondsInStore);
}

void Pictures::Share() {
    if (store_.IsSqlite()) {
        return;
    }
    try {
        store::EmapPictures shared(store_);
        for (const std::string& name : shared.Missing()) {
            try {
                if (IsPictureName(name)) {
                    shared.Put(name, ReadFile(name), base::WallSeconds());
                }
            } catch (const std::system_error& error) {
                if (error.code() != std::errc::no_such_file_or_directory) {
                    base::LogWarning(std::string("other hosts lack a picture of an e-map: ") + error.what());
                }
            }
        }
    } catch (const store::StoreError& error) {
        base::LogError(std::string("other hosts lack pictures of e-maps: ") + error.what());
    }
}

// Without it each view would fetch megabytes from the store.
void Pictures::SaveFile(const std::string& name, std::string_view bytes) noexcept try {
    const std::set<std::string> used = Used();
    SweepFiles(used);
    fs::create_directories(folder_);
    if (used.contains(name) && fs::space(folder_).available > kMinFreeBytes) {
        base::WriteFileAtomically(folder_ / name, bytes);
    }
} catch (const std::exception& error) {
    base::LogWarning(std::string("cannot keep a picture of an e-map: ") + error.what());
}

std::string Pictures::Read(const std::string& name) {
    if (!IsPictureName(name)) {
        throw std::system_error(ENOENT, std::generic_category(), "\"" + name + "\" is not a picture of an e-map");
    }
    try {
        return ReadFile(name);
    } catch (const std::system_error&) {
        std::optional<std::string> shared = store::EmapPictures(store_).Find(name);
        if (!shared || shared->size() > kMaxPictureBytes || PictureType(*shared) != name.substr(name.find('.') + 1)) {
            throw;
        }
        SaveFile(name, *shared);
        return *std::move(shared);
    }
}

std::string Pictures::ReadFile(const std::string& name) const {
    const fs::path path = folder_ / name;
    const base::FileDescriptor file = base::OpenFile(path, O_RDONLY | O_NOFOLLOW | O_NONBLOCK);
    struct stat about {};
    if (::fstat(file.Get(), &about) != 0 || !S_ISREG(about.st_mode) || about.st_size > off_t{kMaxPictureBytes}) {
        throw std::system_error(EFBIG, std::generic_category(), path.string() + " is not a picture file");
    }
    std::string bytes(static_cast<std::size_t>(about.st_size), '\0');
    const std::optional<std::size_t> read = base::ReadAllAt(file.Get(), bytes.data(), bytes.size(), 0);
    if (!read) {
        base::ThrowErrno("cannot read " + path.string());
    }
    bytes.resize(*read);
    return bytes;
}

}  // namespace lookhaven::emap
