#include "shared/simd.h"

#include <atomic>

namespace lorvex {
namespace {

SimdLevel detect()
{
#if defined(__x86_64__) && defined(LORVEX_HAVE_X86_KERNELS)
    __builtin_cpu_init();
    if (__builtin_cpu_supports("avx2")) return SimdLevel::avx2;
    if (__builtin_cpu_supports("sse4.1")) return SimdLevel::sse41;
#endif
    return SimdLevel::scalar;
}

std::atomic<int> forced{-1};

}  // namespace

SimdLevel detected_simd_level()
{
    static const SimdLevel level = detect();
    return level;
}

SimdLevel simd_level()
{
    const SimdLevel detected = detected_simd_level();
    const int f = forced.load(std::memory_order_relaxed);
    return f >= 0 && f < int(detected) ? SimdLevel(f) : detected;
}

void force_simd_level(SimdLevel level)
{
    forced.store(int(level), std::memory_order_relaxed);
}

}  // namespace lorvex
