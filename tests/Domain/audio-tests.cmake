# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
immunityrig_test(ButtonsTest SOURCES Domain/ButtonsTest.cpp LIBRARIES Domain LABELS unit)
add_library(SoundFixture STATIC Domain/SoundFixture.cpp Domain/SoundFixture.h)
# Not by the imported target: the definitions that come with it would shut out the precompiled header.
target_include_directories(SoundFixture SYSTEM PUBLIC ${SDL_INCLUDE_DIRS})
target_link_libraries(SoundFixture PUBLIC TestSupport ${SDL_LINK_LIBRARIES} PkgConfig::ALSA ${CMAKE_DL_LIBS})
target_precompile_headers(SoundFixture REUSE_FROM TestSupport)
target_compile_definitions(SoundFixture PUBLIC "MIXER_PLUGIN=\"$<TARGET_FILE:MixerPlugin>\"")
add_dependencies(SoundFixture MixerPlugin)
immunityrig_test(AudioVolumeTest SOURCES Domain/AudioVolumeTest.cpp LIBRARIES Domain SoundFixture LABELS unit)
add_library(AudioFixture STATIC Domain/AudioFixture.cpp Domain/AudioFixture.h)
target_link_libraries(AudioFixture PUBLIC Domain SoundFixture)
target_precompile_headers(AudioFixture REUSE_FROM TestSupport)
foreach(test AudioPlaybackTest AudioFilesTest AudioRequestsTest)
  immunityrig_test(${test} SOURCES Domain/${test}.cpp LIBRARIES AudioFixture LABELS unit)
endforeach()
immunityrig_test(AudioTestTest SOURCES presentation/AudioTestTest.cpp LIBRARIES Presentation SoundFixture LABELS unit)
immunityrig_test(AudioEndTest SOURCES Domain/AudioEndTest.cpp LIBRARIES Domain SoundFixture LABELS unit)
