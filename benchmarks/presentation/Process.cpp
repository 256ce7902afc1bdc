// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "benchmarks/presentation/Process.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <stdexcept>

extern char** environ;

namespace Benchmarks
{

namespace
{

/// The number after "NAME:" in a status file of the kernel; 0 where there is none.
long statusNumber(const std::filesystem::path& file, const std::string& name)
{
    std::ifstream status(file);
    for (std::string word; status >> word;) {
        long value = 0;
        if (word == name + ":" && status >> value)
            return value;
    }
    return 0;
}

} // namespace

Process::Process(const std::string& program, const std::string& platform)
{
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 1, "/dev/null", O_WRONLY, 0);
    posix_spawn_file_actions_addopen(&actions, 2, "/dev/null", O_WRONLY, 0);
    std::string name = program;
    std::string option = "-platform";
    std::string value = platform;
    char* arguments[] = {name.data(), option.data(), value.data(), nullptr};
    const int result = posix_spawn(&pid, program.c_str(), &actions, nullptr, arguments, environ);
    posix_spawn_file_actions_destroy(&actions);
    if (result != 0)
        throw std::runtime_error("cannot start " + program);
}

Process::~Process()
{
    ::kill(pid, SIGTERM);
    ::waitpid(pid, nullptr, 0);
}

Usage Process::usage() const
{
    Usage sum;
    const std::filesystem::path folder("/proc/" + std::to_string(pid));
    for (const auto& task : std::filesystem::directory_iterator(folder / "task")) {
        long long nanoseconds = 0;
        std::ifstream(task.path() / "schedstat") >> nanoseconds;
        sum.cpu += std::chrono::nanoseconds(nanoseconds);
        sum.wakeUps += statusNumber(task.path() / "status", "voluntary_ctxt_switches");
    }
    sum.residentKilobytes = statusNumber(folder / "status", "VmRSS");
    return sum;
}

bool Process::isRunning() const
{
    siginfo_t state{};
    return ::waitid(P_PID, static_cast<id_t>(pid), &state, WEXITED | WNOHANG | WNOWAIT) == 0 && state.si_pid == 0;
}

} // namespace Benchmarks
