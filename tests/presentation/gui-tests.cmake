# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

add_library(PresentationTestSupport STATIC
  presentation/DebugOutput.cpp presentation/DebugOutput.h
  presentation/LabelForm.cpp presentation/LabelForm.h
  presentation/ObjectRecorder.cpp presentation/ObjectRecorder.h
  presentation/RecordingBeacon.cpp presentation/RecordingBeacon.h
  presentation/WidgetProbe.cpp presentation/WidgetProbe.h)
target_link_libraries(PresentationTestSupport PUBLIC TestSupport Domain)
target_precompile_headers(PresentationTestSupport REUSE_FROM TestSupport)

foreach(test IN ITEMS
    RtcTestTest FuelGuageTestTest UsbDeviceTestTest UsbGadgetTestTest SdCardTestTest TriggerTestTest ButtonsTestTest
    RfTestTest RfLinkTest TerminationSignalsTest ScreenUpdatesTest)
  immunityrig_test(${test} SOURCES presentation/${test}.cpp LIBRARIES PresentationTestSupport Presentation LABELS presentation)
endforeach()
immunityrig_test(TestGuiTest SOURCES presentation/TestGuiTest.cpp
  LIBRARIES PresentationTestSupport Presentation LABELS presentation)
immunityrig_test(AssemblyTest SOURCES presentation/AssemblyTest.cpp
  LIBRARIES PresentationTestSupport Presentation LABELS presentation)
immunityrig_test(AssemblyOrderTest SOURCES presentation/AssemblyOrderTest.cpp
  LIBRARIES PresentationTestSupport Presentation LABELS presentation)
# The window's calls of these functions go through the test, which notes them.
foreach(symbol IN ITEMS
    _ZN12Presentation9AudioTest5startEv _ZN12Presentation9AudioTest4stopEv _ZN12Presentation7RtcTest5startEv
    _ZN12Presentation13UsbDeviceTest5startEv _ZN12Presentation6RfTest5startEv _ZN12Presentation13FuelGuageTest5startEv
    _ZN12Presentation13UsbGadgetTest5startEv _ZN12Presentation11TriggerTest5startEv
    _ZN12Presentation10SdCardTest5startEv _ZN6Domain3Dsp21setReceiverEnableTestEi _ZN6Domain3Dsp15runHardwareTestEi
    _ZN7QWidget11setGeometryERK5QRect
    _ZN7QObject11connectImplEPKS_PPvS1_S3_PN9QtPrivate15QSlotObjectBaseEN2Qt14ConnectionTypeEPKiPK11QMetaObject)
  target_link_options(AssemblyOrderTest PRIVATE LINKER:--wrap=${symbol})
endforeach()
immunityrig_test(ResourcesTest
  SOURCES presentation/ResourcesTest.cpp "${PROJECT_SOURCE_DIR}/resources/Target.qrc"
    "${PROJECT_SOURCE_DIR}/resources/Resources.qrc"
  LABELS presentation)
immunityrig_test(ProgramTest SOURCES presentation/ProgramTest.cpp
  LIBRARIES PresentationTestSupport LABELS presentation)
add_dependencies(ProgramTest immunityrig)
add_library(ScreenProbe MODULE presentation/ScreenProbe.cpp presentation/ScreenProbe.json)
target_link_libraries(ScreenProbe PRIVATE ProjectOptions Qt6::Gui)
set_target_properties(ScreenProbe PROPERTIES LIBRARY_OUTPUT_DIRECTORY "${CMAKE_CURRENT_BINARY_DIR}/plugins/generic")
add_dependencies(ProgramTest ScreenProbe)
immunityrig_test(RtcOnDeviceTest ON_DEVICE SOURCES presentation/RtcOnDeviceTest.cpp
  LIBRARIES PresentationTestSupport DeviceTestSupport Presentation LABELS presentation)
add_dependencies(RtcOnDeviceTest virtual-device)
immunityrig_test(StartScriptTest SOURCES presentation/StartScriptTest.cpp LABELS presentation)
target_compile_definitions(StartScriptTest PRIVATE
  START_SCRIPT="${PROJECT_SOURCE_DIR}/presentation/start-immunityrig.sh")
