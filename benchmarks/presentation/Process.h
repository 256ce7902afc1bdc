// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>

namespace Benchmarks
{

/// What a process has used since it was started.
struct Usage
{
    std::chrono::nanoseconds cpu{};
    long wakeUps = 0; ///< times that one of its threads gave the processor up to wait for something
    long residentKilobytes = 0;
};

/// A program that runs while this object lives: standard output and error go nowhere, SIGTERM ends it.
class Process
{
public:
    Process(const std::string& program, const std::string& platform);
    ~Process();
    Process(const Process&) = delete;
    Process& operator=(const Process&) = delete;

    [[nodiscard]] pid_t id() const { return pid; }
    [[nodiscard]] Usage usage() const;
    [[nodiscard]] bool isRunning() const;

private:
    pid_t pid = -1;
};

} // namespace Benchmarks
