// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/metrics_text.h"

#include <gtest/gtest.h>

namespace lookhaven::api {
namespace {

TEST(MetricsText, EscapesLabelsAndKeepsWholeNumbersWhole) {
    MetricsText text;
    text.Family("a_total", "counter", "Some.");
    text.Sample(12345678901);
    text.Sample(0.25, {{"name", "a \"b\" \\ c\nd{}"}, {"x", ""}}, "_sum");
    EXPECT_EQ(text.Text(), "# HELP a_total Some.\n# TYPE a_total counter\na_total 12345678901\n"
                           "a_total_sum{name=\"a \\\"b\\\" \\\\ c\\nd{}\",x=\"\"} 0.25\n");
}

}  // namespace
}  // namespace lookhaven::api
