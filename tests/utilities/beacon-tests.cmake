# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_test(VersionNumberTest SOURCES utilities/VersionNumberTest.cpp LIBRARIES Utilities LABELS unit)
immunityrig_test(VersionNumberRegistrationTest SOURCES utilities/VersionNumberRegistrationTest.cpp LIBRARIES Utilities
  LABELS unit)
