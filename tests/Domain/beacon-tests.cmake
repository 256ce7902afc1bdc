# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_test(BeaconRecordsTest SOURCES Domain/BeaconRecordsTest.cpp LIBRARIES Domain LABELS unit)
immunityrig_test(SerialPortTest SOURCES Domain/SerialPortTest.cpp Domain/Pty.cpp LIBRARIES Domain LABELS unit)
immunityrig_test(SerialPortTroubleTest SOURCES Domain/SerialPortTroubleTest.cpp Domain/Pty.cpp LIBRARIES Domain
  LABELS unit)
immunityrig_test(FrameParserTest SOURCES Domain/FrameParserTest.cpp Domain/Frames.cpp LIBRARIES Domain LABELS unit)
immunityrig_test(SerialProtocolTest SOURCES Domain/SerialProtocolTest.cpp Domain/Frames.cpp Domain/Pty.cpp
  LIBRARIES Domain LABELS unit)
immunityrig_test(BeaconProcessorTest SOURCES Domain/BeaconProcessorTest.cpp Domain/Frames.cpp Domain/Pty.cpp
  Domain/RadioPeer.cpp LIBRARIES Domain LABELS unit)
immunityrig_test(BeaconEngineTest SOURCES Domain/BeaconEngineTest.cpp Domain/Frames.cpp Domain/Pty.cpp
  Domain/RadioPeer.cpp LIBRARIES Domain LABELS unit)
immunityrig_test(BeaconTimeOutTest SOURCES Domain/BeaconTimeOutTest.cpp Domain/Frames.cpp Domain/Pty.cpp
  Domain/RadioPeer.cpp LIBRARIES Domain LABELS unit)
immunityrig_test(ThreadShortageTest SOURCES Domain/ThreadShortageTest.cpp support/ThreadShortage.cpp Domain/Frames.cpp
  Domain/Pty.cpp Domain/RadioPeer.cpp LIBRARIES Domain DspLink ${CMAKE_DL_LIBS} LABELS unit)
