// SPDX-License-Identifier: Apache-2.0
//
// Prometheus' text format, version 0.0.4.
#pragma once

#include <initializer_list>
#include <string>
#include <string_view>
#include <utility>

namespace lookhaven::api {

class MetricsText {
  public:
    using Labels = std::initializer_list<std::pair<std::string_view, std::string>>;

    // All samples of a family follow it. type: "counter", "gauge" or "histogram".
    void Family(std::string_view name, std::string_view type, std::string_view help);
    // suffix: "", or "_bucket", "_sum", "_count" of a histogram.
    void Sample(double value, Labels labels = {}, std::string_view suffix = "");

    const std::string& Text() const { return text_; }

  private:
    std::string text_;
    std::string family_;
};

}  // namespace lookhaven::api
