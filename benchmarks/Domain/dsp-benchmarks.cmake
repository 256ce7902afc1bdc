# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
# The maker's library needs the maker's hardware: what these measure is the host library, or the program on its own.
if(NOT DSPLINK_ROOT)
  set(instant_dsp ../tests/support/InstantDsp.cpp ../tests/support/InstantDsp.h)

  # Linked in front of the library, the DSP in the process takes the place of the whole interface.
  add_executable(SensorDataBenchmark Domain/SensorDataBenchmark.cpp Domain/AllocationCount.cpp Domain/AllocationCount.h
    ${instant_dsp})
  set(dsp_command Domain/DspCommandBenchmark.cpp Domain/RoundTrip.cpp Domain/RoundTrip.h)
  add_executable(DspCommandBenchmark ${dsp_command} ${instant_dsp})
  add_executable(DspCommandOverSocketBenchmark ${dsp_command})
  target_compile_definitions(DspCommandOverSocketBenchmark PRIVATE BENCHMARK_OVER_SOCKET)
  add_executable(DspSoak Domain/DspSoak.cpp)
  foreach(program SensorDataBenchmark DspCommandBenchmark DspCommandOverSocketBenchmark DspSoak)
    target_link_libraries(${program} PRIVATE ProjectOptions Domain DspLink Qt6::Core benchmark::benchmark)
  endforeach()
  target_link_libraries(DspCommandOverSocketBenchmark PRIVATE TestSupport)
  target_link_libraries(DspSoak PRIVATE TestSupport)
endif()
