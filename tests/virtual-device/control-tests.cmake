# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

add_library(DeviceTestSupport STATIC
  support/DeviceUnderTest.cpp support/DeviceUnderTest.h
  support/ProgramProcess.cpp support/ProgramProcess.h
  support/ScreenHealth.cpp support/ScreenHealth.h
  support/ScreenText.cpp support/ScreenText.h)
target_link_libraries(DeviceTestSupport PUBLIC ProjectOptions TestSupport VirtualDevice)
target_precompile_headers(DeviceTestSupport REUSE_FROM TestSupport)

add_executable(WindowSample virtual-device/WindowSample.cpp)
target_link_libraries(WindowSample PRIVATE ProjectOptions TestSupport)
target_precompile_headers(WindowSample REUSE_FROM TestSupport)

immunityrig_test(ScreenTest
  SOURCES virtual-device/ScreenTest.cpp virtual-device/SampleProgram.cpp virtual-device/SampleProgram.h virtual-device/Terminal.h
  LIBRARIES VirtualDevice LABELS unit)
add_dependencies(ScreenTest WindowSample)
immunityrig_test(ScreenDisturbanceTest
  SOURCES virtual-device/ScreenDisturbanceTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(RegistryTest SOURCES virtual-device/RegistryTest.cpp LIBRARIES VirtualDevice LABELS unit)
foreach(test ControlServerTest ControlWaitTest)
  immunityrig_test(${test}
    SOURCES virtual-device/${test}.cpp virtual-device/ControlBench.cpp virtual-device/ControlBench.h
    LIBRARIES VirtualDevice LABELS unit)
endforeach()
target_compile_definitions(ControlServerTest PRIVATE SOURCE_FOLDER="${PROJECT_SOURCE_DIR}")
immunityrig_test(RegionMapTest SOURCES virtual-device/RegionMapTest.cpp LIBRARIES VirtualDevice LABELS unit)
set_target_properties(RegionMapTest PROPERTIES AUTOUIC_SEARCH_PATHS "${PROJECT_SOURCE_DIR}")
immunityrig_test(CtlTest
  SOURCES virtual-device/CtlTest.cpp virtual-device/ControlBench.cpp virtual-device/ControlBench.h
  LIBRARIES VirtualDevice LABELS unit)
add_dependencies(CtlTest virtual-device)

# Everything together, as root and as an ordinary user where root calls.
immunityrig_test(DeviceControlTest ON_DEVICE
  SOURCES virtual-device/DeviceControlTest.cpp LIBRARIES DeviceTestSupport LABELS device)
add_dependencies(DeviceControlTest virtual-device immunityrig)
add_test(NAME DeviceControlTestAsOrdinaryUser
  COMMAND "${PROJECT_SOURCE_DIR}/tests/as-ordinary-user.sh" $<TARGET_FILE:DeviceControlTest>)
foreach(property TIMEOUT LABELS ENVIRONMENT)
  get_test_property(DeviceControlTest ${property} value)
  set_tests_properties(DeviceControlTestAsOrdinaryUser PROPERTIES ${property} "${value}")
endforeach()
set_tests_properties(DeviceControlTestAsOrdinaryUser PROPERTIES SKIP_RETURN_CODE 77)

immunityrig_test(DocumentationTest SOURCES virtual-device/DocumentationTest.cpp LIBRARIES VirtualDevice LABELS unit)
target_compile_definitions(DocumentationTest PRIVATE SOURCE_FOLDER="${PROJECT_SOURCE_DIR}")
