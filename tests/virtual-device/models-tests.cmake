# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_test(RadioFrameTest SOURCES virtual-device/RadioFrameTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(LineDamageTest SOURCES virtual-device/LineDamageTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(RadioModelTest SOURCES virtual-device/RadioModelTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(RadioLineTest SOURCES virtual-device/RadioLineTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(ExactTimerTest SOURCES virtual-device/ExactTimerTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(RateTimerTest SOURCES virtual-device/RateTimerTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(DspCodecTest SOURCES virtual-device/DspCodecTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(DspModelTest SOURCES virtual-device/DspModelTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(DspEventsTest SOURCES virtual-device/DspEventsTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(SoundMatcherTest SOURCES virtual-device/SoundMatcherTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(AudioWatcherTest SOURCES virtual-device/AudioWatcherTest.cpp LIBRARIES VirtualDevice LABELS unit)
immunityrig_test(MixerPluginTest SOURCES virtual-device/MixerPluginTest.cpp LIBRARIES VirtualDevice SoundFixture LABELS unit)

# The program's classes against the device's models: two sides that share no code.
immunityrig_test(RadioCrossCheckTest SOURCES virtual-device/RadioCrossCheckTest.cpp LIBRARIES Domain VirtualDevice
  LABELS unit)
immunityrig_test(AudioCrossCheckTest SOURCES virtual-device/AudioCrossCheckTest.cpp LIBRARIES Domain VirtualDevice
  LABELS unit)
target_compile_definitions(AudioCrossCheckTest PRIVATE MIXER_PLUGIN="$<TARGET_FILE:MixerPlugin>")
# The maker's library needs the maker's hardware.
if(NOT DSPLINK_ROOT)
  immunityrig_test(DspCrossCheckTest SOURCES virtual-device/DspCrossCheckTest.cpp LIBRARIES Domain VirtualDevice
    LABELS unit)
endif()
