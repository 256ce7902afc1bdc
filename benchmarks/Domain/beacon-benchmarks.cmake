# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
set(streams Domain/Streams.cpp Domain/Streams.h ../tests/Domain/Frames.cpp ../tests/Domain/Frames.h)

# The same rows twice: the stub takes the log's place at link time. With the log every refused byte costs a message,
# so a shorter stream has to do.
add_executable(FrameBenchmark Domain/FrameBenchmark.cpp Domain/StubbedLog.cpp ${streams})
target_compile_definitions(FrameBenchmark PRIVATE BENCHMARK_STREAM_SIZE=8388608)
add_executable(FrameAndLogBenchmark Domain/FrameBenchmark.cpp ${streams})
target_compile_definitions(FrameAndLogBenchmark PRIVATE BENCHMARK_STREAM_SIZE=8192)
add_executable(PingBenchmark Domain/PingBenchmark.cpp Domain/RoundTrip.cpp Domain/RoundTrip.h
  ../tests/Domain/Frames.cpp ../tests/Domain/Pty.cpp)
add_executable(RadioLinkSoak Domain/RadioLinkSoak.cpp ../tests/Domain/Frames.cpp ../tests/Domain/Pty.cpp)
foreach(program FrameBenchmark FrameAndLogBenchmark PingBenchmark RadioLinkSoak)
  target_link_libraries(${program} PRIVATE ProjectOptions Domain Qt6::Core Qt6::Test benchmark::benchmark)
endforeach()
