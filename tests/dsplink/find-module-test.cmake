# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

# cmake -DWORK=folder -P find-module-test.cmake
# The find module of the maker's DSPLink, against folders that look like a build of it and folders that do not.
function(expect NAME TEXT)
  execute_process(COMMAND "${CMAKE_COMMAND}" -S "${CMAKE_CURRENT_FUNCTION_LIST_DIR}/find-module" -B "${WORK}/build-${NAME}"
    --fresh ${ARGN} OUTPUT_VARIABLE output ERROR_VARIABLE output)
  string(REGEX REPLACE "[ \n]+" " " output "${output}")
  string(FIND "${output}" "${TEXT}" at)
  if(at EQUAL -1)
    message(SEND_ERROR "${NAME}: expected \"${TEXT}\" in\n${output}")
  endif()
endfunction()

file(REMOVE_RECURSE "${WORK}")
set(sdk "${WORK}/sdk")
set(bin "${sdk}/gpp/export/BIN/Linux")

expect(no-folder "is no folder. It must be the root of a built DSPLink" -DDSPLINK_ROOT=${WORK}/nowhere)
file(MAKE_DIRECTORY "${sdk}")
expect(no-headers "has no gpp/inc/usr/msgq.h" -DDSPLINK_ROOT=${sdk})
file(WRITE "${sdk}/gpp/inc/usr/msgq.h" "")
expect(not-built "no dsplink.lib in ${bin}/<board>/RELEASE. Build DSPLink first" -DDSPLINK_ROOT=${sdk})

file(WRITE "${bin}/BOARD/RELEASE/dsplink.lib" "")
expect(no-defines "no defines in ${bin}/BOARD/RELEASE/*_defines.txt: give those of the build with -DDSPLINK_DEFINES=..."
  -DDSPLINK_ROOT=${sdk})
expect(given-defines "INTERFACE_COMPILE_DEFINITIONS=MAX_DSPS=2;PROC_COMPONENT" -DDSPLINK_ROOT=${sdk}
  "-DDSPLINK_DEFINES=-DMAX_DSPS=2\\;PROC_COMPONENT")
file(WRITE "${bin}/BOARD/RELEASE/msgq_defines.txt" "-DMAX_DSPS=1 -DMSGQ_COMPONENT\n")
expect(library "IMPORTED_LOCATION=${bin}/BOARD/RELEASE/dsplink.lib" -DDSPLINK_ROOT=${sdk})
expect(headers "INTERFACE_INCLUDE_DIRECTORIES=${sdk}/gpp/inc;${sdk}/gpp/inc/usr;${sdk}/gpp/inc/sys" -DDSPLINK_ROOT=${sdk})
expect(defines "INTERFACE_COMPILE_DEFINITIONS=MAX_DSPS=1;MSGQ_COMPONENT" -DDSPLINK_ROOT=${sdk})
expect(no-debug "no dsplink.lib in ${bin}/<board>/DEBUG" -DDSPLINK_ROOT=${sdk} -DDSPLINK_BUILD=DEBUG)

file(WRITE "${bin}/OTHER/RELEASE/dsplink.lib" "")
file(WRITE "${bin}/OTHER/RELEASE/proc_defines.txt" "-DMAX_DSPS=1\n")
expect(two-boards "several boards are built below ${bin}: choose one with -DDSPLINK_PLATFORM=..." -DDSPLINK_ROOT=${sdk})
expect(chosen "IMPORTED_LOCATION=${bin}/OTHER/RELEASE/dsplink.lib" -DDSPLINK_ROOT=${sdk} -DDSPLINK_PLATFORM=OTHER)
expect(wrong-board "no dsplink.lib in" -DDSPLINK_ROOT=${sdk} -DDSPLINK_PLATFORM=THIRD)
