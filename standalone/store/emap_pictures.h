// SPDX-License-Identifier: Apache-2.0
//
// The pictures of e-maps in a store that several hosts may share, where each of them finds those that another was
// given. In other stores they are only files (emap/pictures.h), and this is empty.
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
    // Notes that the picture is in use now, for RemoveUnused.
    void Touch(const std::string& name, std::int64_t now_s);
    // Removes the picture unless a map has it.
    void Withdraw(const std::string& name);
    // Removes those that no map has, and that were neither put nor touched from that second on.
    void RemoveUnused(std::int64_t before_s);

    // The names of pictures that maps have and this store lacks.
    std::vector<std::string> Missing();

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
