# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_fuzz(ConfigurationFile SOURCES DataSource/ConfigurationFileFuzz.cpp Domain/CheckedLog.cpp
  LIBRARIES DataSource)
