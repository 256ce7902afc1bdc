# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_test(DebugTest SOURCES utilities/DebugTest.cpp LIBRARIES Utilities LABELS unit)
immunityrig_test(StandardErrorTest SOURCES utilities/StandardErrorTest.cpp LIBRARIES Utilities LABELS unit)
immunityrig_test(LogThreadShortageTest SOURCES utilities/LogThreadShortageTest.cpp support/ThreadShortage.cpp
  LIBRARIES Utilities ${CMAKE_DL_LIBS} LABELS unit)
