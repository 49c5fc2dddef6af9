// SPDX-License-Identifier: Apache-2.0
//
// Removed cameras whose recordings are to go, too: the recorder may still finish the last one when the camera is gone.
#pragma once

#include <cstdint>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

class FootageRemovals {
  public:
    // The store must outlive this object.
    explicit FootageRemovals(Store& store) : store_(store) {}

    // Call in the transaction that removes the camera. Remembers the last thousand, for a day.
    void Add(int camera, std::int64_t now_s);
    std::vector<int> Cameras();
    // Begins the deletion of what has come since, but of no camera that there is. Kept recordings stay. Call it every
    // few seconds.
    void BeginDeletions();

  private:
    Store& store_;
};

}  // namespace lookhaven::store
