// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/text_query.h"

#include <algorithm>
#include <clocale>
#include <cstddef>
#include <cwctype>
#include <iterator>
#include <optional>
#include <utility>

#include "standalone/base/text.h"
#include "standalone/store/store.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxTypedBytes = 500;
constexpr std::size_t kMaxWords = 16;
constexpr std::size_t kMaxMarkedLines = 100;  // as lists of many texts can be shown

// The locale that every system has, and that knows the letters of all scripts.
locale_t Unicode() {
    static const locale_t locale = ::newlocale(LC_CTYPE_MASK, "C.UTF-8", nullptr);
    return locale != nullptr ? locale : LC_GLOBAL_LOCALE;
}

void Append(std::string& text, char32_t c) {
    if (c < 0x80) {
        text += static_cast<char>(c);
        return;
    }
    const int more = c < 0x800 ? 1 : c < 0x10000 ? 2 : 3;
    text += static_cast<char>((0xF0 << (3 - more) & 0xFF) | c >> 6 * more);
    for (int shift = 6 * (more - 1); shift >= 0; shift -= 6) {
        text += static_cast<char>(0x80 | (c >> shift & 0x3F));
    }
}

constexpr const char* kSpaces = " \t\r\n";

bool IsPunctuation(char c) {
    return static_cast<unsigned char>(c) < 0x80 && ::iswalnum_l(static_cast<std::wint_t>(c), Unicode()) == 0;
}

struct Word {
    std::size_t begin = 0;  // in the text
    std::size_t end = 0;
    std::string folded;  // in small letters
};

// Nothing for what is no UTF-8.
std::optional<std::vector<Word>> WordsOf(std::string_view text) {
    std::vector<Word> words;
    bool is_within = false;
    for (std::string_view rest = text; !rest.empty();) {
        const std::size_t begin = text.size() - rest.size();
        const std::optional<char32_t> c = base::TakeCharacter(rest);
        if (!c) {
            return std::nullopt;
        }
        const auto wide = static_cast<std::wint_t>(*c);
        const bool is_letter = ::iswalnum_l(wide, Unicode()) != 0;
        if (is_letter) {
            if (!is_within) {
                words.push_back({begin, begin, ""});
            }
            words.back().end = text.size() - rest.size();
            Append(words.back().folded, static_cast<char32_t>(::towlower_l(wide, Unicode())));
        }
        is_within = is_letter;
    }
    return words;
}

struct Span {
    std::size_t begin = 0;
    std::size_t end = 0;
};

// By their begin, without overlaps.
std::vector<Span> HitsOf(const std::vector<TextQuery::Phrase>& phrases, const std::vector<Word>& words) {
    std::vector<Span> hits;
    for (auto first = words.begin(); first != words.end(); ++first) {
        for (const TextQuery::Phrase& phrase : phrases) {
            const auto matches = [](const std::string& wanted, const Word& word) { return wanted == word.folded; };
            const std::ptrdiff_t count = std::ssize(phrase.words);
            if (words.end() - first < count || !std::equal(phrase.words.begin(), phrase.words.end(), first, matches)) {
                continue;
            }
            const std::size_t end = (first + count - 1)->end;
            if (!hits.empty() && first->begin < hits.back().end) {
                hits.back().end = std::max(hits.back().end, end);
            } else {
                hits.push_back({first->begin, end});
            }
        }
    }
    return hits;
}

}  // namespace

TextQuery::TextQuery(std::string_view typed) {
    std::size_t count = 0;
    for (std::size_t begin = 0; begin < typed.size() && typed.size() <= kMaxTypedBytes;) {
        const std::size_t end = std::min(typed.find_first_of(kSpaces, begin), typed.size());
        std::string piece(typed.substr(begin, end - begin));
        const auto words = WordsOf(piece);
        if (!words) {
            phrases_.clear();
            break;
        }
        std::ranges::replace_if(piece, IsPunctuation, ' ');
        if (!words->empty()) {
            count += words->size();
            Phrase& phrase = phrases_.emplace_back();
            phrase.typed = std::move(piece);
            std::ranges::transform(*words, std::back_inserter(phrase.words), &Word::folded);
        }
        begin = end + 1;
    }
    if (phrases_.empty() || count > kMaxWords) {
        throw InvalidRecord("a text to look for has 1 to 16 words, of letters and digits, and 500 bytes at most");
    }
}

std::vector<std::vector<std::string>> TextQuery::Mark(std::string_view text) const {
    const std::vector<Span> hits = HitsOf(phrases_, WordsOf(text).value_or(std::vector<Word>{}));
    std::vector<std::vector<std::string>> lines;
    auto next = hits.begin();
    for (std::size_t begin = 0; begin < text.size() && lines.size() < kMaxMarkedLines;) {
        const std::size_t end = std::min(text.find('\n', begin), text.size());
        std::vector<std::string>& pieces = lines.emplace_back();
        std::size_t at = begin;
        while (next != hits.end() && next->end <= begin) {
            ++next;
        }
        for (auto hit = next; hit != hits.end() && hit->begin < end; ++hit) {
            const Span within{std::max(hit->begin, begin), std::min(hit->end, end)};
            if (within.begin < within.end) {
                pieces.emplace_back(text.substr(at, within.begin - at));
                pieces.emplace_back(text.substr(within.begin, within.end - within.begin));
                at = within.end;
            }
        }
        pieces.emplace_back(text.substr(at, end - at));
        begin = end + 1;
    }
    return lines;
}

}  // namespace lookhaven::store
