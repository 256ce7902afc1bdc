# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_fuzz(SensorReading SOURCES Domain/SensorReadingFuzz.cpp Domain/CheckedLog.cpp LIBRARIES Domain)
immunityrig_fuzz(PairingUpgradeData SOURCES Domain/PairingUpgradeDataFuzz.cpp Domain/CheckedLog.cpp LIBRARIES Domain)
if(NOT DSPLINK_ROOT)
  # The DSP in the process stands in front of the library.
  immunityrig_fuzz(DspReceive SOURCES Domain/DspReceiveFuzz.cpp Domain/CheckedLog.cpp ../tests/support/InstantDsp.cpp
    LIBRARIES Domain DspLink)
endif()
