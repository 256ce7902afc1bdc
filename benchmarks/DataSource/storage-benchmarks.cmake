# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
add_executable(FileStoreBenchmark DataSource/FileStoreBenchmark.cpp)
target_link_libraries(FileStoreBenchmark PRIVATE ProjectOptions DataSource Qt6::Core benchmark::benchmark)
