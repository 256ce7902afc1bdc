# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

add_library(PresentationTestSupport STATIC
  presentation/DebugOutput.cpp presentation/DebugOutput.h
  presentation/LabelForm.cpp presentation/LabelForm.h
  presentation/RecordingBeacon.cpp presentation/RecordingBeacon.h
  presentation/WidgetProbe.cpp presentation/WidgetProbe.h)
target_link_libraries(PresentationTestSupport PUBLIC TestSupport Domain)
target_precompile_headers(PresentationTestSupport REUSE_FROM TestSupport)

foreach(test IN ITEMS
    RtcTestTest FuelGuageTestTest UsbDeviceTestTest UsbGadgetTestTest SdCardTestTest TriggerTestTest ButtonsTestTest
    RfTestTest RfLinkTest)
  immunityrig_test(${test} SOURCES presentation/${test}.cpp LIBRARIES PresentationTestSupport Presentation LABELS presentation)
endforeach()
