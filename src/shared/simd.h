// Vector instruction levels. The level is chosen once per call, from the
// processor's features (detected once, a constant for the process); the
// kernels of every level give the same bytes as the scalar kernels, which are
// the reference. Tests and benchmarks may force a lower level through an
// internal switch; the library reads no environment.
#pragma once

namespace lorvex {

enum class SimdLevel : int {
    scalar = 0,
    sse41 = 1,  // 128-bit integer vectors
    avx2 = 2,   // 256-bit integer vectors
};

// The highest level this processor and this build support.
SimdLevel detected_simd_level();

// The level the operations use: the detected one, or a lower one forced by
// force_simd_level. Not exported from the shared library.
SimdLevel simd_level();

// Forces the operations to a level (capped at the detected one); call with
// the detected level to undo. For tests and benchmarks only: it is a process
// -wide setting and is not meant to change while operations run.
void force_simd_level(SimdLevel level);

}  // namespace lorvex
