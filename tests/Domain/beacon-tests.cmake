# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_test(BeaconRecordsTest SOURCES Domain/BeaconRecordsTest.cpp LIBRARIES Domain LABELS unit)
immunityrig_test(SerialPortTest SOURCES Domain/SerialPortTest.cpp Domain/Pty.cpp LIBRARIES Domain LABELS unit)
