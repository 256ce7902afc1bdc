# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

# Finds the chip maker's DSPLink below DSPLINK_ROOT (a variable or -DDSPLINK_ROOT=...) and defines DspLink::DspLink.
#
#   DSPLINK_PLATFORM  folder of the board below gpp/export/BIN/Linux; needed only if there is more than one
#   DSPLINK_BUILD     RELEASE (default) or DEBUG
#   DSPLINK_DEFINES   the defines that the library was built with; needed only if no list of them lies beside it
#
# The maker's build writes the defines for programs outside its own make system into *_defines.txt; what is found
# beside the library is passed on. Without them the headers would not fit the library, perhaps unnoticed.
set(DSPLINK_PLATFORM "" CACHE STRING "Board folder of the DSPLink build")
set(DSPLINK_BUILD "RELEASE" CACHE STRING "DSPLink build to link: RELEASE or DEBUG")
set(DSPLINK_DEFINES "" CACHE STRING "Defines of the DSPLink build, NAME or NAME=VALUE; empty = from its *_defines.txt")

set(_dsplink_bin "${DSPLINK_ROOT}/gpp/export/BIN/Linux")
if(NOT IS_DIRECTORY "${DSPLINK_ROOT}")
  set(_dsplink_reason "DSPLINK_ROOT=\"${DSPLINK_ROOT}\" is no folder. It must be the root of a built DSPLink; "
    "leave it out to build against the host library.")
elseif(NOT EXISTS "${DSPLINK_ROOT}/gpp/inc/usr/msgq.h")
  set(_dsplink_reason "\"${DSPLINK_ROOT}\" has no gpp/inc/usr/msgq.h. DSPLINK_ROOT must be the folder that holds gpp.")
endif()
string(CONCAT _dsplink_reason ${_dsplink_reason})

if(NOT _dsplink_reason)
  if(DSPLINK_PLATFORM)
    set(_dsplink_libraries "${_dsplink_bin}/${DSPLINK_PLATFORM}/${DSPLINK_BUILD}/dsplink.lib")
  else()
    file(GLOB _dsplink_libraries "${_dsplink_bin}/*/${DSPLINK_BUILD}/dsplink.lib")
  endif()
  list(LENGTH _dsplink_libraries _dsplink_count)
  if(_dsplink_count GREATER 1)
    set(_dsplink_reason "several boards are built below ${_dsplink_bin}: choose one with -DDSPLINK_PLATFORM=...")
  elseif(_dsplink_count EQUAL 1 AND EXISTS "${_dsplink_libraries}")
    set(DspLink_LIBRARY "${_dsplink_libraries}")
  else()
    set(_dsplink_reason
      "no dsplink.lib in ${_dsplink_bin}/<board>/${DSPLINK_BUILD}. Build DSPLink first, or set DSPLINK_BUILD=DEBUG.")
  endif()
  set(DspLink_INCLUDE_DIRS "${DSPLINK_ROOT}/gpp/inc" "${DSPLINK_ROOT}/gpp/inc/usr" "${DSPLINK_ROOT}/gpp/inc/sys")
endif()

set(DspLink_DEFINES ${DSPLINK_DEFINES})
if(NOT _dsplink_reason AND NOT DspLink_DEFINES)
  get_filename_component(_dsplink_folder "${DspLink_LIBRARY}" DIRECTORY)
  file(GLOB _dsplink_define_files "${_dsplink_folder}/*_defines.txt")
  foreach(_dsplink_file IN LISTS _dsplink_define_files)
    file(STRINGS "${_dsplink_file}" _dsplink_lines)
    foreach(_dsplink_line IN LISTS _dsplink_lines)
      separate_arguments(_dsplink_words UNIX_COMMAND "${_dsplink_line}")
      list(APPEND DspLink_DEFINES ${_dsplink_words})
    endforeach()
  endforeach()
  if(NOT DspLink_DEFINES)
    set(_dsplink_reason "no defines in ${_dsplink_folder}/*_defines.txt: give those of the build with -DDSPLINK_DEFINES=...")
  endif()
endif()
list(TRANSFORM DspLink_DEFINES REPLACE "^-D" "")
list(REMOVE_DUPLICATES DspLink_DEFINES)

include(FindPackageHandleStandardArgs)
find_package_handle_standard_args(DspLink
  REQUIRED_VARS DspLink_LIBRARY DspLink_INCLUDE_DIRS DspLink_DEFINES
  REASON_FAILURE_MESSAGE "${_dsplink_reason}")

if(DspLink_FOUND AND NOT TARGET DspLink::DspLink)
  add_library(DspLink::DspLink UNKNOWN IMPORTED)
  set_target_properties(DspLink::DspLink PROPERTIES
    IMPORTED_LOCATION "${DspLink_LIBRARY}"
    INTERFACE_INCLUDE_DIRECTORIES "${DspLink_INCLUDE_DIRS}"
    INTERFACE_COMPILE_DEFINITIONS "${DspLink_DEFINES}"
    INTERFACE_LINK_LIBRARIES Threads::Threads)
endif()
