// SPDX-License-Identifier: Apache-2.0
//
// The module's log lines go where ours go: standard error.
#include "standalone/base/log.h"

#include <array>
#include <cstdarg>
#include <cstdio>
#include <string_view>

#include "platform/interface/handlerutils.h"
#include "platform/log/lhprintf.h"

namespace base = lookhaven::base;

DPObjectBase::~DPObjectBase() = default;
MemFuncBase::~MemFuncBase() = default;

template <>
LHEnum2StrMap<LOG_CATEG>::LHEnum2StrMap() : m_Names{{LOG_CATEG_LIVEVIEW, "LIVEVIEW"}, {LOG_CATEG_PLAYER, "PLAYER"}} {}

template <>
LHEnum2StrMap<LOG_LEVEL>::LHEnum2StrMap()
    : m_Names{{LOG_LEVEL_ERR, "ERR"},
              {LOG_LEVEL_WARN, "WARN"},
              {LOG_LEVEL_NOTICE, "NOTICE"},
              {LOG_LEVEL_INFO, "INFO"},
              {LOG_LEVEL_DEBUG, "DEBUG"}} {}

// The module has filtered its lines by then, so a verbose one is not filtered a second time.
void LHPrintf(LOG_TYPE, const char* categName, const char* levelName, const char* file, int line, const char* func,
              const char* fmt, ...) {
    std::array<char, 1024> text{};
    const int head = std::snprintf(text.data(), text.size(), "%s%s%s:%d %s: ", categName == nullptr ? "" : categName,
                                   categName == nullptr ? "" : " ", file, line, func);
    if (head < 0 || static_cast<std::size_t>(head) >= text.size()) {
        return;
    }
    std::va_list arguments;
    va_start(arguments, fmt);
    std::vsnprintf(text.data() + head, text.size() - static_cast<std::size_t>(head), fmt, arguments);
    va_end(arguments);
    const std::string_view level = levelName == nullptr ? "ERR" : levelName;
    base::Log(level == "ERR"    ? base::Severity::kError
              : level == "WARN" ? base::Severity::kWarning
                                : base::Severity::kInfo,
              text.data());
}
