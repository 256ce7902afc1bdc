# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

# cmake -DSOURCE=folder -DWORK=folder -DGENERATOR=name -DCOMPILER=path -P sdk-build-test.cmake
# Configures the program, as for the device, with a tree that has the shape of the chip maker's SDK, and compiles what
# uses its headers. That alone: there is nothing to link with, and on a 64-bit machine words of type "long" have the
# wrong size.
function(run)
  execute_process(COMMAND ${ARGN} OUTPUT_VARIABLE output ERROR_VARIABLE output RESULT_VARIABLE result)
  if(NOT result EQUAL 0)
    message(FATAL_ERROR "${ARGN}:\n${output}")
  endif()
endfunction()

set(board "${WORK}/sdk/gpp/export/BIN/Linux/BOARD/RELEASE")
file(REMOVE_RECURSE "${WORK}/sdk")
file(COPY "${CMAKE_CURRENT_LIST_DIR}/sdk" DESTINATION "${WORK}")
file(WRITE "${board}/dsplink.lib" "")
file(WRITE "${board}/dsplink_defines.txt" "-DMAX_DSPS=1\n")
run("${CMAKE_COMMAND}" -S "${SOURCE}" -B "${WORK}/build" --fresh -G "${GENERATOR}" "-DCMAKE_CXX_COMPILER=${COMPILER}"
  "-DDSPLINK_ROOT=${WORK}/sdk" -DIMMUNITYRIG_PROGRAM_ONLY=ON -DIMMUNITYRIG_WERROR=ON -DCMAKE_DISABLE_PRECOMPILE_HEADERS=ON
  -DCMAKE_EXPORT_COMPILE_COMMANDS=ON)

file(READ "${WORK}/build/compile_commands.json" commands)
string(JSON count LENGTH "${commands}")
math(EXPR last "${count} - 1")
foreach(index RANGE ${last})
  string(JSON file GET "${commands}" ${index} file)
  if(file STREQUAL "${SOURCE}/Domain/src/DomainLayer/DspPort.cpp")
    string(JSON command GET "${commands}" ${index} command)
  endif()
endforeach()
foreach(text IN ITEMS "-isystem ${WORK}/sdk/gpp/inc/usr" "-DMAX_DSPS=1")
  string(FIND "${command}" "${text}" at)
  if(at EQUAL -1)
    message(FATAL_ERROR "expected \"${text}\" in\n${command}")
  endif()
endforeach()
if(command MATCHES "dsplink/include")
  message(FATAL_ERROR "the host library's headers are in\n${command}")
endif()
run(sh -c "cd '${WORK}/build' && ${command} -fsyntax-only")
