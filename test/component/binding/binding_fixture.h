// SPDX-License-Identifier: Apache-2.0
//
// A request's process as the module sees it: a caller, and a store with recordings.
#pragma once

#include <filesystem>
#include <memory>
#include <string>

#include <gtest/gtest.h>

#include "platform/recording/jpegextractor.h"
#include "standalone/binding/request_context.h"
#include "standalone/store/users.h"
#include "test/support/folder.h"
#include "test/support/footage/footage.h"

namespace lookhaven::binding {

constexpr std::int64_t kNoon = 1772366400;

class Binding : public testing::Test {
  protected:
    Binding() {
        base::Installation::CreateFolders(folder_);
        home_ = std::make_unique<base::Installation>(folder_);
        store::Store::Migrate(home_->StoreUrl());
        footage_ = std::make_unique<test::Footage>(home_->StoreUrl(), folder_);
        for (const char* name : {"admin", "guest"}) {
            store::Users(footage_->Records()).Add(name, "long enough", store::Privilege::kViewer);
        }
        Call(1);
    }
    ~Binding() override { Call(0); }

    void Call(unsigned int user) const {
        RequestContext& context = RequestContext::Current();
        context.CloseRecords();
        context.Begin(*home_, nullptr);
        context.SetCaller(user);
        context.RestrictByPrivData({});
    }
    static std::string Picture(JpegExtractor& extractor, int index, int size = 100) {
        std::string buffer(static_cast<std::size_t>(size), '\0');
        const int result = extractor.ReadFrame(index, reinterpret_cast<unsigned char*>(buffer.data()), size);
        return result == 0 ? buffer.substr(0, static_cast<std::size_t>(size)) : "none";
    }
    std::filesystem::path Path(const char* name) const { return footage_->Mount() / name; }

    test::TemporaryFolder folder_;
    std::unique_ptr<base::Installation> home_;
    std::unique_ptr<test::Footage> footage_;
};

}  // namespace lookhaven::binding
