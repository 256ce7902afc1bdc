# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

# immunityrig_test(NAME [ON_DEVICE] SOURCES ... LIBRARIES ... [LABELS ...] [TIMEOUT seconds])
#
# A QTest program. By default it runs as an ordinary user in a file system of its own (tests/sandbox.sh): private
# /dev, /sys, /mnt, /etc/sounds and /dev/log, in which a test makes just the files that its case needs. With ON_DEVICE
# it runs unwrapped and starts the virtual device itself.
function(immunityrig_test NAME)
  cmake_parse_arguments(TEST "ON_DEVICE" "TIMEOUT" "SOURCES;LIBRARIES;LABELS" ${ARGN})
  add_executable(${NAME} ${TEST_SOURCES})
  if(IMMUNITYRIG_SANITIZE STREQUAL "thread" AND TEST_LABELS MATCHES "system|device")
    set_target_properties(${NAME} PROPERTIES EXCLUDE_FROM_ALL TRUE) # "rig check" does not run them there
  endif()
  target_link_libraries(${NAME} PRIVATE ProjectOptions TestSupport ${TEST_LIBRARIES} Qt6::Test)
  target_precompile_headers(${NAME} REUSE_FROM TestSupport)
  # A test includes what moc makes of it. The file that is left for the rest is empty, and loading the precompiled
  # header costs a second.
  set_source_files_properties("${CMAKE_CURRENT_BINARY_DIR}/${NAME}_autogen/mocs_compilation.cpp" PROPERTIES
    SKIP_PRECOMPILE_HEADERS ON)
  if(TEST_ON_DEVICE)
    set(command $<TARGET_FILE:${NAME}>)
  else()
    set(command "${PROJECT_SOURCE_DIR}/tests/sandbox.sh" "${PROJECT_SOURCE_DIR}" "${CMAKE_BINARY_DIR}"
      $<TARGET_FILE:${NAME}>)
  endif()
  add_test(NAME ${NAME} COMMAND ${command})
  if(NOT TEST_TIMEOUT)
    set(TEST_TIMEOUT 300)
  endif()
  set_tests_properties(${NAME} PROPERTIES
    TIMEOUT ${TEST_TIMEOUT}
    LABELS "${TEST_LABELS}"
    ENVIRONMENT "QT_QPA_PLATFORM=offscreen;LC_ALL=C.UTF-8;TZ=UTC;IMMUNITYRIG_BUILD=${CMAKE_BINARY_DIR};TSAN_OPTIONS=suppressions=${PROJECT_SOURCE_DIR}/tests/tsan.supp:halt_on_error=1:ignore_noninstrumented_modules=1:die_after_fork=0;ASAN_OPTIONS=detect_stack_use_after_return=1;LSAN_OPTIONS=suppressions=${PROJECT_SOURCE_DIR}/tests/lsan.supp:print_suppressions=0;UBSAN_OPTIONS=print_stacktrace=1")
endfunction()
