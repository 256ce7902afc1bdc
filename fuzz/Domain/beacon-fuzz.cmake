# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
set(line ../tests/Domain/Frames.cpp ../tests/Domain/Frames.h ../tests/Domain/Pty.cpp ../tests/Domain/Pty.h)

immunityrig_fuzz(FrameParser SOURCES Domain/FrameParserFuzz.cpp ${line} LIBRARIES Domain Qt6::Test)
immunityrig_fuzz(ProcessMessage SOURCES Domain/ProcessMessageFuzz.cpp Domain/CheckedLog.cpp ${line}
  LIBRARIES Domain Qt6::Test)
