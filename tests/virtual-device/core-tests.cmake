# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

immunityrig_test(LogStoreTest SOURCES virtual-device/LogStoreTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(SandboxPlanTest SOURCES virtual-device/SandboxPlanTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(StateFolderTest SOURCES virtual-device/StateFolderTest.cpp LIBRARIES VirtualDevice LABELS unit)

# What mounts or starts a sandbox runs unwrapped, and as root and as an ordinary user where root calls.
function(immunityrig_device_test NAME)
  immunityrig_test(${NAME} ON_DEVICE SOURCES virtual-device/${NAME}.cpp LIBRARIES VirtualDevice LABELS device)
  add_test(NAME ${NAME}AsOrdinaryUser
    COMMAND "${PROJECT_SOURCE_DIR}/tests/as-ordinary-user.sh" $<TARGET_FILE:${NAME}>)
  foreach(property TIMEOUT LABELS ENVIRONMENT)
    get_test_property(${NAME} ${property} value)
    set_tests_properties(${NAME}AsOrdinaryUser PROPERTIES ${property} "${value}")
  endforeach()
  set_tests_properties(${NAME}AsOrdinaryUser PROPERTIES SKIP_RETURN_CODE 77)
endfunction()

immunityrig_device_test(DeviceFolderTest)
immunityrig_device_test(DeviceTreeTest)
immunityrig_device_test(DataPartitionTest)
immunityrig_device_test(DeviceTest)
immunityrig_device_test(VirtualDeviceCommandTest)

# A program with a window, as the device runs one.
add_executable(virtual-device-window-program virtual-device/WindowProgram.cpp)
target_link_libraries(virtual-device-window-program PRIVATE ProjectOptions Qt6::Widgets)
add_executable(virtual-device-clock-probe virtual-device/ClockProbe.cpp)
target_link_libraries(virtual-device-clock-probe PRIVATE ProjectOptions)
foreach(test DeviceTest VirtualDeviceCommandTest)
  add_dependencies(${test} virtual-device virtual-device-window-program virtual-device-clock-probe)
  target_compile_definitions(${test} PRIVATE
    VIRTUAL_DEVICE="$<TARGET_FILE:virtual-device>"
    CLOCK_PROBE="$<TARGET_FILE:virtual-device-clock-probe>"
    SOURCE_FILE="${PROJECT_SOURCE_DIR}/tests/CMakeLists.txt"
    WINDOW_PROGRAM="$<TARGET_FILE:virtual-device-window-program>")
endforeach()
