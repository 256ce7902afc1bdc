// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/ThreadShortage.h"

#include <dlfcn.h>
#include <pthread.h>

#include <cerrno>

namespace TestSupport::ThreadShortage
{

std::atomic<int> refusesOfQt = 0;
std::atomic<int> refusesOfTheStandardLibrary = 0;
std::atomic<int> started = 0;

} // namespace TestSupport::ThreadShortage

using namespace TestSupport;

extern "C" int pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*start)(void*),
                              void* argument)
{
    using Function = int (*)(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*);
    static const auto real = reinterpret_cast<Function>(::dlsym(RTLD_NEXT, "pthread_create"));
    auto& refuses = attributes != nullptr ? ThreadShortage::refusesOfQt : ThreadShortage::refusesOfTheStandardLibrary;
    if (refuses > 0) {
        --refuses;
        return EAGAIN;
    }
    ++ThreadShortage::started;
    return real(thread, attributes, start, argument);
}
