// SPDX-License-Identifier: Apache-2.0
//
// Writes a ZIP file as a stream: files are stored as they are, and each size is known beforehand.
//
// Format        Per file a header, its bytes, and behind them their checksum, which is not known before. Then a
//               directory of all files. Sizes and places beyond 4 GiB are in the 64-bit form (APPNOTE 4.3, 4.5.3).
// Why so        The libraries that write such files as streams do not tell beforehand how large they become.
#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "standalone/media/join.h"

namespace lookhaven::evidence {

// All throw std::system_error with the sink's errno. Call BeginFile, WriteData, EndFile for each file, or Skip, then
// End.
class ZipWriter {
  public:
    // local_ms: the time of all files, milliseconds since 1970 as a clock on the wall has them.
    explicit ZipWriter(media::ByteSink sink, std::int64_t local_ms = 0);

    // name: UTF-8.
    void BeginFile(const std::string& name, std::int64_t size_bytes);
    void WriteData(std::span<const std::uint8_t> bytes);
    // The same for a library that nothing may be thrown through: false, with errno set, when it fails.
    bool TryWriteData(std::span<const std::uint8_t> bytes);
    void EndFile();
    // As if the file had been written; for the size of the whole.
    void Skip(const std::string& name, std::int64_t size_bytes);
    void End();

    // How many bytes there are until now, those skipped included.
    std::int64_t Position() const { return position_; }

  private:
    struct Entry {
        std::string name;
        std::uint64_t size = 0;
        std::uint64_t offset = 0;
        std::uint32_t checksum = 0;
    };

    void Send(std::span<const std::uint8_t> bytes);
    void SendDirectoryEntry(const Entry& entry);
    void SendDirectoryEnd(std::uint64_t begin, std::uint64_t end);

    media::ByteSink sink_;
    std::uint32_t dos_time_;
    std::int64_t position_ = 0;
    std::vector<Entry> entries_;
};

}  // namespace lookhaven::evidence
