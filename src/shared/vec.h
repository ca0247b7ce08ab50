// A thin layer over 128-bit (SSE4.1) and 256-bit (AVX2) integer vectors, so
// that one vector kernel template serves both widths. Each vector source file
// is compiled for its instruction set and includes this header; Vec is the
// vector type of that file's level.
//
// Lanes of 16 bits: `lanes16` elements per register. unpack_lo16/unpack_hi16
// interleave within 128-bit halves (as the instructions do); a pack of the two
// 32-bit results of such a pair restores element order.
#pragma once

#include <cstdint>
#include <immintrin.h>

#include "shared/isa.h"

namespace lorvex {
inline namespace LORVEX_ISA_NAMESPACE {

// Four bytes from or to any address, as a 32-bit integer.
inline int32_t load32(const void* p)
{
    int32_t v;
    __builtin_memcpy(&v, p, 4);
    return v;
}
inline void store32(void* p, int32_t v)
{
    __builtin_memcpy(p, &v, 4);
}

#if defined(LORVEX_ISA_AVX2)
struct Vec {
    using reg = __m256i;
    static constexpr int lanes16 = 16;
    static reg zero() { return _mm256_setzero_si256(); }
    static reg set1_16(int16_t v) { return _mm256_set1_epi16(v); }
    static reg set1_32(int32_t v) { return _mm256_set1_epi32(v); }
    static reg load_u8(const uint8_t* p) { return _mm256_cvtepu8_epi16(_mm_loadu_si128((const __m128i*)p)); }
    static reg load_u16(const uint16_t* p) { return _mm256_loadu_si256((const __m256i*)p); }
    static reg load_i16(const int16_t* p) { return _mm256_loadu_si256((const __m256i*)p); }
    static void store_i16(int16_t* p, reg v) { _mm256_storeu_si256((__m256i*)p, v); }
    static reg unpack_lo16(reg a, reg b) { return _mm256_unpacklo_epi16(a, b); }
    static reg unpack_hi16(reg a, reg b) { return _mm256_unpackhi_epi16(a, b); }
    static reg madd(reg a, reg b) { return _mm256_madd_epi16(a, b); }
    static reg add32(reg a, reg b) { return _mm256_add_epi32(a, b); }
    static reg add16(reg a, reg b) { return _mm256_add_epi16(a, b); }
    static reg sub16(reg a, reg b) { return _mm256_sub_epi16(a, b); }
    static reg mullo32(reg a, reg b) { return _mm256_mullo_epi32(a, b); }
    static reg srai32(reg a, int n) { return _mm256_srai_epi32(a, n); }
    static reg slli16(reg a, int n) { return _mm256_slli_epi16(a, n); }
    static reg packs32(reg a, reg b) { return _mm256_packs_epi32(a, b); }
    // 16-bit lanes widened to 32 bits, low and high halves in element order.
    static reg widen_lo_u16(reg a) { return _mm256_cvtepu16_epi32(_mm256_castsi256_si128(a)); }
    static reg widen_hi_u16(reg a) { return _mm256_cvtepu16_epi32(_mm256_extracti128_si256(a, 1)); }
    static reg widen_lo_i16(reg a) { return _mm256_cvtepi16_epi32(_mm256_castsi256_si128(a)); }
    static reg widen_hi_i16(reg a) { return _mm256_cvtepi16_epi32(_mm256_extracti128_si256(a, 1)); }
    // Two vectors of 32-bit lanes in element order, saturated to 16 bits.
    static reg narrow_s32(reg lo, reg hi) { return _mm256_permute4x64_epi64(_mm256_packs_epi32(lo, hi), 0xD8); }
};
#elif defined(LORVEX_ISA_SSE41)
struct Vec {
    using reg = __m128i;
    static constexpr int lanes16 = 8;
    static reg zero() { return _mm_setzero_si128(); }
    static reg set1_16(int16_t v) { return _mm_set1_epi16(v); }
    static reg set1_32(int32_t v) { return _mm_set1_epi32(v); }
    static reg load_u8(const uint8_t* p) { return _mm_cvtepu8_epi16(_mm_loadl_epi64((const __m128i*)p)); }
    static reg load_u16(const uint16_t* p) { return _mm_loadu_si128((const __m128i*)p); }
    static reg load_i16(const int16_t* p) { return _mm_loadu_si128((const __m128i*)p); }
    static void store_i16(int16_t* p, reg v) { _mm_storeu_si128((__m128i*)p, v); }
    static reg unpack_lo16(reg a, reg b) { return _mm_unpacklo_epi16(a, b); }
    static reg unpack_hi16(reg a, reg b) { return _mm_unpackhi_epi16(a, b); }
    static reg madd(reg a, reg b) { return _mm_madd_epi16(a, b); }
    static reg add32(reg a, reg b) { return _mm_add_epi32(a, b); }
    static reg add16(reg a, reg b) { return _mm_add_epi16(a, b); }
    static reg sub16(reg a, reg b) { return _mm_sub_epi16(a, b); }
    static reg mullo32(reg a, reg b) { return _mm_mullo_epi32(a, b); }
    static reg srai32(reg a, int n) { return _mm_srai_epi32(a, n); }
    static reg slli16(reg a, int n) { return _mm_slli_epi16(a, n); }
    static reg packs32(reg a, reg b) { return _mm_packs_epi32(a, b); }
    static reg widen_lo_u16(reg a) { return _mm_cvtepu16_epi32(a); }
    static reg widen_hi_u16(reg a) { return _mm_cvtepu16_epi32(_mm_srli_si128(a, 8)); }
    static reg widen_lo_i16(reg a) { return _mm_cvtepi16_epi32(a); }
    static reg widen_hi_i16(reg a) { return _mm_cvtepi16_epi32(_mm_srli_si128(a, 8)); }
    static reg narrow_s32(reg lo, reg hi) { return _mm_packs_epi32(lo, hi); }
};
#endif

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex
