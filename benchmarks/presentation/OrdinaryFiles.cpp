// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "benchmarks/presentation/OrdinaryFiles.h"

#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <string>
#include <system_error>

namespace Benchmarks
{

namespace
{

namespace fs = std::filesystem;

void check(int result, const std::string& what)
{
    if (result != 0)
        throw std::system_error(errno, std::generic_category(), what);
}

/// Read to the end: the size that such a file states says nothing.
void copyFile(const fs::path& from, const fs::path& to)
{
    std::ofstream copy(to, std::ios::binary);
    std::ifstream original(from, std::ios::binary);
    if (original && original.peek() != std::ifstream::traits_type::eof())
        copy << original.rdbuf();
}

void copyTree(const fs::path& from, const fs::path& to)
{
    fs::create_directories(to);
    for (const auto& entry : fs::directory_iterator(from)) {
        const auto target = to / entry.path().filename();
        if (entry.is_symlink())
            fs::copy_symlink(entry.path(), target);
        else if (entry.is_directory())
            copyTree(entry.path(), target);
        else
            copyFile(entry.path(), target);
    }
}

/// A mount needs a namespace of its own, in which this user may do so.
void enterNamespace()
{
    const auto identity = [](unsigned id) { return std::to_string(id) + " " + std::to_string(id) + " 1"; };
    const auto users = identity(::getuid());
    const auto groups = identity(::getgid());
    check(::unshare(CLONE_NEWUSER | CLONE_NEWNS), "unshare");
    std::ofstream("/proc/self/setgroups") << "deny";
    std::ofstream("/proc/self/uid_map") << users;
    std::ofstream("/proc/self/gid_map") << groups;
}

} // namespace

void useOrdinaryFiles()
{
    const fs::path copies = fs::temp_directory_path() / "ordinary-files";
    enterNamespace();
    for (const char* folder : {"/sys", "/mnt/data"}) {
        const fs::path copy = copies.string() + folder;
        copyTree(folder, copy);
        check(::mount(copy.c_str(), folder, nullptr, MS_BIND, nullptr), folder);
    }
}

} // namespace Benchmarks
