// SPDX-License-Identifier: Apache-2.0
//
// Calls the capability functors that a device registers, and logs when one is missing or has another type than its
// caller expects.
#pragma once

#include <string>

#include "platform/export.h"
#include "platform/log/lhprintf.h"

// An object that capability functors are called on.
class LH_PLATFORM_API DPObjectBase {
  public:
    virtual ~DPObjectBase();
};

// Base of registered functors; what a functor takes and returns is only known at run time.
class LH_PLATFORM_API MemFuncBase {
  public:
    virtual ~MemFuncBase();
};

// Placeholder for an unused argument.
struct NoneT {};

// A member call with up to seven arguments; unused ones are NoneT.
template <typename R, typename A1, typename A2, typename A3, typename A4, typename A5, typename A6, typename A7>
class LH_PLATFORM_API MemFuncInterface;

// A member call without arguments.
template <typename R>
class LH_PLATFORM_API MemFuncInterface<R, NoneT, NoneT, NoneT, NoneT, NoneT, NoneT, NoneT> : public MemFuncBase {
  public:
    virtual R operator()(DPObjectBase& target) = 0;
};

// A functor without arguments and the object to call it on. Owns neither.
template <typename R>
struct CapFunctor {
    DPObjectBase* m_pTarget = nullptr;
    MemFuncBase* m_pFunctor = nullptr;
    std::string m_Name;

    // The functor's result; R() after a log line when it cannot be called.
    R operator()() const {
        if (m_pTarget == nullptr) {
            LHPrintf(LOG_TYPE(0), nullptr, nullptr, "interface/handlerutils", 541, "operator()",
                     "[%s] Error: Failed to run functor with DPObjectBase as NULL.\n", m_Name.c_str());
            return R();
        }
        using Call = MemFuncInterface<R, NoneT, NoneT, NoneT, NoneT, NoneT, NoneT, NoneT>;
        auto* call = dynamic_cast<Call*>(m_pFunctor);
        if (call == nullptr) {
            LHPrintf(LOG_TYPE(0), nullptr, nullptr, "interface/handlerutils", 544, "operator()",
                     "[%s] Error: Some Functor is not registered properly. Check the template argument list and "
                     "Function ID.\n",
                     m_Name.c_str());
            return R();
        }
        return (*call)(*m_pTarget);
    }
};
