# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
pkg_check_modules(VncClient REQUIRED IMPORTED_TARGET libvncclient)

add_executable(MinimalWindow presentation/MinimalWindow.cpp)
target_link_libraries(MinimalWindow PRIVATE ProjectOptions Qt6::Widgets)

add_executable(ProgramBenchmark
  presentation/EventLoopWatch.cpp presentation/EventLoopWatch.h
  presentation/FirstFrame.cpp presentation/FirstFrame.h
  presentation/OrdinaryFiles.cpp presentation/OrdinaryFiles.h
  presentation/Process.cpp presentation/Process.h
  presentation/ProgramBenchmark.cpp)
target_link_libraries(ProgramBenchmark PRIVATE ProjectOptions benchmark::benchmark PkgConfig::VncClient)
add_dependencies(ProgramBenchmark MinimalWindow immunityrig virtual-device)
