# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_test(XmlConfigurationDataTest SOURCES DataSource/XmlConfigurationDataTest.cpp LIBRARIES DataSource LABELS unit)
immunityrig_test(XmlConfigurationPropertyTest SOURCES DataSource/XmlConfigurationPropertyTest.cpp LIBRARIES DataSource
  LABELS unit property)
