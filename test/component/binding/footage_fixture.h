// SPDX-License-Identifier: Apache-2.0
//
// A request's process with recordings in its store.
#pragma once

#include "platform/recording/jpegextractor.h"
#include "test/component/binding/binding_fixture.h"
#include "test/support/footage/footage.h"

namespace lookhaven::binding {

constexpr std::int64_t kNoon = 1772366400;

class FootageBinding : public Binding {
  protected:
    static std::string Picture(JpegExtractor& extractor, int index, int size = 100) {
        std::string buffer(static_cast<std::size_t>(size), '\0');
        const int result = extractor.ReadFrame(index, reinterpret_cast<unsigned char*>(buffer.data()), size);
        return result == 0 ? buffer.substr(0, static_cast<std::size_t>(size)) : "none";
    }
    std::filesystem::path Path(const char* name) const { return footage_.Mount() / name; }

    test::Footage footage_{home_.StoreUrl(), folder_};
};

}  // namespace lookhaven::binding
