// SPDX-License-Identifier: Apache-2.0
//
// Multipart responses of odd cameras: their parts, or why there are no more.
#include "standalone/media/multipart_reader.h"

#include <cstring>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/media/source.h"

namespace lookhaven::test {
namespace {

using namespace media;

// Reads parts until an error, which receives the response a few bytes at a time.
std::vector<std::string> Parts(const std::string& boundary, const std::string& answer, std::size_t step,
                               std::string& end) {
    std::size_t at = 0;
    MultipartReader reader(boundary, 8, [&](std::span<std::uint8_t> buffer) {
        const std::size_t size = std::min({step, buffer.size(), answer.size() - at});
        if (size == 0) {
            throw SourceError("end");
        }
        std::memcpy(buffer.data(), answer.data() + at, size);
        at += size;
        return size;
    });
    std::vector<std::string> parts;
    try {
        for (;;) {
            const std::span<const std::uint8_t> part = reader.Next();
            parts.emplace_back(part.begin(), part.end());
        }
    } catch (const SourceError& error) {
        end = error.what();
    }
    return parts;
}

TEST(MultipartReader, TakesAnswersOfOddCameras) {
    struct Row {
        const char* name;
        std::string answer;
        std::vector<std::string> parts;
        const char* end = "end";
        const char* boundary = "b";
    };
    std::string endless_head = "--b\r\n";
    for (int i = 0; i < 70; ++i) {
        endless_head += "x: y\r\n";
    }
    const std::string last = "--b\r\nContent-Length: 1\r\n\r\na";  // a usual part, cut after its body
    const Row rows[] = {
        {"usual", "--b\r\nContent-Length: 3\r\n\r\nabc\r\n--b\r\ncontent-length:2\r\n\r\nde\r\n", {"abc", "de"}},
        {"no blank line after the part", "--b\nContent-Length: 3\n\nabc--b\nContent-Length: 1\n\nx", {"abc", "x"}},
        {"dashes in the boundary's name", last + "\r\n", {"a"}, "end", "--b"},
        {"dashes in the boundary's name and before it",
         "--" + last + "\r\n----b\r\nX: y\r\n\r\nde\r\n--b\r\n----b\r\n",
         {"a", "de\r\n--b"},
         "end",
         "--b"},
        {"blank lines before the head", "--b\r\n\r\n\r\nContent-Length: 4\r\n\r\n\r\na\n", {"\r\na\n"}},
        {"preamble", "hello\r\n\r\n" + last + "\r\n", {"a"}},
        {"no lengths",
         "--b\r\nX: y\r\n\r\nabc\r\n--b\r\nX: y\r\n\r\n\r\n\r\n--b\r\n\r\n\xff\n--b\r\n",
         {"abc", "\r\n", "\xff"}},
        {"boundary inside a sized part", "--b\r\nContent-Length: 5\r\n\r\n\r\n--b\r\n" + last, {"\r\n--b", "a"}},
        {"too large, sized", "--b\r\nContent-Length: 9\r\n\r\n123456789\r\n" + last, {"a"}},
        {"too large, no length",
         "--b\r\nX: y\r\n\r\n" + std::string(50, 'x') + "\r\n--b\r\nX: y\r\n\r\na\r\n--b\r\n",
         {"a"}},
        {"length of nonsense", "--b\r\nContent-Length: -7\r\n\r\nab\r\n--b\r\n", {"ab"}},
        {"the end", last + "\r\n--b--\r\n", {"a"}, "ended"},
        {"cut short", "--b\r\nContent-Length: 5\r\n\r\nab", {}},
        {"no multipart", std::string(100, '\n'), {}, "no multipart"},
        {"endless line", std::string(5000, 'x'), {}, "overlong"},
        {"endless head", endless_head, {}, "without an end"},
    };
    for (const Row& row : rows) {
        for (const std::size_t step : {1, 7, 10000}) {
            std::string end;
            EXPECT_EQ(Parts(row.boundary, row.answer, step, end), row.parts) << row.name << ", step " << step;
            EXPECT_THAT(end, testing::HasSubstr(row.end)) << row.name << ", step " << step;
        }
    }
}

TEST(MultipartReader, FindsTheBoundary) {
    const std::pair<const char*, const char*> rows[] = {
        {"multipart/x-mixed-replace; boundary=frame", "frame"},
        {"Multipart/Mixed;Boundary=\"a b\"; x=y", "a b"},
        {"multipart/x-mixed-replace;boundary=--myboundary; charset=x", "--myboundary"},
        {"image/jpeg; boundary=x", ""},
        {"multipart/mixed", ""},
        {"boundary=x", ""},
        {"", ""},
    };
    for (const auto& [type, boundary] : rows) {
        EXPECT_EQ(BoundaryOf(type), boundary) << type;
    }
}

}  // namespace
}  // namespace lookhaven::test
