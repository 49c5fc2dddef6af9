// SPDX-License-Identifier: Apache-2.0
//
// The pictures of e-maps in a store that several hosts may share, where each of them finds those that another was
// given. Everywhere else they are files alone (emap/pictures.h), and this has none of them.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

// Names are those of Emap::image.
class EmapPictures {
  public:
    // The store must outlive this object.
    explicit EmapPictures(Store& store) : connection_(store.connection()) {}

    // Does nothing where there is one of that name, which has the same bytes.
    void Put(const std::string& name, std::string_view bytes, std::int64_t now_s);
    // Nothing where there is none of that name, or it is damaged.
    std::optional<std::string> Find(const std::string& name);
    // RemoveUnused counts from then on.
    void Touch(const std::string& name, std::int64_t now_s);
    // Unless a map has it.
    void Withdraw(const std::string& name);
    // Those that no map has, and that were neither put nor touched from that second on.
    void RemoveUnused(std::int64_t before_s);

    // Of the maps whose picture is not here.
    std::vector<std::string> Missing();

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
