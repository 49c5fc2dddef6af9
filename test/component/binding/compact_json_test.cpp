// SPDX-License-Identifier: Apache-2.0
//
// The own JSON writer, against the library's.
#include "standalone/binding/compact_json.h"

#include <limits>

#include <gtest/gtest.h>

#include "standalone/binding/request.h"

namespace lookhaven::binding {
namespace {

// Every byte and number that a writer may get wrong, against the JSON library's own writer.
TEST(CompactJson, IsWhatTheJsonLibraryWrites) {
    Json::Value cases(Json::arrayValue);
    std::string every_byte;
    for (int byte = 0; byte < 256; ++byte) {
        every_byte += static_cast<char>(byte);
        cases.append(std::string(1, static_cast<char>(byte)) + "x");
    }
    cases.append(every_byte);
    cases[cases.size() + 5] = every_byte + every_byte;  // with a gap before it
    cases.append(Json::Value())[every_byte] = Json::Value(Json::objectValue);
    cases.append(Json::Value())["b"][Json::StaticString("a")][""] = Json::Value(Json::arrayValue);
    for (const char* text : {"", "\xc3\xa9\xe2\x82\xac\xf0\x9f\x98\x80", "</script>\\/\x7f", "\xe2\x80\xa8"}) {
        cases.append(Json::Value())[text] = text;
    }
    using Double = std::numeric_limits<double>;
    for (const double real : {0.0,
                              -0.0,
                              1.0,
                              0.1,
                              1.0 / 3,
                              3.814697265625,
                              4e6 * 0x1p-20,
                              1e15,
                              1e16,
                              1e17,
                              123456789012345680.0,
                              1e21,
                              1e-4,
                              1e-5,
                              5e-324,
                              Double::min(),
                              Double::max(),
                              -Double::max(),
                              0x1p53,
                              0x1p63,
                              Double::infinity(),
                              -Double::infinity(),
                              Double::quiet_NaN()}) {
        cases.append(real);
    }
    for (const Json::Value& value :
         {Json::Value(), Json::Value(true), Json::Value(Json::Value::minInt64), Json::Value(Json::Value::maxUInt64)}) {
        cases.append(value);
    }
    Json::StreamWriterBuilder library;
    library["indentation"] = "";
    library["emitUTF8"] = true;
    library["precision"] = 17;
    for (const Json::Value& value : cases) {
        EXPECT_EQ(SuccessText(value), "{\"data\":" + Json::writeString(library, value) + ",\"success\":true}");
    }
    EXPECT_EQ(SuccessText(cases), "{\"data\":" + Json::writeString(library, cases) + ",\"success\":true}");
}

}  // namespace
}  // namespace lookhaven::binding
