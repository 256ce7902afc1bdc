# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)

file(RELATIVE_PATH path_to_root "${CMAKE_BINARY_DIR}" "${PROJECT_SOURCE_DIR}")

# What every target of the project is compiled with. Link it PRIVATE, or PUBLIC from a library of ours.
add_library(ProjectOptions INTERFACE)
target_include_directories(ProjectOptions INTERFACE "${PROJECT_SOURCE_DIR}")
target_compile_options(ProjectOptions INTERFACE
  -Wall -Wextra -Wpedantic -Wshadow -Wconversion
  $<$<BOOL:${IMMUNITYRIG_WERROR}>:-Werror>
  # Here, not by a library's own options: one precompiled header serves only what is compiled alike.
  -pthread
  # The log names a source file by its path from the project's root, whatever the build folder is. A compiler cache may
  # make the path relative to that folder.
  "-fmacro-prefix-map=${PROJECT_SOURCE_DIR}/="
  "-fmacro-prefix-map=${path_to_root}=")
target_compile_definitions(ProjectOptions INTERFACE
  QT_NO_FOREACH
  IMMUNITYRIG_VERSION="${PROJECT_VERSION}")

if(IMMUNITYRIG_SANITIZE)
  target_compile_options(ProjectOptions INTERFACE
    "-fsanitize=${IMMUNITYRIG_SANITIZE}" -fno-omit-frame-pointer -fno-sanitize-recover=all)
  target_link_options(ProjectOptions INTERFACE "-fsanitize=${IMMUNITYRIG_SANITIZE}")
endif()

# Qt's headers are most of what the compiler reads; the tidy preset switches this off, so that a missing include shows.
function(immunityrig_precompile TARGET)
  target_precompile_headers(${TARGET} PRIVATE ${ARGN})
endfunction()
