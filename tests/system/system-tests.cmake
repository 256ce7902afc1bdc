# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

# The shipped program on the virtual device.
foreach(test ScreenSystemTest GaugeSystemTest GeometrySystemTest RadioPanelSystemTest RadioSystemTest SoundSystemTest
    KeysSystemTest StartSystemTest EndSystemTest)
  immunityrig_test(${test} ON_DEVICE SOURCES system/${test}.cpp LIBRARIES DeviceTestSupport LABELS system)
  add_dependencies(${test} virtual-device immunityrig)
endforeach()
