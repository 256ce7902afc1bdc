# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT

# The maker's library needs the maker's hardware: what runs here is the host library.
if(NOT DSPLINK_ROOT)
  immunityrig_test(DspLinkHostTest SOURCES dsplink/DspLinkHostTest.cpp LIBRARIES DspLink LABELS integration)
endif()
