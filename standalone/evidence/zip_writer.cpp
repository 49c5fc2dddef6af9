// SPDX-License-Identifier: Apache-2.0
#include "standalone/evidence/zip_writer.h"

#include <algorithm>
#include <utility>

#include <zlib.h>

#include "standalone/base/clock.h"
#include "standalone/base/file.h"

namespace lookhaven::evidence {

namespace {

constexpr std::uint64_t kMax32 = 0xFFFF'FFFF;
constexpr std::uint16_t kFlags = 1 << 3 | 1 << 11;  // the checksum follows; names are UTF-8
constexpr std::uint16_t kVersion = 20;
constexpr std::uint16_t kVersion64 = 45;
constexpr std::uint16_t kMadeBy = 3 << 8 | kVersion64;  // Unix
constexpr std::uint32_t kMode = 0100644;
constexpr std::uint16_t kExtra64 = 1;

// Numbers in little endian.
class Record {
  public:
    template <typename Number>
    Record& Add(Number number) {
        for (std::size_t i = 0; i < sizeof number; ++i) {
            bytes_.push_back(static_cast<std::uint8_t>(number >> (8 * i) & 0xFF));
        }
        return *this;
    }
    Record& Add16(std::uint64_t number) { return Add(static_cast<std::uint16_t>(number)); }
    // What does not fit is in the 64-bit form, and all ones here.
    Record& Add32(std::uint64_t number) { return Add(static_cast<std::uint32_t>(std::min(number, kMax32))); }
    Record& AddText(const std::string& text) {
        for (const char c : text) {
            bytes_.push_back(static_cast<std::uint8_t>(c));
        }
        return *this;
    }
    std::span<const std::uint8_t> Bytes() const { return bytes_; }

  private:
    std::vector<std::uint8_t> bytes_;
};

bool Needs64(std::uint64_t number) {
    return number >= kMax32;
}

// Seconds in steps of two, from 1980 on.
std::uint32_t DosTime(std::int64_t local_ms) {
    const std::string text = base::FormatUtc(std::max<std::int64_t>(local_ms, 315'532'800'000));
    const auto number = [&text](std::size_t at, std::size_t count) {
        return static_cast<std::uint32_t>(std::stoul(text.substr(at, count)));
    };
    const std::uint32_t date = (number(0, 4) - 1980) << 9 | number(5, 2) << 5 | number(8, 2);
    return date << 16 | number(11, 2) << 11 | number(14, 2) << 5 | number(17, 2) / 2;
}

}  // namespace

ZipWriter::ZipWriter(media::ByteSink sink, std::int64_t local_ms)
    : sink_(std::move(sink)),
      dos_time_(DosTime(local_ms)) {}

void ZipWriter::Send(std::span<const std::uint8_t> bytes) {
    if (!sink_(bytes)) {
        base::ThrowErrno("cannot write an archive");
    }
    position_ += std::ssize(bytes);
}

void ZipWriter::BeginFile(const std::string& name, std::int64_t size_bytes) {
    const auto size = static_cast<std::uint64_t>(size_bytes);
    entries_.push_back({name, size, static_cast<std::uint64_t>(position_), 0});
    const bool is_large = Needs64(size);
    Record head;
    head.Add(std::uint32_t{0x04034b50}).Add16(is_large ? kVersion64 : kVersion).Add16(kFlags).Add16(0);
    // Checksum and sizes follow the file.
    head.Add(dos_time_).Add32(0).Add32(is_large ? kMax32 : 0).Add32(is_large ? kMax32 : 0);
    head.Add16(name.size()).Add16(is_large ? 20 : 0).AddText(name);
    if (is_large) {
        head.Add16(kExtra64).Add16(16).Add(std::uint64_t{0}).Add(std::uint64_t{0});
    }
    Send(head.Bytes());
}

bool ZipWriter::TryWriteData(std::span<const std::uint8_t> bytes) {
    std::uint32_t& checksum = entries_.back().checksum;
    checksum = static_cast<std::uint32_t>(crc32_z(checksum, bytes.data(), bytes.size()));
    const bool is_taken = sink_(bytes);
    position_ += std::ssize(bytes);
    return is_taken;
}

void ZipWriter::WriteData(std::span<const std::uint8_t> bytes) {
    if (!TryWriteData(bytes)) {
        base::ThrowErrno("cannot write an archive");
    }
}

void ZipWriter::EndFile() {
    const Entry& entry = entries_.back();
    Record tail;
    tail.Add(std::uint32_t{0x08074b50}).Add(entry.checksum);
    if (Needs64(entry.size)) {
        tail.Add(entry.size).Add(entry.size);
    } else {
        tail.Add32(entry.size).Add32(entry.size);
    }
    Send(tail.Bytes());
}

void ZipWriter::Skip(const std::string& name, std::int64_t size_bytes) {
    BeginFile(name, size_bytes);
    position_ += size_bytes;
    EndFile();
}

void ZipWriter::SendDirectoryEntry(const Entry& entry) {
    Record extra;
    if (Needs64(entry.size)) {
        extra.Add(entry.size).Add(entry.size);
    }
    if (Needs64(entry.offset)) {
        extra.Add(entry.offset);
    }
    const std::size_t extra_bytes = extra.Bytes().size();
    Record record;
    record.Add(std::uint32_t{0x02014b50}).Add16(kMadeBy).Add16(extra_bytes > 0 ? kVersion64 : kVersion);
    record.Add16(kFlags).Add16(0).Add(dos_time_).Add(entry.checksum).Add32(entry.size).Add32(entry.size);
    record.Add16(entry.name.size()).Add16(extra_bytes > 0 ? extra_bytes + 4 : 0).Add16(0).Add16(0).Add16(0);
    record.Add32(kMode << 16).Add32(entry.offset).AddText(entry.name);
    if (extra_bytes > 0) {
        record.Add16(kExtra64).Add16(extra_bytes);
    }
    Send(record.Bytes());
    Send(extra.Bytes());
}

void ZipWriter::End() {
    const auto begin = static_cast<std::uint64_t>(position_);
    for (const Entry& entry : entries_) {
        SendDirectoryEntry(entry);
    }
    SendDirectoryEnd(begin, static_cast<std::uint64_t>(position_));
}

void ZipWriter::SendDirectoryEnd(std::uint64_t begin, std::uint64_t end) {
    const std::uint64_t count = entries_.size();
    Record record;
    if (Needs64(begin) || count >= 0xFFFF) {
        record.Add(std::uint32_t{0x06064b50}).Add(std::uint64_t{44}).Add16(kMadeBy).Add16(kVersion64);
        record.Add32(0).Add32(0).Add(count).Add(count).Add(end - begin).Add(begin);
        record.Add(std::uint32_t{0x07064b50}).Add32(0).Add(end).Add32(1);
    }
    const std::uint64_t count16 = std::min<std::uint64_t>(count, 0xFFFF);
    record.Add(std::uint32_t{0x06054b50}).Add16(0).Add16(0).Add16(count16).Add16(count16);
    record.Add32(end - begin).Add32(begin).Add16(0);
    Send(record.Bytes());
}

}  // namespace lookhaven::evidence
