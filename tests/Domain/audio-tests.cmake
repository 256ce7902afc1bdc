# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_test(ButtonsTest SOURCES Domain/ButtonsTest.cpp LIBRARIES Domain LABELS unit)
