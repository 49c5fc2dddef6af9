// SPDX-License-Identifier: Apache-2.0
//
// What somebody looks for in texts, and where it is in one that was found.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace lookhaven::store {

// Whole words, all of which occur in a text that is found, in any order and in capitals or not. What is typed without
// spaces between ("12.80", "front-door") stands in a row there, whatever is between. A word is letters and digits of
// any script; nothing that is typed has another meaning.
class TextQuery {
  public:
    struct Phrase {
        std::string typed;               // with spaces for what is neither letter nor digit in ASCII
        std::vector<std::string> words;  // in a row, in small letters
    };

    // An empty query, without phrases.
    TextQuery() = default;
    // Throws InvalidRecord for a text without words, one that is no UTF-8, and one of more than 16 words or 500 bytes.
    explicit TextQuery(std::string_view typed);

    bool IsEmpty() const { return phrases_.empty(); }
    const std::vector<Phrase>& Phrases() const { return phrases_; }

    // The lines of the text, each in pieces, of which the second, the fourth and so on are what was found. Pieces
    // before, between and after may be empty.
    std::vector<std::vector<std::string>> Mark(std::string_view text) const;

  private:
    std::vector<Phrase> phrases_;
};

}  // namespace lookhaven::store
