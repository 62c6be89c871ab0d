#pragma once

/// Put before a function whose loops the compiler turns into vector code: it is compiled for AVX2
/// and for the plain instruction set, and the loader takes what the machine has. The clones round
/// alike, since fused multiply-add is not among the instructions allowed, so results do not depend
/// on the machine. Compilers and sanitizers that can't do it get the plain function.
#if defined(__GNUC__) && !defined(__clang__) && defined(__x86_64__) && defined(__OPTIMIZE__) && \
    !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
#define VEXG_VECTOR_CLONES __attribute__((target_clones("avx2", "default"), optimize("O3")))
/// The same for loops that choose between computed numbers: both may be computed, since nothing
/// here asks which floating-point exceptions came up.
#define VEXG_CHOOSING_VECTOR_CLONES \
  __attribute__((target_clones("avx2", "default"), optimize("O3", "no-trapping-math")))
#else
#define VEXG_VECTOR_CLONES
#define VEXG_CHOOSING_VECTOR_CLONES
#endif
