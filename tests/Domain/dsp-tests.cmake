# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

# The maker's library needs the maker's hardware: what runs here is the host library.
if(NOT DSPLINK_ROOT)
  immunityrig_test(DspLinkHostTest SOURCES dsplink/DspLinkHostTest.cpp dsplink/DspLinkTestCase.h
    LIBRARIES DspLink LABELS integration)
  immunityrig_test(DspLinkMessageTest SOURCES dsplink/DspLinkMessageTest.cpp dsplink/DspLinkTestCase.h
    LIBRARIES DspLink LABELS integration)
  # Linked in front of the library, the DSP in the process takes the place of the whole interface.
  immunityrig_test(DspPortCallsTest SOURCES Domain/DspPortCallsTest.cpp support/InstantDsp.cpp support/InstantDsp.h
    LIBRARIES Domain DspLink LABELS unit)
  foreach(test IN ITEMS DspPortTest DspPortReadingTest)
    immunityrig_test(${test} SOURCES Domain/${test}.cpp Domain/DspPortFixture.h Domain/DspTestParts.h
      LIBRARIES Domain DspLink LABELS integration)
  endforeach()
  immunityrig_test(DspPortOpeningTest SOURCES Domain/DspPortOpeningTest.cpp LIBRARIES Domain LABELS integration)
  immunityrig_test(DspTest SOURCES Domain/DspTest.cpp LIBRARIES Domain LABELS integration)
  immunityrig_test(DspReceiveTest SOURCES Domain/DspReceiveTest.cpp LIBRARIES Domain LABELS integration)
endif()
immunityrig_test(DspRecordsTest SOURCES Domain/DspRecordsTest.cpp LIBRARIES Domain LABELS unit)

add_test(NAME FindDspLinkTest COMMAND ${CMAKE_COMMAND} -DWORK=${CMAKE_CURRENT_BINARY_DIR}/find-dsplink
  -P ${CMAKE_CURRENT_SOURCE_DIR}/dsplink/find-module-test.cmake)
add_test(NAME DspLinkSdkTest COMMAND ${CMAKE_COMMAND} -DSOURCE=${PROJECT_SOURCE_DIR} "-DGENERATOR=${CMAKE_GENERATOR}"
  -DCOMPILER=${CMAKE_CXX_COMPILER} -DWORK=${CMAKE_CURRENT_BINARY_DIR}/dsplink-sdk
  -P ${CMAKE_CURRENT_SOURCE_DIR}/dsplink/sdk-build-test.cmake)
set_tests_properties(FindDspLinkTest DspLinkSdkTest PROPERTIES LABELS unit)
