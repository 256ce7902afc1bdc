// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <atomic>

/// A machine that has no thread left: a program with ThreadShortage.cpp among its sources starts its threads through
/// it. Qt's are told from the standard library's by the attributes that they come with.
///
/// Threads: any.
namespace TestSupport::ThreadShortage
{

/// How many of the next ones the system refuses.
extern std::atomic<int> refusesOfQt;
extern std::atomic<int> refusesOfTheStandardLibrary;
/// How many it has started.
extern std::atomic<int> started;

} // namespace TestSupport::ThreadShortage
