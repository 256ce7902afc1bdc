# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_fuzz(LoadedSound SOURCES Domain/LoadedSoundFuzz.cpp LIBRARIES Domain PkgConfig::SDL)
