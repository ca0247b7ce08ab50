// Vector forms of the horizontal samplers, for both vector widths (Vec of
// shared/vec.h). They compute exactly the sums of their scalar twins in
// sample_taps.h - the same products, added in 32 bits, with the same rounding
// - and leave the composition to the family, so the pixels are the same.
//
// A bank sampler lays the taps of every phase out once per strip as vectors
// that match the line buffer's interleaving: luma taps at the even elements
// of a window of 4:2:2 samples with zeros between, chroma taps on both Cb and
// Cr elements of a window of pairs, RGBQ taps split over two vectors (first
// and third samples, second and fourth). A pixel is then a few multiply-adds
// of whole registers loaded around its position and a horizontal sum. Windows
// are rounded up to whole registers; the extra elements they load (inside the
// line buffer's storage) are weighed by zero.
#pragma once

#include <algorithm>
#include <type_traits>

#include "horizontal/compose_plain.h"
#include "horizontal/sample_area.h"
#include "horizontal/sample_taps.h"
#include "shared/vec.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

// The four 32-bit lanes of a 128-bit register, folded from a full register.
inline __m128i fold128(__m128i v)
{
    return v;
}
#if defined(LORVEX_ISA_AVX2)
inline __m128i fold128(__m256i v)
{
    return _mm_add_epi32(_mm256_castsi256_si128(v), _mm256_extracti128_si256(v, 1));
}
#endif

// One sample of a whole pixel by the plain rule: limited when the call
// clamps, mixed at a level other than 4096, stored with its low bits.
// Calls run(integral_constant<bool, clamp>, integral_constant<bool, full>)
// with the two tests of a whole-pixel run made once, outside its loop: whether
// samples are limited and whether the level is 4096.
template <class Run>
inline auto with_run_flags(bool clamp, int32_t level, Run&& run)
{
    using Yes = std::true_type;
    using No = std::false_type;
    if (level == 4096) return clamp ? run(Yes{}, Yes{}) : run(No{}, Yes{});
    return clamp ? run(Yes{}, No{}) : run(No{}, No{});
}

template <class Dst>
inline void put_whole(typename Dst::sample* at, int32_t v, bool clamp, int32_t level)
{
    if (clamp) v = clamp_to(v, 0, Dst::max);
    *at = typename Dst::sample(level == 4096 ? v : (int32_t(*at) * (4096 - level) + v * level + 2048) >> 12);
}

// One whole 4:2:2 pair of the source-alpha tables in four 32-bit lanes in
// memory order [Y0 Cb Y1 Cr]: S its samples, a0 the even pixel's alpha (Y0,
// Cb and Cr take it), a1 the odd one's (Y1); a sample whose pixel has an
// alpha A below 1 keeps D. With o the sample's offset:
//   Fast (colour in buffer units, m = 16384 - A):
//     (S + (((D - o) m) >> (14 - sh)) + 2^(sh - 1)) >> sh, chroma limited,
//     luma stored with its low bits;
//   general (level 4096, S in stored depth, limited when `clamp`):
//     clamp((((D - o)(16384 - A) + 8192) >> 14) + S), or for the luma of a
//     pixel whose A is above 16384 clamp(((S - o) 16384) / A + o).
template <class Dst, bool Fast>
LORVEX_ALWAYS_INLINE void pair_over(typename Dst::sample* d, __m128i S, int32_t a0, int32_t a1, bool clamp)
{
    using Sm = typename Dst::sample;
    constexpr int sh = Dst::buffer_shift;
    const __m128i o = _mm_setr_epi32(Dst::luma_offset, Dst::chroma_offset, Dst::luma_offset, Dst::chroma_offset);
    const __m128i zero = _mm_setzero_si128(), top = _mm_set1_epi32(Dst::max), full = _mm_set1_epi32(16384);
    const __m128i A = _mm_setr_epi32(a0, a0, a1, a0);
    const __m128i D = sizeof(Sm) == 1 ? _mm_cvtepu8_epi32(_mm_cvtsi32_si128(load32(d)))
                                      : _mm_cvtepu16_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(d)));
    const __m128i Do = _mm_sub_epi32(D, o);
    __m128i v;
    if constexpr (Fast) {
        const __m128i t = _mm_srai_epi32(_mm_mullo_epi32(Do, _mm_sub_epi32(full, A)), 14 - sh);
        v = _mm_srai_epi32(_mm_add_epi32(_mm_add_epi32(S, t), _mm_set1_epi32(1 << (sh - 1))), sh);
        v = _mm_blendv_epi8(_mm_min_epi32(_mm_max_epi32(v, zero), top), v, _mm_setr_epi32(-1, 0, -1, 0));
    } else {
        if (clamp) S = _mm_min_epi32(_mm_max_epi32(S, zero), top);
        const __m128i t =
            _mm_srai_epi32(_mm_add_epi32(_mm_mullo_epi32(Do, _mm_sub_epi32(full, A)), _mm_set1_epi32(8192)), 14);
        v = _mm_add_epi32(t, S);
        if (a0 > 16384 || a1 > 16384) {
            alignas(16) int32_t sv[4], vv[4];
            _mm_store_si128(reinterpret_cast<__m128i*>(sv), S);
            _mm_store_si128(reinterpret_cast<__m128i*>(vv), v);
            if (a0 > 16384) vv[0] = ((sv[0] - Dst::luma_offset) * 16384) / a0 + Dst::luma_offset;
            if (a1 > 16384) vv[2] = ((sv[2] - Dst::luma_offset) * 16384) / a1 + Dst::luma_offset;
            v = _mm_load_si128(reinterpret_cast<const __m128i*>(vv));
        }
        v = _mm_min_epi32(_mm_max_epi32(v, zero), top);
    }
    v = _mm_blendv_epi8(D, v, _mm_cmpgt_epi32(A, zero));
    const __m128i pick = sizeof(Sm) == 1 ? _mm_setr_epi8(0, 4, 8, 12, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1)
                                         : _mm_setr_epi8(0, 1, 4, 5, 8, 9, 12, 13, -1, -1, -1, -1, -1, -1, -1, -1);
    const __m128i out = _mm_shuffle_epi8(v, pick);
    if constexpr (sizeof(Sm) == 1)
        store32(d, _mm_cvtsi128_si32(out));
    else
        _mm_storel_epi64(reinterpret_cast<__m128i*>(d), out);
}

#if defined(LORVEX_ISA_AVX2)
// Pixels [b, b + count) of the 4:2:2 line (b even, count even) split
// into planes: luma from pixel b on, Cb and Cr from pair b / 2 on.
inline void split_422(const int16_t* line, int32_t b, int32_t count, int16_t* y, int16_t* u, int16_t* v)
{
    const int16_t* in = line + 2 * b;
    // Per 128-bit lane Y0 Cb0 Y1 Cr0 Y2 Cb1 Y3 Cr1 -> Y0 Y1 Y2 Y3 Cb0 Cb1 Cr0 Cr1.
    const __m256i lane = _mm256_setr_epi8(0, 1, 4, 5, 8, 9, 12, 13, 2, 3, 10, 11, 6, 7, 14, 15, 0, 1, 4, 5, 8, 9,
                                          12, 13, 2, 3, 10, 11, 6, 7, 14, 15);
    const __m256i chroma = _mm256_setr_epi32(0, 4, 2, 6, 1, 5, 3, 7);
    int32_t k = 0;
    for (; k + 16 <= count; k += 16) {
        const __m256i a = _mm256_shuffle_epi8(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(in + 2 * k)), lane);
        const __m256i b2 =
            _mm256_shuffle_epi8(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(in + 2 * k + 16)), lane);
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(y + k),
                            _mm256_permute4x64_epi64(_mm256_unpacklo_epi64(a, b2), 0xD8));
        const __m256i uv = _mm256_permutevar8x32_epi32(_mm256_unpackhi_epi64(a, b2), chroma);
        _mm_storeu_si128(reinterpret_cast<__m128i*>(u + k / 2), _mm256_castsi256_si128(uv));
        _mm_storeu_si128(reinterpret_cast<__m128i*>(v + k / 2), _mm256_extracti128_si256(uv, 1));
    }
    for (; k < count; k += 2) {
        y[k] = in[2 * k];
        u[k / 2] = in[2 * k + 1];
        y[k + 1] = in[2 * k + 2];
        v[k / 2] = in[2 * k + 3];
    }
}

// The planes of a chunk of a 4:2:2 line as split_422 writes them: up to
// kCap pixels of luma and kCap / 2 pairs of each chroma, each plane followed
// by kSlack words for the loads that reach past a window or an index.
struct Planes422 {
    static constexpr int32_t kCap = 1024, kSlack = 64;
    static constexpr int32_t kToV = (kCap / 2 + kSlack) * 2;  // bytes from a Cb sample to its Cr
    alignas(32) int16_t words[kCap + kSlack + 2 * (kCap / 2 + kSlack)];
    int16_t* Y() { return words; }
    int16_t* U() { return words + kCap + kSlack; }
    int16_t* V() { return U() + kCap / 2 + kSlack; }
};

// Whether elements [from, to) of a line all lie within [lo, hi].
inline bool within(const int16_t* line, int32_t from, int32_t to, int16_t lo, int16_t hi)
{
    __m256i mn = _mm256_set1_epi16(lo), mx = _mm256_set1_epi16(hi);
    int32_t e = from;
    for (; e + 32 <= to; e += 32) {
        const __m256i x = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(line + e));
        const __m256i y = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(line + e + 16));
        mn = _mm256_min_epi16(mn, _mm256_min_epi16(x, y));
        mx = _mm256_max_epi16(mx, _mm256_max_epi16(x, y));
    }
    const __m256i bad = _mm256_or_si256(_mm256_cmpgt_epi16(_mm256_set1_epi16(lo), mn),
                                        _mm256_cmpgt_epi16(mx, _mm256_set1_epi16(hi)));
    bool out = !_mm256_testz_si256(bad, bad);
    for (; e < to; ++e) out |= line[e] < lo || line[e] > hi;
    return !out;
}

// Four RGBQ pixels interpolated in 16-bit lanes as [0 1 | 2 3], pixel j
// between the pixels at elements at[j] and at[j] + 4 with the fraction in F
// (each pixel's f in its four lanes). With d = b - a, a (0x10000 - f) + b f
// = a 2^16 + d f, and floor((a 2^16 + d f + 2^(15 + cs)) / 2^(16 + cs)) is
// (a + floor(d f / 2^16) + 2^(cs - 1)) >> cs: the low half of d f is a
// fraction below one that cannot carry into it. For the unsigned f,
// floor(d f / 2^16) is the signed high product with f read as signed, plus
// d where f's top bit is set. Every term fits 16 bits while the elements
// stay within +-16383.
template <int cs>
LORVEX_ALWAYS_INLINE __m256i lerp4_16(const int16_t* line, const int32_t* at, __m256i F)
{
    static_assert(cs >= 1 && cs <= 15);
    const auto two = [&](int x, int y) {
        return _mm256_inserti128_si256(
            _mm256_castsi128_si256(_mm_loadu_si128(reinterpret_cast<const __m128i*>(line + at[x]))),
            _mm_loadu_si128(reinterpret_cast<const __m128i*>(line + at[y])), 1);
    };
    const __m256i x = two(0, 2), y = two(1, 3);
    const __m256i a = _mm256_unpacklo_epi64(x, y), b = _mm256_unpackhi_epi64(x, y);
    const __m256i dv = _mm256_sub_epi16(b, a);
    const __m256i high = _mm256_add_epi16(_mm256_mulhi_epi16(dv, F), _mm256_and_si256(dv, _mm256_srai_epi16(F, 15)));
    return _mm256_srai_epi16(_mm256_add_epi16(_mm256_add_epi16(a, high), _mm256_set1_epi16(int16_t(1 << (cs - 1)))), cs);
}

// The pairs (w[i], w[i + 1]) of a line of words for eight indices i within
// i0 .. i0 + 8, as 32-bit lanes: two loads (pairs from i0 + 2k and from
// i0 + 2k + 1) and a pick by each index's parity, where a gather would be
// slower. Reads words i0 .. i0 + 16 (inside the line buffer's storage).
LORVEX_ALWAYS_INLINE __m256i near_pairs(const int16_t* w, int32_t i0, __m256i i)
{
    const __m256i o = _mm256_sub_epi32(i, _mm256_set1_epi32(i0));
    const __m256i half = _mm256_srli_epi32(o, 1);
    const __m256i even = _mm256_permutevar8x32_epi32(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(w + i0)), half);
    const __m256i odd = _mm256_permutevar8x32_epi32(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(w + i0 + 1)), half);
    return _mm256_castps_si256(
        _mm256_blendv_ps(_mm256_castsi256_ps(even), _mm256_castsi256_ps(odd), _mm256_castsi256_ps(_mm256_slli_epi32(o, 31))));
}

// Spreads four of eight 32-bit lanes (the low four, or the high) over pairs
// of lanes, [j j j+1 j+1 | ...]: with twice16, a pixel's value in its four
// 16-bit lanes.
LORVEX_ALWAYS_INLINE __m256i spread4(__m256i v, int high)
{
    return _mm256_permutevar8x32_epi32(v, high ? _mm256_setr_epi32(4, 4, 5, 5, 6, 6, 7, 7)
                                               : _mm256_setr_epi32(0, 0, 1, 1, 2, 2, 3, 3));
}

// The low half of each 32-bit lane in both of its 16-bit halves.
LORVEX_ALWAYS_INLINE __m256i twice16(__m256i v)
{
    return _mm256_or_si256(_mm256_and_si256(v, _mm256_set1_epi32(0xFFFF)), _mm256_slli_epi32(v, 16));
}

// Eight whole 4:2:2 pairs from split planes in 16-bit lanes. Luma output t
// (Y0 Y1 of pairs 0 .. 3 for t = 0 .. 7 in i0 and f0, of pairs 4 .. 7 in i1
// and f1) lies between Y[i] and Y[i + 1] at the fraction f < 0x10000: as
// lerp4_16 does. The chroma of pair k lies between (U, V)[j] and [j + 1] at
// F = h 0x10000 + f (h and f in odd and fc): a (0x20000 - F) + b F rounds to
// (2 a + d h + floor(d f / 2^16) + 2^cs) >> (cs + 1) with d = b - a, the low
// half of d f again too small to reach it. Sums stay within 16 bits for
// elements within +-16000. The indices of each eight lie within nine
// samples of their first (near_pairs). Stored limited to 0 .. max when Clamp,
// else with their low bits, as the scalar rule stores them.
template <class Dst, int cs, bool Clamp>
LORVEX_ALWAYS_INLINE void pairs8_16(typename Dst::sample* d, const int16_t* Y, const int16_t* U, const int16_t* V, __m256i i0,
                      __m256i f0, __m256i i1, __m256i f1, __m256i j, __m256i odd, __m256i fc)
{
    using S = typename Dst::sample;
    const __m256i zero = _mm256_setzero_si256(), top = _mm256_set1_epi16(int16_t(Dst::max));
    const auto low_half = [](__m256i g) { return _mm256_srai_epi32(_mm256_slli_epi32(g, 16), 16); };
    const auto high = [](__m256i dv, __m256i F) {  // floor(dv F / 2^16), F unsigned
        return _mm256_add_epi16(_mm256_mulhi_epi16(dv, F), _mm256_and_si256(dv, _mm256_srai_epi16(F, 15)));
    };
    const auto finish = [&](__m256i v) {
        if constexpr (Clamp) return _mm256_min_epi16(_mm256_max_epi16(v, zero), top);
        if constexpr (sizeof(S) == 1) return _mm256_and_si256(v, _mm256_set1_epi16(0xFF));
        return v;  // sixteen bits
    };
    const __m256i g0 = near_pairs(Y, _mm256_cvtsi256_si32(i0), i0), g1 = near_pairs(Y, _mm256_cvtsi256_si32(i1), i1);
    // [0-3 8-11 | 4-7 12-15]
    const __m256i a = _mm256_packs_epi32(low_half(g0), low_half(g1));
    const __m256i b = _mm256_packs_epi32(_mm256_srai_epi32(g0, 16), _mm256_srai_epi32(g1, 16));
    const __m256i luma = finish(_mm256_srai_epi16(
        _mm256_add_epi16(_mm256_add_epi16(a, high(_mm256_sub_epi16(b, a), _mm256_packus_epi32(f0, f1))),
                         _mm256_set1_epi16(int16_t(1 << (cs - 1)))),
        cs));
    const int32_t j0 = _mm256_cvtsi256_si32(j);
    const __m256i gu = near_pairs(U, j0, j), gv = near_pairs(V, j0, j);
    // [Cb 0-3 Cr 0-3 | Cb 4-7 Cr 4-7]
    const __m256i ca = _mm256_packs_epi32(low_half(gu), low_half(gv));
    const __m256i cd = _mm256_sub_epi16(_mm256_packs_epi32(_mm256_srai_epi32(gu, 16), _mm256_srai_epi32(gv, 16)), ca);
    const __m256i h = _mm256_packs_epi32(_mm256_sub_epi32(zero, odd), _mm256_sub_epi32(zero, odd));
    const __m256i sum = _mm256_add_epi16(_mm256_add_epi16(_mm256_add_epi16(ca, ca), _mm256_and_si256(cd, h)),
                                         _mm256_add_epi16(high(cd, _mm256_packus_epi32(fc, fc)), _mm256_set1_epi16(int16_t(1 << cs))));
    const __m256i chroma = finish(_mm256_srai_epi16(sum, cs + 1));
    // Pairs in memory order: luma (Y0, Y1) words and (Cb, Cr) words interleaved.
    const __m256i lp = _mm256_permutevar8x32_epi32(luma, _mm256_setr_epi32(0, 1, 4, 5, 2, 3, 6, 7));
    const __m256i cc = _mm256_unpacklo_epi16(chroma, _mm256_srli_si256(chroma, 8));
    const __m256i x = _mm256_unpacklo_epi16(lp, cc), z = _mm256_unpackhi_epi16(lp, cc);  // [0 1 | 4 5], [2 3 | 6 7]
    if constexpr (sizeof(S) == 1) {
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(d), _mm256_packus_epi16(x, z));
    } else {
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(d), _mm256_permute2x128_si256(x, z, 0x20));
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(d + 16), _mm256_permute2x128_si256(x, z, 0x31));
    }
}

// The plain whole-pixel rule on two RGBQ pixels in 32-bit lanes: limited
// when Clamp, mixed with the destination at `d` when not Full, the low
// bits kept as the scalar rule stores them.
template <bool Clamp, bool Full>
LORVEX_ALWAYS_INLINE __m256i whole_rgbq2(__m256i y, const uint8_t* d, int32_t level)
{
    if constexpr (Clamp) y = _mm256_min_epi32(_mm256_max_epi32(y, _mm256_setzero_si256()), _mm256_set1_epi32(255));
    if constexpr (!Full) {
        const __m256i D = _mm256_cvtepu8_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(d)));
        y = _mm256_srai_epi32(_mm256_add_epi32(_mm256_add_epi32(_mm256_mullo_epi32(D, _mm256_set1_epi32(4096 - level)),
                                                                _mm256_mullo_epi32(y, _mm256_set1_epi32(level))),
                                               _mm256_set1_epi32(2048)),
                              12);
    }
    return _mm256_and_si256(y, _mm256_set1_epi32(0xFF));
}

// Eight RGBQ pixels from four registers of two, in 32-bit lanes holding
// bytes: packed (lanes [0 2 | 1 3] and [4 6 | 5 7]) and put back in order.
LORVEX_ALWAYS_INLINE void store_rgbq8(uint8_t* d, const __m256i v[4])
{
    const __m256i w = _mm256_packus_epi16(_mm256_packus_epi32(v[0], v[1]), _mm256_packus_epi32(v[2], v[3]));
    _mm256_storeu_si256(reinterpret_cast<__m256i*>(d),
                        _mm256_permutevar8x32_epi32(w, _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7)));
}

// Eight RGBQ pixels from two registers of four in 16-bit lanes, [0 1 | 2 3]
// and [4 5 | 6 7]: limited to 0 .. 255 when Clamp, else cut to their low
// byte as the scalar rule stores them.
template <bool Clamp>
LORVEX_ALWAYS_INLINE void store_rgbq8_16(uint8_t* d, __m256i g0, __m256i g1)
{
    const auto cut = [](__m256i v) {
        if constexpr (Clamp) return _mm256_min_epi16(_mm256_max_epi16(v, _mm256_setzero_si256()), _mm256_set1_epi16(255));
        return _mm256_and_si256(v, _mm256_set1_epi16(0xFF));
    };
    // [0 1 4 5 | 2 3 6 7] -> 0 .. 7
    _mm256_storeu_si256(reinterpret_cast<__m256i*>(d), _mm256_permute4x64_epi64(_mm256_packus_epi16(cut(g0), cut(g1)), 0xD8));
}

// The general source-alpha rule at level 4096 on two RGBQ pixels in 32-bit
// lanes, S in stored depth (limited already where the call limits), A each
// lane's alpha in 1/16384, D the destination: clamp(((D (16384 - A) + 8192)
// >> 14) + S), or where A is above 16384 clamp((S 16384) / A), the division
// in double precision (exact for these operands; truncation is the integer
// division's). A pixel whose A is below 1 keeps D.
LORVEX_ALWAYS_INLINE __m256i source_over2(__m256i S, __m256i A, __m256i D)
{
    const __m256i zero = _mm256_setzero_si256(), top = _mm256_set1_epi32(255), full = _mm256_set1_epi32(16384);
    const __m256i t =
        _mm256_srai_epi32(_mm256_add_epi32(_mm256_mullo_epi32(D, _mm256_sub_epi32(full, A)), _mm256_set1_epi32(8192)), 14);
    __m256i out = _mm256_add_epi32(t, S);
    const __m256i over = _mm256_cmpgt_epi32(A, full);
    if (!_mm256_testz_si256(over, over)) {
        const auto divide = [&](__m128i s, __m128i a) {
            const __m256d q = _mm256_div_pd(_mm256_cvtepi32_pd(_mm_slli_epi32(s, 14)), _mm256_cvtepi32_pd(a));
            return _mm256_cvttpd_epi32(q);
        };
        const __m256i r = _mm256_setr_m128i(divide(_mm256_castsi256_si128(S), _mm256_castsi256_si128(A)),
                                            divide(_mm256_extracti128_si256(S, 1), _mm256_extracti128_si256(A, 1)));
        out = _mm256_blendv_epi8(out, r, over);
    }
    out = _mm256_min_epi32(_mm256_max_epi32(out, zero), top);
    return _mm256_blendv_epi8(D, out, _mm256_cmpgt_epi32(A, zero));
}
#endif

template <class Units, int T>
struct BankSamplerV {
    using Dst = typename Units::Dst;
    using reg = typename Vec::reg;
    static constexpr int taps = 2 * (T + 1);
    static constexpr bool is_bank = true;
    static constexpr int L = Vec::lanes16;
    // Elements of a window and registers that hold it.
    static constexpr int kLumaWindow = Dst::pairs ? 2 * taps : 4 * taps;
    static constexpr int kLumaRegs = (kLumaWindow + L - 1) / L;
    static constexpr int kChromaWindow = Dst::pairs ? 4 * taps : 0;
    static constexpr int kChromaRegs = (kChromaWindow + L - 1) / L;
    static constexpr int kAlphaRegs = (taps + L - 1) / L;

    const int16_t* line;
    const int16_t* line_a;
    int32_t pos;
    int32_t step;
    // Per phase: luma (or RGBQ first/third) taps, RGBQ second/fourth taps,
    // chroma taps, alpha taps (contiguous).
    alignas(32) int16_t cy[16][kLumaRegs * L];
    alignas(32) int16_t cy2[Dst::pairs ? 1 : 16][kLumaRegs * L];
    alignas(32) int16_t cc[Dst::pairs ? 16 : 1][kChromaRegs > 0 ? kChromaRegs * L : 1];
    alignas(32) int16_t ca[Units::alpha ? 16 : 1][kAlphaRegs * L];
    // The planar run of 4:2:2 (AVX2): per phase, the luma and the chroma taps
    // contiguous, padded with zeros to whole 8-element chunks.
    static constexpr bool kPlanar = Dst::pairs && !Units::alpha && L == 16;
    static constexpr int kChunks = (taps + 7) / 8;
    alignas(16) int16_t py[kPlanar ? 16 : 1][kChunks * 8];
    alignas(16) int16_t pc[kPlanar ? 16 : 1][kChunks * 8];
    // The RGBQ run (AVX2) takes the window in groups of eight pixels, four to
    // a register: interleaving pixel w with pixel w + 4 puts each sample's
    // products for two taps into one 32-bit lane, in the sample's own lane
    // order. Per phase and group: the taps of the low and the high
    // interleave, (t0, t4) and (t2, t6), (t1, t5) and (t3, t7).
    static constexpr bool kQuad = !Dst::pairs && !Dst::alpha_only && L == 16;
    static constexpr int kGroups = (taps + 7) / 8;
    alignas(32) int16_t qc[kQuad ? 16 : 1][kQuad ? kGroups * 32 : 1];

    BankSamplerV(const MapContext& c, const StripRecord& s, bool)
        : line(c.line), line_a(c.line_a), pos(s.phase), step(c.hstep)
    {
        for (int p = 0; p < 16; ++p) {
            const int16_t* row = c.hbank_y + p * 16;
            if constexpr (kQuad) {
                const auto tap = [&](int k) { return k < taps ? uint16_t(row[7 - T + k]) : uint16_t(0); };
                const auto two = [&](int a, int b) { return _mm_set1_epi32(int32_t(tap(a) | uint32_t(tap(b)) << 16)); };
                __m128i* q = reinterpret_cast<__m128i*>(qc[p]);
                for (int g = 0; g < kGroups; ++g) {
                    const int w = 8 * g;
                    if (taps - w == 4) {
                        // A group of four taps: pixels w and w + 1 interleaved in
                        // the first lane, w + 2 and w + 3 in the second.
                        _mm_store_si128(q + 4 * g + 0, two(w + 0, w + 1));
                        _mm_store_si128(q + 4 * g + 1, two(w + 2, w + 3));
                        continue;
                    }
                    _mm_store_si128(q + 4 * g + 0, two(w + 0, w + 4));  // low interleave, first lane
                    _mm_store_si128(q + 4 * g + 1, two(w + 2, w + 6));  // low interleave, second lane
                    _mm_store_si128(q + 4 * g + 2, two(w + 1, w + 5));  // high interleave, first lane
                    _mm_store_si128(q + 4 * g + 3, two(w + 3, w + 7));  // high interleave, second lane
                }
            } else if constexpr (Dst::pairs) {
                __m128i y[2], ch[2];
                taps_of(row, y);
                taps_of(c.hbank_c + p * 16, ch);
                const __m128i zero = _mm_setzero_si128();
                const auto part = [&](const __m128i (&t)[2], int i) { return i < 2 ? t[i] : zero; };
                // Luma taps at the even elements: eight elements hold four taps.
                for (int j = 0; j < kLumaRegs * L / 8; ++j) {
                    const __m128i t = part(y, j / 2);
                    _mm_store_si128(reinterpret_cast<__m128i*>(cy[p] + 8 * j),
                                    j % 2 ? _mm_unpackhi_epi16(t, zero) : _mm_unpacklo_epi16(t, zero));
                }
                // Chroma taps on the Cb and Cr elements: eight elements hold two taps.
                for (int j = 0; j < kChromaRegs * L / 8; ++j) {
                    const __m128i t = part(ch, j / 4);
                    const __m128i u = j % 4 < 2 ? _mm_unpacklo_epi16(zero, t) : _mm_unpackhi_epi16(zero, t);
                    _mm_store_si128(reinterpret_cast<__m128i*>(cc[p] + 8 * j),
                                    j % 2 ? _mm_unpackhi_epi32(u, u) : _mm_unpacklo_epi32(u, u));
                }
                if constexpr (kPlanar) {
                    for (int j = 0; j < kChunks; ++j) {
                        _mm_store_si128(reinterpret_cast<__m128i*>(py[p] + 8 * j), y[j]);
                        _mm_store_si128(reinterpret_cast<__m128i*>(pc[p] + 8 * j), ch[j]);
                    }
                }
            } else {
                for (int e = 0; e < kLumaRegs * L; ++e) cy[p][e] = 0;
                for (int e = 0; e < kLumaRegs * L; ++e) cy2[p][e] = 0;
                for (int k = 0; k < taps; ++k) {
                    cy[p][4 * k] = cy[p][4 * k + 2] = row[7 - T + k];
                    cy2[p][4 * k + 1] = cy2[p][4 * k + 3] = row[7 - T + k];
                }
            }
            if constexpr (Units::alpha) {
                for (int e = 0; e < kAlphaRegs * L; ++e) ca[p][e] = 0;
                for (int k = 0; k < taps; ++k) ca[p][k] = row[7 - T + k];
            }
        }
    }

    // The taps k = 0 .. 2T + 1 of a bank row (row[7 - T + k]) in two
    // registers of eight, zero beyond the last.
    static void taps_of(const int16_t* row, __m128i (&t)[2])
    {
        const __m128i a = _mm_loadu_si128(reinterpret_cast<const __m128i*>(row));
        const __m128i b = _mm_loadu_si128(reinterpret_cast<const __m128i*>(row + 8));
        alignas(16) static constexpr int16_t keep[16] = {
            0 < taps ? -1 : 0,  1 < taps ? -1 : 0,  2 < taps ? -1 : 0,  3 < taps ? -1 : 0,
            4 < taps ? -1 : 0,  5 < taps ? -1 : 0,  6 < taps ? -1 : 0,  7 < taps ? -1 : 0,
            8 < taps ? -1 : 0,  9 < taps ? -1 : 0,  10 < taps ? -1 : 0, 11 < taps ? -1 : 0,
            12 < taps ? -1 : 0, 13 < taps ? -1 : 0, 14 < taps ? -1 : 0, 15 < taps ? -1 : 0};
        t[0] = _mm_and_si128(_mm_alignr_epi8(b, a, 2 * (7 - T)), _mm_load_si128(reinterpret_cast<const __m128i*>(keep)));
        t[1] = _mm_and_si128(_mm_srli_si128(b, 2 * (7 - T)), _mm_load_si128(reinterpret_cast<const __m128i*>(keep + 8)));
    }

    template <int N>
    static reg dot(const int16_t* window, const int16_t* coef)
    {
        reg acc = Vec::madd(Vec::load_i16(window), Vec::load_i16(coef));
        for (int r = 1; r < N; ++r) acc = Vec::add32(acc, Vec::madd(Vec::load_i16(window + r * L), Vec::load_i16(coef + r * L)));
        return acc;
    }

    static int32_t hsum(__m128i v)
    {
        v = _mm_add_epi32(v, _mm_shuffle_epi32(v, _MM_SHUFFLE(1, 0, 3, 2)));
        v = _mm_add_epi32(v, _mm_shuffle_epi32(v, _MM_SHUFFLE(2, 3, 0, 1)));
        return _mm_cvtsi128_si32(v);
    }

    void sample(Px& px, bool with_chroma, bool = false) const
    {
        constexpr int cs = Units::colour_shift;
        const int32_t i = pos >> 16, ph = (pos >> 12) & 15;
        if constexpr (Dst::pairs) {
            px.s[0] = mix_bank<cs>(hsum(fold128(dot<kLumaRegs>(line + 2 * (i - T), cy[ph]))));
            if (with_chroma) {
                const int32_t j = i >> 1;
                const int cph = (ph >> 1) + ((i & 1) ? 8 : 0);
                // Lanes alternate Cb and Cr products.
                __m128i c = fold128(dot<kChromaRegs>(line + 4 * (j - T), cc[cph]));
                c = _mm_add_epi32(c, _mm_shuffle_epi32(c, _MM_SHUFFLE(1, 0, 3, 2)));
                px.s[1] = mix_bank<cs>(_mm_cvtsi128_si32(_mm_srli_si128(c, 0)));
                px.s[2] = mix_bank<cs>(_mm_cvtsi128_si32(_mm_srli_si128(c, 4)));
            }
        } else if constexpr (kQuad) {
#if defined(LORVEX_ISA_AVX2)
            alignas(16) int32_t v[4];
            _mm_store_si128(reinterpret_cast<__m128i*>(v),
                            fold128(quad_sums(8 * (i - T), ph * int32_t(sizeof(qc[0])))));
            for (int e = 0; e < 4; ++e) px.s[e] = mix_bank<cs>(v[e]);
#endif
        } else {
            // Lanes alternate first and third samples, second and fourth.
            const int16_t* w = line + 4 * (i - T);
            __m128i a = fold128(dot<kLumaRegs>(w, cy[ph]));
            __m128i b = fold128(dot<kLumaRegs>(w, cy2[ph]));
            a = _mm_add_epi32(a, _mm_shuffle_epi32(a, _MM_SHUFFLE(1, 0, 3, 2)));
            b = _mm_add_epi32(b, _mm_shuffle_epi32(b, _MM_SHUFFLE(1, 0, 3, 2)));
            if constexpr (Dst::colour_samples == 4) {
                px.s[0] = mix_bank<cs>(_mm_cvtsi128_si32(a));
                px.s[2] = mix_bank<cs>(_mm_cvtsi128_si32(_mm_srli_si128(a, 4)));
                px.s[1] = mix_bank<cs>(_mm_cvtsi128_si32(b));
                px.s[3] = mix_bank<cs>(_mm_cvtsi128_si32(_mm_srli_si128(b, 4)));
            }
        }
        if constexpr (Units::alpha)
            px.a = mix_bank<Units::alpha_shift>(hsum(fold128(dot<kAlphaRegs>(line_a + (i - T), ca[ph]))));
    }

    // Whole-pixel runs of the source-alpha tables: the general rule (at
    // level 4096) for 4:2:2 and, with 256-bit vectors, RGBQ; the fast rule for
    // 4:2:2.
    static constexpr bool kAlphaRuns = Units::alpha && !Dst::alpha_only && Units::alpha_shift == 0;
    static constexpr bool has_general_alpha_run =
        kAlphaRuns && Units::colour_shift == Dst::buffer_shift && (Dst::pairs || kQuad);
    static constexpr bool has_fast_alpha_run = kAlphaRuns && Dst::pairs && Units::colour_shift == 0;

    int32_t general_alpha_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        if (c.level != 4096) return 0;
        if constexpr (Dst::pairs) {
            pair_alpha_run<false>(d, n, clamp);
            return n;
        } else {
#if defined(LORVEX_ISA_AVX2)
            return quad_alpha_run(d, n, clamp);
#else
            return 0;
#endif
        }
    }

    void fast_alpha_run(typename Dst::sample* d, int32_t n) { pair_alpha_run<true>(d, n, false); }

    // The colour sums of a whole 4:2:2 pair, its even pixel at sample i0 and
    // phase ph0, its odd one at i1 and ph1, in memory order [Y0 Cb Y1 Cr].
    __m128i pair_sums(int32_t i0, int32_t ph0, int32_t i1, int32_t ph1) const
    {
        const int32_t j = i0 >> 1, cph = (ph0 >> 1) + ((i0 & 1) ? 8 : 0);
        const __m128i y0 = fold128(dot<kLumaRegs>(line + 2 * (i0 - T), cy[ph0]));
        const __m128i y1 = fold128(dot<kLumaRegs>(line + 2 * (i1 - T), cy[ph1]));
        const __m128i ch = fold128(dot<kChromaRegs>(line + 4 * (j - T), cc[cph]));
        // [Y0 Y1 Cb Cr] to the order in memory, Y0 Cb Y1 Cr.
        return _mm_shuffle_epi32(reduce_pair(y0, y1, ch), _MM_SHUFFLE(3, 1, 2, 0));
    }

    // 4:2:2 whole pairs of the source-alpha tables (pair_over): colour from
    // the vector dot products, alpha of both pixels from their windows.
    template <bool Fast>
    void pair_alpha_run(typename Dst::sample* d, int32_t n, bool clamp)
    {
        constexpr int cs = Units::colour_shift;
        const __m128i round = _mm_set1_epi32(1 << (13 + cs));
        for (int32_t k = 0; k < n; ++k, d += 4) {
            const int32_t i0 = pos >> 16, ph0 = (pos >> 12) & 15;
            const int32_t p1 = pos + step, i1 = p1 >> 16, ph1 = (p1 >> 12) & 15;
            pos = p1 + step;
            const int32_t a0 = mix_bank<0>(hsum(fold128(dot<kAlphaRegs>(line_a + (i0 - T), ca[ph0]))));
            const int32_t a1 = mix_bank<0>(hsum(fold128(dot<kAlphaRegs>(line_a + (i1 - T), ca[ph1]))));
            if (a0 < 1 && a1 < 1) continue;
            pair_over<Dst, Fast>(d, _mm_srai_epi32(_mm_add_epi32(pair_sums(i0, ph0, i1, ph1), round), 14 + cs), a0, a1,
                                 clamp);
        }
    }

#if defined(LORVEX_ISA_AVX2)
    // The general source-alpha rule on whole RGBQ pixels at level 4096, eight
    // at a time: colour from the RGBQ bank sums, alpha from one multiply-add
    // over its window (at most sixteen taps) and a sum of the eight, then
    // source_over2. Returns the pixels drawn.
    int32_t quad_alpha_run(typename Dst::sample* d, int32_t n, bool clamp)
    {
        if constexpr (!kQuad || !has_general_alpha_run) {
            (void)d, (void)n, (void)clamp;
            return 0;
        } else {
            static_assert(kAlphaRegs == 1);
            constexpr int cs = Units::colour_shift;
            const __m256i round = _mm256_set1_epi32(1 << (13 + cs)), half = _mm256_set1_epi32(1 << 13);
            const __m256i zero = _mm256_setzero_si256(), top = _mm256_set1_epi32(Dst::max);
            const __m256i steps = _mm256_mullo_epi32(_mm256_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7), _mm256_set1_epi32(step));
            const __m256i fifteen = _mm256_set1_epi32(15), base = _mm256_set1_epi32(T);
            alignas(32) int32_t at[8], ph[8];
            int32_t p = pos;
            int32_t k = 0;
            for (; k + 8 <= n; k += 8, d += 32) {
                const __m256i P = _mm256_add_epi32(_mm256_set1_epi32(p), steps);
                _mm256_store_si256(reinterpret_cast<__m256i*>(at), _mm256_sub_epi32(_mm256_srai_epi32(P, 16), base));
                _mm256_store_si256(reinterpret_cast<__m256i*>(ph), _mm256_and_si256(_mm256_srai_epi32(P, 12), fifteen));
                asm volatile("" : : "r"(at), "r"(ph) : "memory");
                p += 8 * step;
                // Alpha of the eight: window sums folded to [0 1 2 3 | 4 5 6 7].
                __m256i a[8];
                for (int j = 0; j < 8; ++j)
                    a[j] = _mm256_madd_epi16(_mm256_loadu_si256(reinterpret_cast<const __m256i*>(line_a + at[j])),
                                             _mm256_load_si256(reinterpret_cast<const __m256i*>(ca[ph[j]])));
                const __m256i h0 = _mm256_hadd_epi32(_mm256_hadd_epi32(a[0], a[1]), _mm256_hadd_epi32(a[2], a[3]));
                const __m256i h1 = _mm256_hadd_epi32(_mm256_hadd_epi32(a[4], a[5]), _mm256_hadd_epi32(a[6], a[7]));
                const __m256i sums = _mm256_add_epi32(_mm256_permute2x128_si256(h0, h1, 0x20), _mm256_permute2x128_si256(h0, h1, 0x31));
                const __m256i alpha = _mm256_srai_epi32(_mm256_add_epi32(sums, half), 14);
                __m256i v[4];
                for (int q = 0; q < 4; ++q) {
                    const int32_t row = int32_t(sizeof(qc[0]));
                    const __m256i x = quad_pair_sums(8 * at[2 * q], ph[2 * q] * row, 8 * at[2 * q + 1], ph[2 * q + 1] * row);
                    __m256i S = _mm256_srai_epi32(_mm256_add_epi32(x, round), 14 + cs);
                    if (clamp) S = _mm256_min_epi32(_mm256_max_epi32(S, zero), top);
                    const __m256i A = _mm256_permutevar8x32_epi32(
                        alpha, _mm256_setr_epi32(2 * q, 2 * q, 2 * q, 2 * q, 2 * q + 1, 2 * q + 1, 2 * q + 1, 2 * q + 1));
                    const __m256i D = _mm256_cvtepu8_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(d + 8 * q)));
                    v[q] = source_over2(S, A, D);
                }
                store_rgbq8(d, v);
            }
            pos = p;
            return k;
        }
    }
#endif

    void advance() { pos += step; }

    // The whole-pixel run of the plain tables: n pairs (4:2:2) or n pixels
    // (RGBQ), each sample reduced, rounded, limited and mixed in a vector of
    // four lanes, and stored with the low bits of each result as the scalar
    // rule stores them.
    static constexpr bool has_plain_run = !Units::alpha && !Dst::alpha_only;

    static __m128i reduce_pair(__m128i y0, __m128i y1, __m128i c)
    {
        // [Y0 partial sums] [Y1 partial sums] [Cb Cr Cb Cr] -> [Y0 Y1 Cb Cr]
        const __m128i t = _mm_hadd_epi32(y0, y1);
        return _mm_hadd_epi32(t, _mm_shuffle_epi32(c, _MM_SHUFFLE(3, 1, 2, 0)));
    }

    // Luma windows of up to eight elements fit a 128-bit register.
    static constexpr bool kLumaHalf = Dst::pairs && kLumaWindow <= 8 && L > 8;

    // Partial sums of the luma whose window and taps stand at these byte
    // offsets: four 32-bit lanes, or a full register to be reduced with the
    // others.
    auto luma_dot(int32_t at, int32_t taps_at) const
    {
        const int16_t* w = byte_offset(line, at);
        const int16_t* t = byte_offset(&cy[0][0], taps_at);
        if constexpr (kLumaHalf)
            return _mm_madd_epi16(_mm_loadu_si128(reinterpret_cast<const __m128i*>(w)),
                                  _mm_load_si128(reinterpret_cast<const __m128i*>(t)));
        else
            return dot<kLumaRegs>(w, t);
    }

    static const int16_t* byte_offset(const int16_t* p, int32_t bytes)
    {
        return reinterpret_cast<const int16_t*>(reinterpret_cast<const char*>(p) + bytes);
    }

    // The partial sums of a pair reduced to [Y0 Y1 Cb Cr].
    template <class Y>
    static __m128i reduce_pair_sums(Y y0, Y y1, reg ch)
    {
#if defined(LORVEX_ISA_AVX2)
        if constexpr (sizeof(Y) == 32) {
            const __m256i t = _mm256_hadd_epi32(y0, y1);
            return fold128(_mm256_hadd_epi32(t, _mm256_shuffle_epi32(ch, _MM_SHUFFLE(3, 1, 2, 0))));
        } else
#endif
            return reduce_pair(fold128(y0), fold128(y1), fold128(ch));
    }

    // Runs of whole pairs, four at a time: the positions of a block are
    // computed together, its sums reduced pair by pair, and its samples
    // rounded, limited, mixed and stored together.
    void pair_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        using S = typename Dst::sample;
        constexpr int cs = Units::colour_shift;
        const __m128i round = _mm_set1_epi32(1 << (13 + cs));
        const __m128i top = _mm_set1_epi32(Dst::max), zero = _mm_setzero_si128();
        const __m128i low = _mm_set1_epi32(sizeof(S) == 1 ? 0xFF : 0xFFFF);
        const int32_t L = c.level;
        const __m128i lv = _mm_set1_epi32(L), inv = _mm_set1_epi32(4096 - L), half = _mm_set1_epi32(2048);
        // [Y0 Y1 Cb Cr] of four pairs back to the order in memory.
        const __m128i order8 = _mm_setr_epi8(0, 2, 1, 3, 4, 6, 5, 7, 8, 10, 9, 11, 12, 14, 13, 15);
        const __m128i order16 = _mm_setr_epi8(0, 1, 4, 5, 2, 3, 6, 7, 8, 9, 12, 13, 10, 11, 14, 15);
        const __m128i steps = _mm_mullo_epi32(_mm_setr_epi32(0, 1, 2, 3), _mm_set1_epi32(step));
        const __m128i four = _mm_set1_epi32(4 * step);
        const __m128i fifteen = _mm_set1_epi32(15), one = _mm_set1_epi32(1);
        alignas(16) int32_t luma_at[8], luma_ph[8], chroma_at[8], chroma_ph[8];
        int32_t p = pos;
        int32_t k = 0;
        for (; k + 4 <= n; k += 4, d += 16) {
            for (int h = 0; h < 2; ++h) {
                const __m128i P = _mm_add_epi32(_mm_set1_epi32(p), h ? _mm_add_epi32(steps, four) : steps);
                // Byte offsets: luma window 2(i - T) and chroma window
                // 4(j - T) in the line, phase rows in the tap tables.
                const __m128i i = _mm_srai_epi32(P, 16);
                const __m128i ph = _mm_and_si128(_mm_srai_epi32(P, 12), fifteen);
                const __m128i cph = _mm_add_epi32(_mm_srai_epi32(ph, 1), _mm_slli_epi32(_mm_and_si128(i, one), 3));
                _mm_store_si128(reinterpret_cast<__m128i*>(luma_at + 4 * h),
                                _mm_slli_epi32(_mm_sub_epi32(i, _mm_set1_epi32(T)), 2));
                _mm_store_si128(reinterpret_cast<__m128i*>(luma_ph + 4 * h),
                                _mm_mullo_epi32(ph, _mm_set1_epi32(int32_t(sizeof(cy[0])))));
                _mm_store_si128(reinterpret_cast<__m128i*>(chroma_at + 4 * h),
                                _mm_slli_epi32(_mm_sub_epi32(_mm_srai_epi32(i, 1), _mm_set1_epi32(T)), 3));
                _mm_store_si128(reinterpret_cast<__m128i*>(chroma_ph + 4 * h),
                                _mm_mullo_epi32(cph, _mm_set1_epi32(int32_t(sizeof(cc[0])))));
            }
            // The offsets are read back from memory, one load each, rather
            // than extracted lane by lane.
            asm volatile("" : : "r"(luma_at), "r"(luma_ph), "r"(chroma_at), "r"(chroma_ph) : "memory");
            p += 8 * step;
            __m128i v[4];
            for (int m = 0; m < 4; ++m) {
                const auto y0 = luma_dot(luma_at[2 * m], luma_ph[2 * m]);
                const auto y1 = luma_dot(luma_at[2 * m + 1], luma_ph[2 * m + 1]);
                const reg ch = dot<kChromaRegs>(byte_offset(line, chroma_at[2 * m]),
                                                byte_offset(&cc[0][0], chroma_ph[2 * m]));
                v[m] = _mm_srai_epi32(_mm_add_epi32(reduce_pair_sums(y0, y1, ch), round), 14 + cs);
                if (clamp) v[m] = _mm_min_epi32(_mm_max_epi32(v[m], zero), top);
                if (L != 4096) {
                    __m128i D;
                    if constexpr (sizeof(S) == 1)
                        D = _mm_cvtepu8_epi32(_mm_cvtsi32_si128(load32(d + 4 * m)));
                    else
                        D = _mm_cvtepu16_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(d + 4 * m)));
                    D = _mm_shuffle_epi32(D, _MM_SHUFFLE(3, 1, 2, 0));
                    v[m] = _mm_srai_epi32(
                        _mm_add_epi32(_mm_add_epi32(_mm_mullo_epi32(D, inv), _mm_mullo_epi32(v[m], lv)), half), 12);
                }
                v[m] = _mm_and_si128(v[m], low);  // the low bits, as the scalar rule stores them
            }
            const __m128i a = _mm_packus_epi32(v[0], v[1]), b = _mm_packus_epi32(v[2], v[3]);
            if constexpr (sizeof(S) == 1) {
                _mm_storeu_si128(reinterpret_cast<__m128i*>(d), _mm_shuffle_epi8(_mm_packus_epi16(a, b), order8));
            } else {
                _mm_storeu_si128(reinterpret_cast<__m128i*>(d), _mm_shuffle_epi8(a, order16));
                _mm_storeu_si128(reinterpret_cast<__m128i*>(d + 8), _mm_shuffle_epi8(b, order16));
            }
        }
        pos = p;
        if (k < n) single_run(c, d, n - k, clamp);
    }

#if defined(LORVEX_ISA_AVX2)
    // Runs of whole pairs with the line split into planes a chunk at a time:
    // a pair's two luma windows and its Cb and Cr windows are then 8-element
    // chunks of contiguous samples, two multiply-adds of 256 bits for up to
    // eight taps, and two pairs reduce together to the order in memory.
    void planar_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        with_run_flags(clamp, c.level, [&](auto limit, auto full) { planar_run<limit(), full()>(c, d, n); });
    }

    template <bool clamp, bool full>
    void planar_run(const MapContext& c, typename Dst::sample* d, int32_t n)
    {
        using S = typename Dst::sample;
        constexpr int cs = Units::colour_shift;
        constexpr int kCap = Planes422::kCap;
        constexpr int kRowBytes = kChunks * 16;     // bytes of a phase's taps
        constexpr int kRowShift = kChunks == 1 ? 4 : 5;
        static_assert(kChunks <= 2 && kRowBytes == 1 << kRowShift);
        // Pairs per chunk, in fours, so that the chunk's reach fits the planes.
        const int32_t per_chunk =
            int32_t((int64_t(kCap - 2 * T - 16 * kChunks - 8) << 16) / (2 * int64_t(step))) & ~3;
        if (per_chunk < 4) {
            pair_run(c, d, n, clamp);
            return;
        }
        Planes422 planes;
        int16_t* const Y = planes.Y();
        int16_t* const U = planes.U();
        int16_t* const V = planes.V();
        constexpr int32_t kToV = Planes422::kToV;

        const __m256i round = _mm256_set1_epi32(1 << (13 + cs));
        const __m256i top = _mm256_set1_epi32(Dst::max), zero = _mm256_setzero_si256();
        const __m256i low = _mm256_set1_epi32(sizeof(S) == 1 ? 0xFF : 0xFFFF);
        const int32_t L = c.level;
        const __m256i lv = _mm256_set1_epi32(L), inv = _mm256_set1_epi32(4096 - L), half = _mm256_set1_epi32(2048);
        const __m256i steps = _mm256_mullo_epi32(_mm256_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7), _mm256_set1_epi32(step));
        const __m256i fifteen = _mm256_set1_epi32(15), one = _mm256_set1_epi32(1);
        alignas(32) int32_t y_at[8], y_row[8], c_at[8], c_row[8];

        int32_t p = pos;
        while (n >= 4) {
            const int32_t m = n - (n & 3) < per_chunk ? n - (n & 3) : per_chunk;
            const int32_t i_first = p >> 16;
            const int32_t i_last = int32_t((int64_t(p) + int64_t(2 * m - 1) * step) >> 16);
            const int32_t b = 2 * ((i_first >> 1) - T);
            const int32_t luma_end = i_last - T + 8 * kChunks;
            const int32_t chroma_end = 2 * ((i_last >> 1) - T + 8 * kChunks);
            const int32_t e = luma_end > chroma_end ? luma_end + (luma_end & 1) : chroma_end;
            split_422(line, b, e - b, Y, U, V);

            const __m256i base_y = _mm256_set1_epi32(T + b), base_c = _mm256_set1_epi32(T + b / 2);
            for (int32_t k = 0; k < m; k += 4, d += 16) {
                // Byte offsets of the eight positions: luma windows in Y,
                // chroma windows in U (and V), phase rows in py and pc.
                const __m256i P = _mm256_add_epi32(_mm256_set1_epi32(p), steps);
                const __m256i i = _mm256_srai_epi32(P, 16);
                const __m256i ph = _mm256_and_si256(_mm256_srai_epi32(P, 12), fifteen);
                const __m256i cph =
                    _mm256_add_epi32(_mm256_srai_epi32(ph, 1), _mm256_slli_epi32(_mm256_and_si256(i, one), 3));
                _mm256_store_si256(reinterpret_cast<__m256i*>(y_at), _mm256_slli_epi32(_mm256_sub_epi32(i, base_y), 1));
                _mm256_store_si256(reinterpret_cast<__m256i*>(y_row), _mm256_slli_epi32(ph, kRowShift));
                _mm256_store_si256(reinterpret_cast<__m256i*>(c_at),
                                   _mm256_slli_epi32(_mm256_sub_epi32(_mm256_srai_epi32(i, 1), base_c), 1));
                _mm256_store_si256(reinterpret_cast<__m256i*>(c_row), _mm256_slli_epi32(cph, kRowShift));
                asm volatile("" : : "r"(y_at), "r"(y_row), "r"(c_at), "r"(c_row) : "memory");
                p += 8 * step;
                __m256i sums[4];
                for (int q = 0; q < 4; ++q) {
                    const int16_t* y0 = byte_offset(Y, y_at[2 * q]);
                    const int16_t* y1 = byte_offset(Y, y_at[2 * q + 1]);
                    const int16_t* t0 = byte_offset(&py[0][0], y_row[2 * q]);
                    const int16_t* t1 = byte_offset(&py[0][0], y_row[2 * q + 1]);
                    const int16_t* cb = byte_offset(U, c_at[2 * q]);
                    const int16_t* tc = byte_offset(&pc[0][0], c_row[2 * q]);
                    __m256i ys = _mm256_setzero_si256(), cs2 = _mm256_setzero_si256();
                    for (int r = 0; r < kChunks; ++r) {
                        const __m256i yw = _mm256_inserti128_si256(
                            _mm256_castsi128_si256(_mm_loadu_si128(reinterpret_cast<const __m128i*>(y0 + 8 * r))),
                            _mm_loadu_si128(reinterpret_cast<const __m128i*>(y1 + 8 * r)), 1);
                        const __m256i yt = _mm256_inserti128_si256(
                            _mm256_castsi128_si256(_mm_load_si128(reinterpret_cast<const __m128i*>(t0 + 8 * r))),
                            _mm_load_si128(reinterpret_cast<const __m128i*>(t1 + 8 * r)), 1);
                        const __m256i cw = _mm256_inserti128_si256(
                            _mm256_castsi128_si256(_mm_loadu_si128(reinterpret_cast<const __m128i*>(cb + 8 * r))),
                            _mm_loadu_si128(reinterpret_cast<const __m128i*>(byte_offset(cb, kToV) + 8 * r)), 1);
                        const __m256i ct =
                            _mm256_broadcastsi128_si256(_mm_load_si128(reinterpret_cast<const __m128i*>(tc + 8 * r)));
                        ys = _mm256_add_epi32(ys, _mm256_madd_epi16(yw, yt));
                        cs2 = _mm256_add_epi32(cs2, _mm256_madd_epi16(cw, ct));
                    }
                    // [Y0 Y0 Cb Cb | Y1 Y1 Cr Cr] partial sums
                    sums[q] = _mm256_hadd_epi32(ys, cs2);
                }
                __m256i v[2];
                for (int h = 0; h < 2; ++h) {
                    // Two pairs: [Y0 Cb Y1 Cr | Y0 Cb Y1 Cr], as in memory.
                    __m256i x = _mm256_permute4x64_epi64(_mm256_hadd_epi32(sums[2 * h], sums[2 * h + 1]), 0xD8);
                    x = _mm256_srai_epi32(_mm256_add_epi32(x, round), 14 + cs);
                    if constexpr (clamp) x = _mm256_min_epi32(_mm256_max_epi32(x, zero), top);
                    if constexpr (!full) {
                        const S* at = d + 8 * h;
                        const __m256i D =
                            sizeof(S) == 1
                                ? _mm256_cvtepu8_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(at)))
                                : _mm256_cvtepu16_epi32(_mm_loadu_si128(reinterpret_cast<const __m128i*>(at)));
                        x = _mm256_srai_epi32(
                            _mm256_add_epi32(_mm256_add_epi32(_mm256_mullo_epi32(D, inv), _mm256_mullo_epi32(x, lv)),
                                             half),
                            12);
                    }
                    v[h] = _mm256_and_si256(x, low);  // the low bits, as the scalar rule stores them
                }
                const __m256i w = _mm256_permute4x64_epi64(_mm256_packus_epi32(v[0], v[1]), 0xD8);
                if constexpr (sizeof(S) == 1)
                    _mm_storeu_si128(reinterpret_cast<__m128i*>(d),
                                     _mm_packus_epi16(_mm256_castsi256_si128(w), _mm256_extracti128_si256(w, 1)));
                else
                    _mm256_storeu_si256(reinterpret_cast<__m256i*>(d), w);
            }
            n -= m;
        }
        pos = p;
        if (n > 0) single_run(c, d, n, clamp);
    }
#endif

#if defined(LORVEX_ISA_AVX2)
    // The four sums of the RGBQ pixel whose window and taps stand at these
    // byte offsets, as two 128-bit halves of partial sums.
    __m256i quad_sums(int32_t at, int32_t row) const
    {
        const int16_t* w = byte_offset(line, at);
        const int16_t* t = byte_offset(&qc[0][0], row);
        __m256i acc = _mm256_setzero_si256();
        for (int g = 0; g < kGroups; ++g) {
            const __m256i a = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(w + 32 * g));
            if (taps - 8 * g == 4) {
                // Four taps: the samples of pixels 0 and 1 (2 and 3) interleaved
                // within their lane, one multiply-add.
                const __m256i pairs = _mm256_shuffle_epi8(
                    a, _mm256_setr_epi8(0, 1, 8, 9, 2, 3, 10, 11, 4, 5, 12, 13, 6, 7, 14, 15, 0, 1, 8, 9, 2, 3, 10, 11, 4,
                                        5, 12, 13, 6, 7, 14, 15));
                acc = _mm256_add_epi32(acc, _mm256_madd_epi16(pairs, _mm256_load_si256(reinterpret_cast<const __m256i*>(t + 32 * g))));
                continue;
            }
            const __m256i b = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(w + 32 * g + 16));
            const __m256i lo = _mm256_madd_epi16(_mm256_unpacklo_epi16(a, b),
                                                 _mm256_load_si256(reinterpret_cast<const __m256i*>(t + 32 * g)));
            const __m256i hi = _mm256_madd_epi16(_mm256_unpackhi_epi16(a, b),
                                                 _mm256_load_si256(reinterpret_cast<const __m256i*>(t + 32 * g + 16)));
            acc = _mm256_add_epi32(acc, _mm256_add_epi32(lo, hi));
        }
        return acc;
    }

    // The sums of two RGBQ pixels (windows and taps at these byte offsets) as
    // [pixel 0 | pixel 1].
    __m256i quad_pair_sums(int32_t at0, int32_t row0, int32_t at1, int32_t row1) const
    {
        const __m256i s0 = quad_sums(at0, row0), s1 = quad_sums(at1, row1);
        return _mm256_add_epi32(_mm256_permute2x128_si256(s0, s1, 0x20), _mm256_permute2x128_si256(s0, s1, 0x31));
    }

    void quad_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        with_run_flags(clamp, c.level, [&](auto limit, auto full) { quad_run<limit(), full()>(c, d, n); });
    }

    // Eight RGBQ pixels at a time: their offsets computed together, two
    // pixels' sums folded together, and the eight stored at once.
    template <bool clamp, bool full>
    void quad_run(const MapContext& c, typename Dst::sample* d, int32_t n)
    {
        constexpr int cs = Units::colour_shift;
        const __m256i round = _mm256_set1_epi32(1 << (13 + cs));
        const int32_t L = c.level;
        const __m256i steps = _mm256_mullo_epi32(_mm256_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7), _mm256_set1_epi32(step));
        const __m256i fifteen = _mm256_set1_epi32(15), base = _mm256_set1_epi32(T);
        alignas(32) int32_t at[8], row[8];
        int32_t p = pos;
        int32_t k = 0;
        for (; k + 8 <= n; k += 8, d += 32) {
            const __m256i P = _mm256_add_epi32(_mm256_set1_epi32(p), steps);
            _mm256_store_si256(reinterpret_cast<__m256i*>(at),
                               _mm256_slli_epi32(_mm256_sub_epi32(_mm256_srai_epi32(P, 16), base), 3));
            _mm256_store_si256(reinterpret_cast<__m256i*>(row),
                               _mm256_mullo_epi32(_mm256_and_si256(_mm256_srai_epi32(P, 12), fifteen),
                                                  _mm256_set1_epi32(int32_t(sizeof(qc[0])))));
            asm volatile("" : : "r"(at), "r"(row) : "memory");
            p += 8 * step;
            __m256i v[4];
            for (int q = 0; q < 4; ++q) {
                __m256i x = quad_pair_sums(at[2 * q], row[2 * q], at[2 * q + 1], row[2 * q + 1]);
                x = _mm256_srai_epi32(_mm256_add_epi32(x, round), 14 + cs);
                v[q] = whole_rgbq2<clamp, full>(x, d + 8 * q, L);
            }
            store_rgbq8(d, v);
        }
        pos = p;
        if (k < n) single_run(c, d, n - k, clamp);
    }
#endif

    void plain_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
#if defined(LORVEX_ISA_AVX2)
        if constexpr (kPlanar && kChunks <= 2) {
            planar_run(c, d, n, clamp);
            return;
        }
        if constexpr (kQuad) {
            quad_run(c, d, n, clamp);
            return;
        }
#endif
        if constexpr (Dst::pairs)
            pair_run(c, d, n, clamp);
        else
            single_run(c, d, n, clamp);
    }

    void single_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        constexpr int cs = Units::colour_shift;
        const __m128i round = _mm_set1_epi32(1 << (13 + cs));
        const __m128i top = _mm_set1_epi32(Dst::max);
        const __m128i zero = _mm_setzero_si128();
        const int32_t L = c.level;
        const __m128i lv = _mm_set1_epi32(L), inv = _mm_set1_epi32(4096 - L), half = _mm_set1_epi32(2048);
        // Low byte or low word of each 32-bit lane, in lane order.
        const __m128i pick = sizeof(typename Dst::sample) == 1
                                 ? _mm_setr_epi8(0, 4, 8, 12, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1)
                                 : _mm_setr_epi8(0, 1, 4, 5, 8, 9, 12, 13, -1, -1, -1, -1, -1, -1, -1, -1);
        for (int32_t k = 0; k < n; ++k) {
            __m128i v;
            if constexpr (Dst::pairs) {
                const int32_t p1 = pos + step;
                v = pair_sums(pos >> 16, (pos >> 12) & 15, p1 >> 16, (p1 >> 12) & 15);
                pos = p1 + step;
            } else if constexpr (kQuad) {
#if defined(LORVEX_ISA_AVX2)
                const int32_t i = pos >> 16, ph = (pos >> 12) & 15;
                v = fold128(quad_sums(8 * (i - T), ph * int32_t(sizeof(qc[0]))));
                pos += step;
#endif
            } else {
                const int32_t i = pos >> 16, ph = (pos >> 12) & 15;
                const int16_t* w = line + 4 * (i - T);
                const __m128i a = fold128(dot<kLumaRegs>(w, cy[ph]));   // first, third
                const __m128i b = fold128(dot<kLumaRegs>(w, cy2[ph]));  // second, fourth
                const __m128i a2 = _mm_add_epi32(a, _mm_shuffle_epi32(a, _MM_SHUFFLE(1, 0, 3, 2)));
                const __m128i b2 = _mm_add_epi32(b, _mm_shuffle_epi32(b, _MM_SHUFFLE(1, 0, 3, 2)));
                v = _mm_unpacklo_epi32(a2, b2);
                pos += step;
            }
            v = _mm_srai_epi32(_mm_add_epi32(v, round), 14 + cs);
            if (clamp) v = _mm_min_epi32(_mm_max_epi32(v, zero), top);
            if (L != 4096) {
                __m128i D;
                if constexpr (sizeof(typename Dst::sample) == 1)
                    D = _mm_cvtepu8_epi32(_mm_cvtsi32_si128(load32(d)));
                else
                    D = _mm_cvtepu16_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(d)));
                v = _mm_srai_epi32(_mm_add_epi32(_mm_add_epi32(_mm_mullo_epi32(D, inv), _mm_mullo_epi32(v, lv)), half), 12);
            }
            const __m128i out = _mm_shuffle_epi8(v, pick);
            if constexpr (sizeof(typename Dst::sample) == 1)
                store32(d, _mm_cvtsi128_si32(out));
            else
                _mm_storel_epi64(reinterpret_cast<__m128i*>(d), out);
            d += 4;
        }
    }
};

// The area sampler with a vector run for the plain tables at full level, where
// the buffer samples and the destination pixels line up one to one (a step of
// exactly one pixel, the walk at the start of a sample, and in 4:2:2 the
// chroma walk at the start of the pair): each destination sample is then its
// buffer element rounded to stored depth, (x + 16) >> 5 or (x + 4) >> 3, and
// a run is a straight conversion of consecutive elements. Any other run takes
// the scalar walk.
template <class Units>
struct AreaSamplerV : AreaSampler<Units> {
    using Base = AreaSampler<Units>;
    using Dst = typename Units::Dst;
    using Base::Base;
    static constexpr bool has_plain_run = !Units::alpha && !Dst::alpha_only;

    bool aligned() const
    {
        if (this->w != 0x10000 || this->r != 0x10000) return false;
        if constexpr (Dst::pairs) return this->r2 == 0x20000 && 2 * this->p2 == this->p;
        return true;
    }

    // n whole pairs (4:2:2) or pairs of pixels (RGBQ): the area walk's run.
    void plain_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        using T = typename Dst::sample;
        constexpr int E = Dst::pairs ? 2 : 4;
        if (c.level == 4096 && aligned()) {
            const int32_t count = 2 * E * n;  // elements of n pairs of pixels
            const int16_t* in = this->line + E * this->p;
            const __m128i half = _mm_set1_epi16(int16_t(1 << (Dst::buffer_shift - 1)));
            int32_t e = 0;
#if defined(LORVEX_ISA_AVX2)
            const __m256i half2 = _mm256_set1_epi16(int16_t(1 << (Dst::buffer_shift - 1)));
            const __m256i near_top = _mm256_set1_epi16(int16_t(32767 - 16));
            for (; e + 16 <= count; e += 16) {
                const __m256i x = _mm256_loadu_si256((const __m256i*)(in + e));
                if (!_mm256_testz_si256(_mm256_cmpgt_epi16(x, near_top), _mm256_cmpgt_epi16(x, near_top))) break;
                const __m256i v = _mm256_srai_epi16(_mm256_add_epi16(x, half2), Dst::buffer_shift);
                if constexpr (sizeof(T) == 1) {
                    const __m256i m = clamp ? v : _mm256_and_si256(v, _mm256_set1_epi16(0xFF));
                    const __m128i b = _mm_packus_epi16(_mm256_castsi256_si128(m), _mm256_extracti128_si256(m, 1));
                    _mm_storeu_si128((__m128i*)(d + e), b);
                } else {
                    const __m256i w = clamp ? _mm256_min_epi16(_mm256_max_epi16(v, _mm256_setzero_si256()),
                                                               _mm256_set1_epi16(int16_t(Dst::max)))
                                            : v;
                    _mm256_storeu_si256((__m256i*)(d + e), w);
                }
            }
#endif
            for (; e + 8 <= count; e += 8) {
                const __m128i v = _mm_srai_epi16(_mm_adds_epi16(_mm_loadu_si128((const __m128i*)(in + e)), half),
                                                 Dst::buffer_shift);
                if (!exact_add(in + e)) break;
                if constexpr (sizeof(T) == 1) {
                    const __m128i b = clamp ? _mm_packus_epi16(v, v)
                                            : _mm_packus_epi16(_mm_and_si128(v, _mm_set1_epi16(0xFF)), v);
                    _mm_storel_epi64((__m128i*)(d + e), b);
                } else {
                    const __m128i w = clamp ? _mm_min_epi16(_mm_max_epi16(v, _mm_setzero_si128()),
                                                            _mm_set1_epi16(int16_t(Dst::max)))
                                            : v;
                    _mm_storeu_si128((__m128i*)(d + e), w);
                }
            }
            for (; e < count; ++e) {
                const int32_t v = mix1<Dst::buffer_shift>(in[e]);
                d[e] = T(clamp ? clamp_to(v, 0, Dst::max) : v);
            }
            this->p += 2 * n;
            if constexpr (Dst::pairs) this->p2 += n;
            return;
        }
        generic_run(c, d, n, clamp);
    }

    // The saturating add above is exact unless an element is within the
    // rounding term of the i16 limit.
    static bool exact_add(const int16_t* in)
    {
        const __m128i v = _mm_loadu_si128((const __m128i*)in);
        return _mm_movemask_epi8(_mm_cmpgt_epi16(v, _mm_set1_epi16(int16_t(32767 - 16)))) == 0;
    }

    // Consumes `span` of width from the walk (p, r): whole samples while they
    // end inside the span, then the part of the next one, calling add(sample,
    // width) for each. The same steps as the walk of sample_area.h, without
    // its shortcuts.
    template <class Add>
    static void walk_span(int32_t& p, int32_t& r, int32_t w, int32_t span, Add&& add)
    {
        while (r < span) {
            add(p, r);
            span -= r;
            ++p;
            r = w;
        }
        add(p, span);
        r -= span;
        if (r == 0) {
            ++p;
            r = w;
        }
    }

    // N components at base[p E + e C] summed into acc in 64 bits.
    template <int N, int E, int C>
    static void consume(const int16_t* base, int32_t& p, int32_t& r, int32_t w, int32_t span, int64_t acc[N])
    {
        walk_span(p, r, w, span, [&](int32_t at, int32_t n) {
            for (int e = 0; e < N; ++e) acc[e] += int64_t(base[at * E + e * C]) * n;
        });
    }

    // The four samples of an RGBQ pixel walked together in 64-bit lanes (a
    // sample times a width needs 32 bits, their sum more): the same sums as
    // consume<4, 4, 1>, shifted right by `shift` to 32-bit results.
    static void consume_quad(const int16_t* line, int32_t& p, int32_t& r, int32_t w, int64_t bias, int shift,
                             int32_t out[4])
    {
#if defined(LORVEX_ISA_AVX2)
        // In double precision, which holds these integer sums exactly (a
        // sample times a width is below 2^31, a span's sum below 2^48), and
        // where scaling by a power of two and flooring is the arithmetic
        // shift.
        __m256d acc = _mm256_set1_pd(double(bias));
        const auto add = [&](int32_t at, int32_t n) {
            const __m128i s = _mm_cvtepi16_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(line + 4 * at)));
            acc = _mm256_add_pd(acc, _mm256_mul_pd(_mm256_cvtepi32_pd(s), _mm256_set1_pd(double(n))));
        };
        walk_span(p, r, w, 0x10000, add);
        const __m256d scaled = _mm256_floor_pd(_mm256_mul_pd(acc, _mm256_set1_pd(1.0 / double(int64_t(1) << shift))));
        _mm_storeu_si128(reinterpret_cast<__m128i*>(out), _mm256_cvtpd_epi32(scaled));
#else
        __m128i lo = _mm_set1_epi64x(bias), hi = lo;  // samples 0, 1 and 2, 3
        const auto add = [&](int32_t at, int32_t n) {
            const __m128i s = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(line + 4 * at));
            const __m128i nv = _mm_set1_epi64x(n);
            lo = _mm_add_epi64(lo, _mm_mul_epi32(_mm_cvtepi16_epi64(s), nv));
            hi = _mm_add_epi64(hi, _mm_mul_epi32(_mm_cvtepi16_epi64(_mm_srli_si128(s, 4)), nv));
        };
        walk_span(p, r, w, 0x10000, add);
        // The results fit 32 bits: the low half of a logical shift is the
        // arithmetic one's.
        const __m128i sl = _mm_srl_epi64(lo, _mm_cvtsi32_si128(shift));
        const __m128i sh = _mm_srl_epi64(hi, _mm_cvtsi32_si128(shift));
        out[0] = _mm_cvtsi128_si32(sl);
        out[1] = _mm_extract_epi32(sl, 2);
        out[2] = _mm_cvtsi128_si32(sh);
        out[3] = _mm_extract_epi32(sh, 2);
#endif
    }

#if defined(LORVEX_ISA_AVX2)
    // RGBQ at reductions up to 2, where a pixel's span of 0x10000 meets at
    // most three samples of the walk. From the walk's state (p, r), pixel j
    // of the run begins U = (w - r) + j 0x10000 from the start of sample p; its
    // first sample is q = U / w (in double precision, exact for these
    // operands), and it takes n0 = min((q + 1) w, U + 0x10000) - U of sample
    // q, n1 of q + 1 and n2 of q + 2, the parts of its span inside them - the
    // widths the walk would hand out. As the widths sum to 0x10000, the sum
    // of products fits 32 bits and rounds as ((x >> cs) + 2^15) >> 16. Eight
    // pixels at a time; returns the pixels drawn, and moves the walk past them.
    template <bool clamp, bool full>
    int32_t quad_area_run(const MapContext& c, typename Dst::sample* d, int32_t pixels)
    {
        constexpr int cs = Units::colour_shift;
        const int32_t w = this->w;
        if (w < 0x8000 || this->r <= 0 || this->r > w || pixels < 8) return 0;
        const __m256i round = _mm256_set1_epi32(1 << 15);
        const int16_t* base = this->line + 4 * this->p;
        alignas(32) int32_t at[8];
        int32_t u0 = w - this->r;
        Spans spans(u0, 0x10000, w, 0x10000, {0, 1, 2, 3, 4, 5, 6, 7});
        int32_t k = 0;
        for (; k + 8 <= pixels; k += 8, d += 32, u0 += 8 * 0x10000, spans.next()) {
            const Widths v = spans.widths();
            _mm256_store_si256(reinterpret_cast<__m256i*>(at), _mm256_slli_epi32(v.q, 2));
            __m256i out[4];
            for (int m = 0; m < 4; ++m) {
                const int16_t* a = base + at[2 * m];
                const int16_t* b = base + at[2 * m + 1];
                const __m256i pick =
                    _mm256_setr_epi32(2 * m, 2 * m, 2 * m, 2 * m, 2 * m + 1, 2 * m + 1, 2 * m + 1, 2 * m + 1);
                const __m256i two = _mm256_inserti128_si256(
                    _mm256_castsi128_si256(_mm_loadu_si128(reinterpret_cast<const __m128i*>(a))),
                    _mm_loadu_si128(reinterpret_cast<const __m128i*>(b)), 1);
                const __m128i third = _mm_castpd_si128(_mm_loadh_pd(
                    _mm_castsi128_pd(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(a + 8))),
                    reinterpret_cast<const double*>(b + 8)));
                const __m256i s0 = _mm256_srai_epi32(_mm256_unpacklo_epi16(two, two), 16);
                const __m256i s1 = _mm256_srai_epi32(_mm256_unpackhi_epi16(two, two), 16);
                const __m256i s2 = _mm256_cvtepi16_epi32(third);
                const __m256i x = _mm256_add_epi32(
                    _mm256_add_epi32(_mm256_mullo_epi32(s0, _mm256_permutevar8x32_epi32(v.n0, pick)),
                                     _mm256_mullo_epi32(s1, _mm256_permutevar8x32_epi32(v.n1, pick))),
                    _mm256_mullo_epi32(s2, _mm256_permutevar8x32_epi32(v.n2, pick)));
                const __m256i y = _mm256_srai_epi32(_mm256_add_epi32(_mm256_srai_epi32(x, cs), round), 16);
                out[m] = whole_rgbq2<clamp, full>(y, d + 8 * m, c.level);
            }
            store_rgbq8(d, out);
        }
        // The walk after the run: u0 is where the next pixel begins.
        this->p += u0 / w;
        this->r = w - u0 % w;
        return k;
    }
#endif

#if defined(LORVEX_ISA_AVX2)
    // quad_area_run in 16-bit lanes, at level 4096, for 8-bit RGBQ whose
    // line elements stay within +-16383 (those of every vertical filter
    // without overshoot). As n0 = 0x10000 - n1 - n2 (n0 at least 1, so n1
    // and n2 below 0x10000), x = s0 0x10000 + d1 n1 + d2 n2 with
    // d = s - s0; each d n is 0x10000 H + l with H its high product (signed
    // d, unsigned n: the signed one plus d where n's top bit is set) and l
    // its low half, and x rounds to (s0 + H1 + H2 + c + 2^(cs - 1)) >> cs,
    // c the carry of l1 + l2: what is left below 0x10000 cannot reach the
    // result. Returns the pixels drawn, a multiple of eight.
    template <bool clamp>
    int32_t quad_area_run16(typename Dst::sample* d, int32_t pixels)
    {
        constexpr int cs = Units::colour_shift;
        if constexpr (cs < 1 || cs > 14 || sizeof(typename Dst::sample) != 1) {
            (void)d, (void)pixels;
            return 0;
        } else {
            const int32_t w = this->w;
            if (w < 0x8000 || this->r <= 0 || this->r > w || pixels < 8) return 0;
            const int32_t m = pixels & ~7;
            int32_t u0 = w - this->r;
            const int32_t q_last = int32_t((int64_t(u0) + int64_t(m - 1) * 0x10000) / w);
            if (!within(this->line, 4 * this->p, 4 * (this->p + q_last + 3), -16384, 16383)) return 0;
            const int16_t* base = this->line + 4 * this->p;
            const __m256i round = _mm256_set1_epi16(int16_t((1 << (cs - 1)) + 1));  // + 1: c is 1 + (no carry ? -1 : 0)
            const __m256i ones = _mm256_set1_epi16(-1);
            Spans spans(u0, 0x10000, w, 0x10000, {0, 1, 2, 3, 4, 5, 6, 7});
            alignas(32) int32_t at[8];
            if (w >= 0x10000) {
                // Magnification: a pixel meets two samples at most (n2 is 0),
                // and the sum is the interpolation of lerp4_16 at n1.
                for (int32_t k = 0; k < m; k += 8, d += 32, spans.next()) {
                    const Widths v = spans.widths();
                    _mm256_store_si256(reinterpret_cast<__m256i*>(at), _mm256_slli_epi32(v.q, 2));
                    asm volatile("" : : "r"(at) : "memory");
                    const __m256i n1 = twice16(v.n1);
                    store_rgbq8_16<clamp>(d, lerp4_16<cs>(base, at, spread4(n1, 0)), lerp4_16<cs>(base, at + 4, spread4(n1, 1)));
                }
            } else {
                for (int32_t k = 0; k < m; k += 8, d += 32, spans.next()) {
                    const Widths v = spans.widths();
                    _mm256_store_si256(reinterpret_cast<__m256i*>(at), _mm256_slli_epi32(v.q, 2));
                    asm volatile("" : : "r"(at) : "memory");
                    const __m256i n1 = twice16(v.n1), n2 = twice16(v.n2);
                    __m256i g[2];
                    for (int q = 0; q < 2; ++q) {
                        const int32_t* a = at + 4 * q;
                        const auto two = [&](int x, int y, int e) {
                            return _mm256_inserti128_si256(
                                _mm256_castsi128_si256(_mm_loadu_si128(reinterpret_cast<const __m128i*>(base + a[x] + e))),
                                _mm_loadu_si128(reinterpret_cast<const __m128i*>(base + a[y] + e)), 1);
                        };
                        // Pixels [0 1 | 2 3] of the four: their samples q, q + 1 and q + 2.
                        const __m256i X = two(0, 2, 0), Y = two(1, 3, 0), Z = two(0, 2, 8), W = two(1, 3, 8);
                        const __m256i s0 = _mm256_unpacklo_epi64(X, Y), s1 = _mm256_unpackhi_epi64(X, Y);
                        const __m256i s2 = _mm256_unpacklo_epi64(Z, W);
                        const __m256i d1 = _mm256_sub_epi16(s1, s0), d2 = _mm256_sub_epi16(s2, s0);
                        const __m256i N1 = spread4(n1, q), N2 = spread4(n2, q);
                        const __m256i h1 = _mm256_add_epi16(_mm256_mulhi_epi16(d1, N1), _mm256_and_si256(d1, _mm256_srai_epi16(N1, 15)));
                        const __m256i h2 = _mm256_add_epi16(_mm256_mulhi_epi16(d2, N2), _mm256_and_si256(d2, _mm256_srai_epi16(N2, 15)));
                        const __m256i l1 = _mm256_mullo_epi16(d1, N1), nl2 = _mm256_xor_si256(_mm256_mullo_epi16(d2, N2), ones);
                        const __m256i no_carry = _mm256_cmpeq_epi16(_mm256_max_epu16(l1, nl2), nl2);  // l1 <= ~l2
                        const __m256i sum = _mm256_add_epi16(_mm256_add_epi16(_mm256_add_epi16(s0, h1), _mm256_add_epi16(h2, no_carry)), round);
                        g[q] = _mm256_srai_epi16(sum, cs);
                    }
                    store_rgbq8_16<clamp>(d, g[0], g[1]);
                }
            }
            u0 += m * 0x10000;
            this->p += u0 / w;
            this->r = w - u0 % w;
            return m;
        }
    }
#endif

#if defined(LORVEX_ISA_AVX2)
    // The first sample q and the widths n0, n1, n2 that spans [U, U + span)
    // take of samples q, q + 1, q + 2 of a walk whose samples are W wide
    // (U from the start of the walk's current sample; span <= 2 W).
    struct Widths {
        __m256i q, n0, n1, n2;
    };
    // Eight spans, lane j beginning at U0 + j step, moved on by eight spans
    // a time. Each lane keeps its first sample q and where the span starts in
    // it, rem = U - q W (0 <= rem < W), so that a move is an add and at most
    // one carry: no division after the first eight.
    struct Spans {
        __m256i q, rem, W, W1, A, B;
        int32_t span;
        Spans(int32_t U0, int32_t step, int32_t W_, int32_t span_, const int32_t (&lane)[8]) : span(span_)
        {
            alignas(32) int32_t q0[8], r0[8];
            for (int j = 0; j < 8; ++j) {
                const int32_t u = U0 + lane[j] * step;
                q0[j] = u / W_;
                r0[j] = u % W_;
            }
            q = _mm256_load_si256(reinterpret_cast<const __m256i*>(q0));
            rem = _mm256_load_si256(reinterpret_cast<const __m256i*>(r0));
            W = _mm256_set1_epi32(W_);
            W1 = _mm256_set1_epi32(W_ - 1);
            A = _mm256_set1_epi32(8 * step / W_);
            B = _mm256_set1_epi32(8 * step % W_);
        }
        Widths widths() const
        {
            const __m256i zero = _mm256_setzero_si256(), sv = _mm256_set1_epi32(span);
            const __m256i e0 = _mm256_sub_epi32(W, rem), e1 = _mm256_add_epi32(e0, W);
            return {q, _mm256_min_epi32(e0, sv), _mm256_max_epi32(_mm256_sub_epi32(_mm256_min_epi32(e1, sv), e0), zero),
                    _mm256_max_epi32(_mm256_sub_epi32(sv, e1), zero)};
        }
        void next()
        {
            rem = _mm256_add_epi32(rem, B);
            const __m256i carry = _mm256_cmpgt_epi32(rem, W1);
            rem = _mm256_sub_epi32(rem, _mm256_and_si256(carry, W));
            q = _mm256_sub_epi32(_mm256_add_epi32(q, A), carry);
        }
    };

    // The weighted sum of samples q, q + 1, q + 2 of a plane, each lane from
    // base[lane] (a 32-bit read gives a sample and the next).
    static __m256i weigh3(const int16_t* base, __m256i index, const Widths& v)
    {
        const __m256i g = _mm256_i32gather_epi32(reinterpret_cast<const int*>(base), _mm256_add_epi32(index, v.q), 2);
        const __m256i h = _mm256_i32gather_epi32(reinterpret_cast<const int*>(base),
                                                 _mm256_add_epi32(_mm256_add_epi32(index, v.q), _mm256_set1_epi32(2)), 2);
        const __m256i s0 = _mm256_srai_epi32(_mm256_slli_epi32(g, 16), 16), s1 = _mm256_srai_epi32(g, 16);
        const __m256i s2 = _mm256_srai_epi32(_mm256_slli_epi32(h, 16), 16);
        return _mm256_add_epi32(_mm256_add_epi32(_mm256_mullo_epi32(s0, v.n0), _mm256_mullo_epi32(s1, v.n1)),
                                _mm256_mullo_epi32(s2, v.n2));
    }

    // 4:2:2 at reductions up to 2, in closed form as the RGBQ run, with the
    // line split into planes a chunk at a time. Luma spans of 0x10000 over
    // samples w wide, chroma spans of 0x20000 over samples 2w wide, each by
    // its own walk. A luma sum fits 32 bits for any samples; a chroma sum
    // (widths adding up to 0x20000) when the chunk's chroma stays within
    // +-2^14, as every picture's does - a chunk beyond takes the scalar walk.
    // Four pairs at a time; returns the pairs drawn.
    template <bool clamp, bool full>
    int32_t pair_area_run(const MapContext& c, typename Dst::sample* d, int32_t n)
    {
        using S = typename Dst::sample;
        constexpr int cs = Units::colour_shift;
        constexpr int kCap = Planes422::kCap;
        const int32_t w = this->w, w2 = 2 * w;
        if (w < 0x8000 || this->r <= 0 || this->r > w || this->r2 <= 0 || this->r2 > w2 || n < 4) return 0;
        Planes422 planes;
        int16_t* const Y = planes.Y();
        int16_t* const U = planes.U();
        int16_t* const V = planes.V();
        const __m256i top = _mm256_set1_epi32(Dst::max), zero = _mm256_setzero_si256();
        const __m256i low = _mm256_set1_epi32(sizeof(S) == 1 ? 0xFF : 0xFFFF);
        const int32_t L = c.level;
        const __m256i lv = _mm256_set1_epi32(L), inv = _mm256_set1_epi32(4096 - L), half = _mm256_set1_epi32(2048);
        const __m256i chroma_order = _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7);
        // Pairs per chunk, in fours: 2m luma spans reach at most 4m + 3 samples.
        constexpr int32_t kPerChunk = ((kCap - 16) / 4) & ~3;
        int32_t done = 0;
        while (n - done >= 4) {
            const int32_t m = std::min((n - done) & ~3, kPerChunk);
            const int32_t u0 = w - this->r, v0 = w2 - this->r2;
            const int32_t p = this->p, p2 = this->p2;
            const int32_t y_last = p + (u0 + 2 * m * 0x10000) / w + 3;
            const int32_t c_last = p2 + (v0 + m * 0x20000) / w2 + 3;
            const int32_t b = std::min(p & ~1, 2 * p2);
            int32_t e = std::max(y_last, 2 * c_last + 2);
            e += e & 1;
            if (e - b > kCap) break;
            split_422(this->line, b, e - b, Y, U, V);
            // The chroma sums fit 32 bits for samples within +-2^14.
            __m256i lo = _mm256_set1_epi16(-16384), hi = _mm256_set1_epi16(16383), bad = _mm256_setzero_si256();
            const int32_t pairs_split = (e - b) / 2;
            int32_t k = 0;
            for (; k + 16 <= pairs_split; k += 16) {
                const __m256i a = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(U + k));
                const __m256i z = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(V + k));
                bad = _mm256_or_si256(bad, _mm256_or_si256(_mm256_or_si256(_mm256_cmpgt_epi16(lo, a), _mm256_cmpgt_epi16(a, hi)),
                                                           _mm256_or_si256(_mm256_cmpgt_epi16(lo, z), _mm256_cmpgt_epi16(z, hi))));
            }
            bool outside = !_mm256_testz_si256(bad, bad);
            for (; k < pairs_split; ++k) outside |= U[k] < -16384 || U[k] > 16383 || V[k] < -16384 || V[k] > 16383;
            if (outside) break;
            const int16_t* ybase = Y + (p - b);
            const int16_t* cbase = U + (p2 - b / 2);
            const __m256i cindex = _mm256_setr_epi32(0, 0, 0, 0, int32_t(V - U), int32_t(V - U), int32_t(V - U), int32_t(V - U));
            Spans luma(u0, 0x10000, w, 0x10000, {0, 1, 2, 3, 4, 5, 6, 7});
            Spans chroma(v0, 0x20000 / 2, w2, 0x20000, {0, 2, 4, 6, 0, 2, 4, 6});
            for (k = 0; k < m; k += 4, d += 16, luma.next(), chroma.next()) {
                const Widths yv = luma.widths();
                const Widths cv = chroma.widths();
                const __m256i ys = weigh3(ybase, zero, yv);
                const __m256i ch = weigh3(cbase, cindex, cv);
                // Luma (x + 2^(15 + cs)) >> (16 + cs), chroma (x + 2^(16 + cs)) >> (17 + cs).
                const __m256i Yv = _mm256_srai_epi32(_mm256_add_epi32(_mm256_srai_epi32(ys, cs), _mm256_set1_epi32(1 << 15)), 16);
                const __m256i Cv = _mm256_permutevar8x32_epi32(
                    _mm256_srai_epi32(_mm256_add_epi32(_mm256_srai_epi32(ch, cs), _mm256_set1_epi32(1 << 16)), 17),
                    chroma_order);
                // [pair 0 | pair 2] and [pair 1 | pair 3], each Y0 Cb Y1 Cr.
                __m256i v[2] = {_mm256_unpacklo_epi32(Yv, Cv), _mm256_unpackhi_epi32(Yv, Cv)};
                __m256i D[2];
                if constexpr (!full) {
                    const __m256i d01 = sizeof(S) == 1 ? _mm256_cvtepu8_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(d)))
                                                       : _mm256_cvtepu16_epi32(_mm_loadu_si128(reinterpret_cast<const __m128i*>(d)));
                    const __m256i d23 =
                        sizeof(S) == 1 ? _mm256_cvtepu8_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(d + 8)))
                                       : _mm256_cvtepu16_epi32(_mm_loadu_si128(reinterpret_cast<const __m128i*>(d + 8)));
                    D[0] = _mm256_permute2x128_si256(d01, d23, 0x20);
                    D[1] = _mm256_permute2x128_si256(d01, d23, 0x31);
                }
                for (int h = 0; h < 2; ++h) {
                    if constexpr (clamp) v[h] = _mm256_min_epi32(_mm256_max_epi32(v[h], zero), top);
                    if constexpr (!full)
                        v[h] = _mm256_srai_epi32(
                            _mm256_add_epi32(_mm256_add_epi32(_mm256_mullo_epi32(D[h], inv), _mm256_mullo_epi32(v[h], lv)),
                                             half),
                            12);
                    v[h] = _mm256_and_si256(v[h], low);  // the low bits, as the scalar rule stores them
                }
                // [pair 0, pair 1 | pair 2, pair 3] in 16 bits.
                const __m256i w16 = _mm256_packus_epi32(v[0], v[1]);
                if constexpr (sizeof(S) == 1)
                    _mm_storeu_si128(reinterpret_cast<__m128i*>(d),
                                     _mm_packus_epi16(_mm256_castsi256_si128(w16), _mm256_extracti128_si256(w16, 1)));
                else
                    _mm256_storeu_si256(reinterpret_cast<__m256i*>(d), w16);
            }
            // Both walks past the chunk.
            const int32_t u_end = u0 + 2 * m * 0x10000, v_end = v0 + m * 0x20000;
            this->p += u_end / w;
            this->r = w - u_end % w;
            this->p2 += v_end / w2;
            this->r2 = w2 - v_end % w2;
            done += m;
        }
        return done;
    }
#endif

#if defined(LORVEX_ISA_AVX2)
    // 4:2:2 at magnification (samples w >= 0x10000 wide) and level 4096: a
    // luma span meets two samples at most, and so does a chroma span of
    // 0x20000 over samples 2w wide, so that each output is the interpolation
    // of pairs8_16 at the width n1 it takes of the second sample. Eight pairs
    // at a time from split planes, for chunks whose elements stay within
    // +-16000. Returns the pairs drawn.
    template <bool clamp>
    int32_t pair_area_mag16(typename Dst::sample* d, int32_t n)
    {
        constexpr int cs = Units::colour_shift;
        constexpr int32_t kCap = Planes422::kCap;
        if constexpr (cs < 1 || cs > 14) {
            (void)d, (void)n;
            return 0;
        } else {
            const int32_t w = this->w, w2 = 2 * w;
            if (w < 0x10000 || this->r <= 0 || this->r > w || this->r2 <= 0 || this->r2 > w2 || n < 8) return 0;
            Planes422 planes;
            int16_t* const Y = planes.Y();
            int16_t* const U = planes.U();
            int16_t* const V = planes.V();
            constexpr int32_t kPerChunk = ((kCap - 16) / 2) & ~7;  // two luma samples a pair at most
            const __m256i low = _mm256_set1_epi32(0xFFFF);
            constexpr int32_t kLanes[8] = {0, 1, 2, 3, 4, 5, 6, 7};
            int32_t done = 0;
            while (n - done >= 8) {
                const int32_t m = std::min((n - done) & ~7, kPerChunk);
                const int32_t u0 = w - this->r, v0 = w2 - this->r2;
                const int32_t p = this->p, p2 = this->p2;
                const int32_t y_last = p + int32_t((int64_t(u0) + int64_t(2 * m) * 0x10000) / w) + 1;
                const int32_t c_last = p2 + int32_t((int64_t(v0) + int64_t(m) * 0x20000) / w2) + 1;
                const int32_t b = std::min(p & ~1, 2 * p2);
                int32_t e = std::max(y_last + 1, 2 * c_last + 2);
                e += e & 1;
                if (e - b > kCap || !within(this->line, 2 * b, 2 * e, -16000, 16000)) break;
                split_422(this->line, b, e - b, Y, U, V);
                const __m256i ybase = _mm256_set1_epi32(p - b), cbase = _mm256_set1_epi32(p2 - b / 2);
                Spans luma(u0, 0x10000, w, 0x10000, kLanes), chroma(v0, 0x20000, w2, 0x20000, kLanes);
                for (int32_t k = 0; k < m; k += 8, d += 32) {
                    const Widths y0 = luma.widths();
                    luma.next();
                    const Widths y1 = luma.widths();
                    luma.next();
                    const Widths cw = chroma.widths();
                    chroma.next();
                    pairs8_16<Dst, cs, clamp>(d, Y, U, V, _mm256_add_epi32(y0.q, ybase), y0.n1, _mm256_add_epi32(y1.q, ybase),
                                              y1.n1, _mm256_add_epi32(cw.q, cbase), _mm256_srli_epi32(cw.n1, 16),
                                              _mm256_and_si256(cw.n1, low));
                }
                // Both walks past the chunk.
                const int32_t u_end = u0 + 2 * m * 0x10000, v_end = v0 + m * 0x20000;
                this->p += u_end / w;
                this->r = w - u_end % w;
                this->p2 += v_end / w2;
                this->r2 = w2 - v_end % w2;
                done += m;
            }
            return done;
        }
    }
#endif

    void generic_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        using T = typename Dst::sample;
        constexpr int cs = Units::colour_shift;
        constexpr int64_t b16 = int64_t(1) << (15 + cs), b17 = int64_t(1) << (16 + cs);
        const int32_t L = c.level;
        const auto put = [&](T* at, int64_t acc, int shift) { put_whole<Dst>(at, int32_t(acc >> shift), clamp, L); };
        const int32_t w = this->w;
        const auto one_pair = [&] {
            int64_t y0[1] = {b16}, y1[1] = {b16}, ch[2] = {b17, b17};
            consume<1, 2, 1>(this->line, this->p, this->r, w, 0x10000, y0);
            consume<2, 4, 2>(this->line + 1, this->p2, this->r2, 2 * w, 0x20000, ch);
            consume<1, 2, 1>(this->line, this->p, this->r, w, 0x10000, y1);
            put(d, y0[0], 16 + cs);
            put(d + 1, ch[0], 17 + cs);
            put(d + 2, y1[0], 16 + cs);
            put(d + 3, ch[1], 17 + cs);
            d += 4;  // a pair's four samples
        };
#if defined(LORVEX_ISA_AVX2)
        if constexpr (Dst::pairs) {
            // A pair or two by the walk itself bring a chroma walk that starts
            // with a longer first sample in step; then the closed form.
            for (int tries = 0; tries < 4 && n >= 4 && w >= 0x8000; ++tries) {
                if (this->r > 0 && this->r <= w && this->r2 > 0 && this->r2 <= 2 * w) {
                    if (L == 4096) {
                        const int32_t fast = clamp ? pair_area_mag16<true>(d, n) : pair_area_mag16<false>(d, n);
                        d += 4 * fast;
                        n -= fast;
                    }
                    const int32_t done = with_run_flags(
                        clamp, L, [&](auto limit, auto full) { return pair_area_run<limit(), full()>(c, d, n); });
                    d += 4 * done;
                    n -= done;
                    break;
                }
                one_pair();
                --n;
            }
        }
        if constexpr (!Dst::pairs && Dst::colour_samples == 4) {
            if (L == 4096) {
                const int32_t fast = clamp ? quad_area_run16<true>(d, 2 * n) : quad_area_run16<false>(d, 2 * n);
                d += 4 * fast;
                n -= fast / 2;
            }
            const int32_t pixels = 2 * n;
            const int32_t done = with_run_flags(
                clamp, L, [&](auto limit, auto full) { return quad_area_run<limit(), full()>(c, d, pixels); });
            d += 4 * done;
            n -= done / 2;
        }
#endif
        for (int32_t k = 0; k < n; ++k) {
            if constexpr (Dst::pairs) {
                one_pair();
            } else {
                for (int half = 0; half < 2; ++half) {
                    int32_t v[4];
                    consume_quad(this->line, this->p, this->r, w, b16, 16 + cs, v);
                    for (int e = 0; e < 4; ++e) put_whole<Dst>(d + 4 * half + e, v[e], clamp, L);
                }
                d += 8;
            }
        }
    }
};

// The linear sampler with runs of whole pixels for the plain tables: RGBQ
// interpolates the four samples of a pixel in 64-bit vector lanes (a sample
// times a 16-bit fraction and the sum of two such need more than 32 bits),
// 4:2:2 computes a pair's four samples straight into the destination; both
// with the rounding of the scalar rule.
template <class Units>
struct LinearSamplerV : LinearSampler<Units> {
    using Base = LinearSampler<Units>;
    using Dst = typename Units::Dst;
    using Base::Base;
    static constexpr bool has_plain_run = !Units::alpha && !Dst::alpha_only;
    static constexpr bool has_fast_alpha_run =
        Units::alpha && Units::colour_shift == 0 && Units::alpha_shift == 0 && !Dst::alpha_only;

    // The four samples of the pixel at pos, in 64-bit lanes, shifted right by
    // `shift` (the low halves of the lanes hold the results).
    __m128i lerp4(int32_t i, int32_t f, __m128i bias, __m128i shift) const
    {
        const __m128i a = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(this->line + 4 * i));
        const __m128i b = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(this->line + 4 * i + 4));
        const __m128i wa = _mm_set1_epi64x(0x10000 - f), wb = _mm_set1_epi64x(f);
        const auto lerp = [&](__m128i x, __m128i y) {
            const __m128i s = _mm_add_epi64(
                _mm_add_epi64(_mm_mul_epi32(_mm_cvtepi16_epi64(x), wa), _mm_mul_epi32(_mm_cvtepi16_epi64(y), wb)), bias);
            return _mm_srl_epi64(s, shift);
        };
        const __m128i lo = lerp(a, b), hi = lerp(_mm_srli_si128(a, 4), _mm_srli_si128(b, 4));
        return _mm_castps_si128(_mm_shuffle_ps(_mm_castsi128_ps(lo), _mm_castsi128_ps(hi), _MM_SHUFFLE(2, 0, 2, 0)));
    }

    static constexpr bool has_general_alpha_run =
        Units::alpha && Units::alpha_shift == 0 && !Dst::alpha_only && Units::colour_shift == Dst::buffer_shift;

#if defined(LORVEX_ISA_AVX2)
    // The four samples of the RGBQ pixels at positions p0 and p1, in 32-bit
    // lanes [first | second]: x = L(4i + e)(0x10000 - f) + L(4i + 4 + e) f
    // fits 32 bits for any 16-bit samples (the products may wrap on the way,
    // the sum does not), and (x + 2^(15 + cs)) >> (16 + cs) is taken as
    // ((x >> cs) + 2^15) >> 16, the same floor without overflow.
    template <int cs>
    __m256i colour2(int32_t at0, int32_t at1, __m256i f) const
    {
        const __m256i w = _mm256_inserti128_si256(
            _mm256_castsi128_si256(_mm_loadu_si128(reinterpret_cast<const __m128i*>(this->line + at0))),
            _mm_loadu_si128(reinterpret_cast<const __m128i*>(this->line + at1)), 1);
        const __m256i a = _mm256_srai_epi32(_mm256_unpacklo_epi16(w, w), 16);
        const __m256i b = _mm256_srai_epi32(_mm256_unpackhi_epi16(w, w), 16);
        return lerp_lanes<cs>(a, b, f);
    }

    // (a (0x10000 - f) + b f + 2^(15 + cs)) >> (16 + cs), lane by lane.
    template <int cs>
    static __m256i lerp_lanes(__m256i a, __m256i b, __m256i f)
    {
        const __m256i x = _mm256_add_epi32(_mm256_slli_epi32(a, 16), _mm256_mullo_epi32(_mm256_sub_epi32(b, a), f));
        return _mm256_srai_epi32(_mm256_add_epi32(_mm256_srai_epi32(x, cs), _mm256_set1_epi32(1 << 15)), 16);
    }

    // Whole RGBQ pixels of the source-alpha tables, eight at a time, two to a
    // register. Fast: colour in buffer units, D = (S13 + ((D m) >> 9) + 16) >> 5
    // with m = 16384 - A, stored with its low bits; nothing written where A is
    // below 1. General, at level 4096: S in stored depth (limited when
    // `clamp`), then source_over2. Returns the pixels drawn, a multiple of
    // eight.
    template <bool Fast>
    int32_t alpha_run8(typename Dst::sample* d, int32_t n, bool clamp)
    {
        constexpr int cs = Fast ? 0 : Dst::buffer_shift;
        const __m256i zero = _mm256_setzero_si256(), top = _mm256_set1_epi32(Dst::max);
        const __m256i full = _mm256_set1_epi32(16384), one = _mm256_set1_epi32(1);
        int32_t p = this->pos;
        const int32_t step = this->step;
        const __m256i steps = _mm256_mullo_epi32(_mm256_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7), _mm256_set1_epi32(step));
        alignas(32) int32_t at[8];
        int32_t k = 0;
        for (; k + 8 <= n; k += 8, d += 32) {
            // Positions, fractions and the alpha of the eight pixels: each
            // alpha pair a(i), a(i + 1) is one 32-bit load.
            const __m256i P = _mm256_add_epi32(_mm256_set1_epi32(p), steps);
            const __m256i i = _mm256_srai_epi32(P, 16), f = _mm256_and_si256(P, _mm256_set1_epi32(0xFFFF));
            _mm256_store_si256(reinterpret_cast<__m256i*>(at), _mm256_slli_epi32(i, 2));
            const __m256i g = _mm256_i32gather_epi32(reinterpret_cast<const int*>(this->line_a), i, 2);
            const __m256i alpha =
                lerp_lanes<0>(_mm256_srai_epi32(_mm256_slli_epi32(g, 16), 16), _mm256_srai_epi32(g, 16), f);
            p += 8 * step;
            __m256i v[4];
            for (int q = 0; q < 4; ++q) {
                const __m256i pick = _mm256_setr_epi32(2 * q, 2 * q, 2 * q, 2 * q, 2 * q + 1, 2 * q + 1, 2 * q + 1, 2 * q + 1);
                __m256i S = colour2<cs>(at[2 * q], at[2 * q + 1], _mm256_permutevar8x32_epi32(f, pick));
                const __m256i A = _mm256_permutevar8x32_epi32(alpha, pick);
                const __m256i D = _mm256_cvtepu8_epi32(_mm_loadl_epi64(reinterpret_cast<const __m128i*>(d + 8 * q)));
                if constexpr (Fast) {
                    const __m256i t = _mm256_srai_epi32(_mm256_mullo_epi32(D, _mm256_sub_epi32(full, A)), 9);
                    __m256i out = _mm256_srai_epi32(_mm256_add_epi32(_mm256_add_epi32(S, t), _mm256_set1_epi32(16)), 5);
                    out = _mm256_and_si256(out, _mm256_set1_epi32(0xFF));
                    // A below 1: the destination stays.
                    v[q] = _mm256_blendv_epi8(D, out, _mm256_cmpgt_epi32(A, _mm256_sub_epi32(one, one)));
                } else {
                    if (clamp) S = _mm256_min_epi32(_mm256_max_epi32(S, zero), top);
                    v[q] = source_over2(S, A, D);
                }
            }
            store_rgbq8(d, v);
        }
        this->pos = p;
        return k;
    }
#endif

#if defined(LORVEX_ISA_AVX2)
    // The general rule of alpha_run8 in 16-bit lanes, for lines whose colour
    // elements stay within +-16383: S from lerp4_16, A in 32-bit lanes as
    // before (it lies between two alpha elements, so it fits 16 bits),
    // (D (16384 - A) + 8192) >> 14 as the rounding high product of 2 D and
    // 16384 - A, which is the same floor (16384 - A may wrap only where A is
    // below 1, whose pixels keep D). Stops before the first eight pixels with
    // an alpha above 16384 (their division takes alpha_run8). Returns the
    // pixels drawn, a multiple of eight.
    template <bool clamp>
    int32_t alpha_run16(typename Dst::sample* d, int32_t n)
    {
        constexpr int cs = Dst::buffer_shift;
        const __m256i zero = _mm256_setzero_si256(), top = _mm256_set1_epi16(int16_t(Dst::max));
        const __m256i steps = _mm256_mullo_epi32(_mm256_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7), _mm256_set1_epi32(this->step));
        int32_t p = this->pos;
        const bool near = this->step >= 0 && this->step <= 0x12000;  // eight positions within nine samples
        alignas(32) int32_t at[8];
        int32_t k = 0;
        for (; k + 8 <= n; k += 8, d += 32) {
            const __m256i P = _mm256_add_epi32(_mm256_set1_epi32(p), steps);
            const __m256i i = _mm256_srai_epi32(P, 16), f = _mm256_and_si256(P, _mm256_set1_epi32(0xFFFF));
            const __m256i g = near ? near_pairs(this->line_a, p >> 16, i)
                                   : _mm256_i32gather_epi32(reinterpret_cast<const int*>(this->line_a), i, 2);
            const __m256i alpha =
                lerp_lanes<0>(_mm256_srai_epi32(_mm256_slli_epi32(g, 16), 16), _mm256_srai_epi32(g, 16), f);
            const __m256i over = _mm256_cmpgt_epi32(alpha, _mm256_set1_epi32(16384));
            if (!_mm256_testz_si256(over, over)) break;
            _mm256_store_si256(reinterpret_cast<__m256i*>(at), _mm256_slli_epi32(i, 2));
            asm volatile("" : : "r"(at) : "memory");
            p += 8 * this->step;
            const __m256i f2 = twice16(f), a2 = twice16(alpha);
            __m256i v[2];
            for (int q = 0; q < 2; ++q) {
                __m256i S = lerp4_16<cs>(this->line, at + 4 * q, spread4(f2, q));
                if constexpr (clamp) S = _mm256_min_epi16(_mm256_max_epi16(S, zero), top);
                const __m256i A = spread4(a2, q);
                const __m256i D = _mm256_cvtepu8_epi16(_mm_loadu_si128(reinterpret_cast<const __m128i*>(d + 16 * q)));
                const __m256i t = _mm256_mulhrs_epi16(_mm256_add_epi16(D, D), _mm256_sub_epi16(_mm256_set1_epi16(16384), A));
                const __m256i out = _mm256_min_epi16(_mm256_max_epi16(_mm256_add_epi16(t, S), zero), top);
                // A below 1: the destination stays.
                v[q] = _mm256_blendv_epi8(D, out, _mm256_cmpgt_epi16(A, zero));
            }
            store_rgbq8_16<true>(d, v[0], v[1]);
        }
        this->pos = p;
        return k;
    }
#endif

    // The general source-alpha rule on whole RGBQ pixels at level 4096; other
    // levels, and what is left of a run, take the walk's own loop. Lines
    // within the limits of alpha_run16 take it, with alpha_run8 for the
    // eights that overshoot.
    int32_t general_alpha_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        if constexpr (Dst::pairs) {
            if (c.level != 4096) return 0;
            pair_alpha_run<false>(d, n, clamp);
            return n;
        }
#if defined(LORVEX_ISA_AVX2)
        if constexpr (has_general_alpha_run && !Dst::pairs) {
            if (c.level != 4096) return 0;
            const int32_t m = n & ~7;
            if (m == 0) return 0;
            if (!colour_within_14_bits(m)) return alpha_run8<false>(d, n, clamp);
            int32_t done = 0;
            while (done < m) {
                done += clamp ? alpha_run16<true>(d + 4 * done, m - done) : alpha_run16<false>(d + 4 * done, m - done);
                if (done < m) done += alpha_run8<false>(d + 4 * done, 8, clamp);
            }
            return done;
        }
#endif
        (void)c, (void)d, (void)n, (void)clamp;
        return 0;
    }

    // The fast source-alpha rule on n whole RGBQ pixels: colour in buffer
    // units, D = (S13 + ((D m) >> 9) + 16) >> 5 with m = 16384 - A, nothing
    // written where A is below 1.
    // Source alpha at a position, in 1/16384.
    int32_t alpha_at(int32_t p) const
    {
        const int32_t i = p >> 16, f = p & 0xFFFF;
        return int32_t((int64_t(this->line_a[i]) * (0x10000 - f) + int64_t(this->line_a[i + 1]) * f + 32768) >> 16);
    }

    // 4:2:2 whole pairs of the source-alpha tables (pair_over), each sample
    // and alpha interpolated as the scalar sampler does.
    template <bool Fast>
    void pair_alpha_run(typename Dst::sample* d, int32_t n, bool clamp)
    {
        for (int32_t k = 0; k < n; ++k, d += 4) {
            const int32_t p0 = this->pos, p1 = p0 + this->step;
            this->pos = p1 + this->step;
            const int32_t a0 = alpha_at(p0), a1 = alpha_at(p1);
            if (a0 < 1 && a1 < 1) continue;
            alignas(16) int32_t v[4];
            pair_samples(p0, p1, v);
            pair_over<Dst, Fast>(d, _mm_load_si128(reinterpret_cast<const __m128i*>(v)), a0, a1, clamp);
        }
    }

    void fast_alpha_run(typename Dst::sample* d, int32_t n)
    {
        if constexpr (Dst::pairs) {
            pair_alpha_run<true>(d, n, false);
            return;
        }
#if defined(LORVEX_ISA_AVX2)
        if constexpr (has_fast_alpha_run && !Dst::pairs) {
            const int32_t done = alpha_run8<true>(d, n, false);
            d += 4 * done;
            n -= done;
        }
#endif
        const __m128i bias = _mm_set1_epi64x(32768), shift = _mm_cvtsi32_si128(16);
        const __m128i sixteen = _mm_set1_epi32(16);
        for (int32_t k = 0; k < n; ++k, d += 4) {
            const int32_t i = this->pos >> 16, f = this->pos & 0xFFFF;
            this->pos += this->step;
            const int32_t A = int32_t((int64_t(this->line_a[i]) * (0x10000 - f) + int64_t(this->line_a[i + 1]) * f + 32768) >> 16);
            if (A < 1) continue;
            const __m128i s13 = lerp4(i, f, bias, shift);
            const __m128i D = _mm_cvtepu8_epi32(_mm_cvtsi32_si128(load32(d)));
            const __m128i t = _mm_srai_epi32(_mm_mullo_epi32(D, _mm_set1_epi32(16384 - A)), 9);
            const __m128i v = _mm_srai_epi32(_mm_add_epi32(_mm_add_epi32(s13, t), sixteen), 5);
            store32(d, _mm_cvtsi128_si32(_mm_shuffle_epi8(v, _mm_setr_epi8(0, 4, 8, 12, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1))));
        }
    }

    void plain_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        if constexpr (Dst::pairs)
            pair_run(c, d, n, clamp);
        else
            quad_run(c, d, n, clamp);
    }

#if defined(LORVEX_ISA_AVX2)
    // Whole 4:2:2 pairs at magnification and level 4096, eight at a time
    // (pairs8_16) from the line split into planes a chunk at a time, for
    // chunks whose elements stay within +-16000: luma output t at position
    // p + t step, the chroma of a pair at its first luma position (between
    // pairs j and j + 1 with h the parity of that luma sample). Returns the
    // pairs drawn.
    template <bool clamp>
    int32_t pair_run16(typename Dst::sample* d, int32_t n)
    {
        constexpr int cs = Units::colour_shift;
        constexpr int32_t kCap = Planes422::kCap;
        if constexpr (cs < 1 || cs > 14) {
            (void)d, (void)n;
            return 0;
        } else {
            const int32_t step = this->step;
            if (step <= 0 || step > 0x10000 || n < 8) return 0;
            Planes422 planes;
            int16_t* const Y = planes.Y();
            int16_t* const U = planes.U();
            int16_t* const V = planes.V();
            constexpr int32_t kPerChunk = ((kCap - 8) / 2) & ~7;  // two luma samples a pair at most, and the next
            const __m256i t8 = _mm256_mullo_epi32(_mm256_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7), _mm256_set1_epi32(step));
            const __m256i low = _mm256_set1_epi32(0xFFFF), one = _mm256_set1_epi32(1);
            int32_t done = 0;
            while (n - done >= 8) {
                const int32_t m = std::min((n - done) & ~7, kPerChunk);
                const int32_t p0 = this->pos;
                const int32_t b = (p0 >> 16) & ~1;
                const int32_t i_last = int32_t((int64_t(p0) + int64_t(2 * m - 1) * step) >> 16);
                const int32_t e = (i_last & ~1) + 4;  // luma i_last + 1, chroma of pair i_last / 2 + 1
                if (e - b > kCap || !within(this->line, 2 * b, 2 * e, -16000, 16000)) break;
                split_422(this->line, b, e - b, Y, U, V);
                int32_t p = p0 - (b << 16);  // positions within the planes
                for (int32_t k = 0; k < m; k += 8, d += 32, p += 16 * step) {
                    const __m256i P0 = _mm256_add_epi32(_mm256_set1_epi32(p), t8);
                    const __m256i P1 = _mm256_add_epi32(_mm256_set1_epi32(p + 8 * step), t8);
                    // Chroma at each pair's first luma position.
                    const __m256i Pe = _mm256_add_epi32(_mm256_set1_epi32(p), _mm256_add_epi32(t8, t8));
                    const __m256i ie = _mm256_srai_epi32(Pe, 16);
                    pairs8_16<Dst, cs, clamp>(d, Y, U, V, _mm256_srai_epi32(P0, 16), _mm256_and_si256(P0, low),
                                              _mm256_srai_epi32(P1, 16), _mm256_and_si256(P1, low), _mm256_srai_epi32(ie, 1),
                                              _mm256_and_si256(ie, one), _mm256_and_si256(Pe, low));
                }
                this->pos = p0 + 2 * m * step;
                done += m;
            }
            return done;
        }
    }
#endif

    // 4:2:2: the two lumas and the pair's chroma of each pair, straight into
    // the destination by the whole-pixel rule.
    void pair_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        using T = typename Dst::sample;
        const int32_t L = c.level;
#if defined(LORVEX_ISA_AVX2)
        if (L == 4096) {
            const int32_t fast = clamp ? pair_run16<true>(d, n) : pair_run16<false>(d, n);
            d += 4 * fast;
            n -= fast;
        }
#endif
        const auto put = [&](T* at, int32_t v) { put_whole<Dst>(at, v, clamp, L); };
        for (int32_t k = 0; k < n; ++k, d += 4) {
            const int32_t p0 = this->pos, p1 = p0 + this->step;
            this->pos = p1 + this->step;
            int32_t v[4];
            pair_samples(p0, p1, v);
            for (int e = 0; e < 4; ++e) put(d + e, v[e]);
        }
    }

    // The samples of a whole 4:2:2 pair, its even pixel at p0 and its odd one
    // at p1, in memory order Y0 Cb Y1 Cr: the chroma between pairs j and j + 1
    // with 17-bit weights from the even pixel's position.
    void pair_samples(int32_t p0, int32_t p1, int32_t (&v)[4]) const
    {
        constexpr int cs = Units::colour_shift;
        const int16_t* line = this->line;
        const int32_t i = p0 >> 16, f = p0 & 0xFFFF, i1 = p1 >> 16, f1 = p1 & 0xFFFF;
        const int32_t j = i >> 1;
        const int32_t w0 = (i & 1) ? 0x10000 - f : 0x20000 - f, w1 = (i & 1) ? 0x10000 + f : f;
        v[0] = mix_w16<cs>(int64_t(line[2 * i]) * (0x10000 - f) + int64_t(line[2 * i + 2]) * f);
        v[1] = mix_w17<cs>(int64_t(line[4 * j + 1]) * w0 + int64_t(line[4 * j + 5]) * w1);
        v[2] = mix_w16<cs>(int64_t(line[2 * i1]) * (0x10000 - f1) + int64_t(line[2 * i1 + 2]) * f1);
        v[3] = mix_w17<cs>(int64_t(line[4 * j + 3]) * w0 + int64_t(line[4 * j + 7]) * w1);
    }

#if defined(LORVEX_ISA_AVX2)
    // Eight whole RGBQ pixels at a time by the plain rule, two to a register,
    // interpolated in 32-bit lanes as colour2 does. Returns the pixels drawn.
    template <bool clamp, bool full>
    int32_t quad_run8(const MapContext& c, typename Dst::sample* d, int32_t n)
    {
        constexpr int cs = Units::colour_shift;
        int32_t p = this->pos;
        const int32_t step = this->step;
        const __m256i steps = _mm256_mullo_epi32(_mm256_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7), _mm256_set1_epi32(step));
        alignas(32) int32_t at[8];
        int32_t k = 0;
        for (; k + 8 <= n; k += 8, d += 32) {
            const __m256i P = _mm256_add_epi32(_mm256_set1_epi32(p), steps);
            const __m256i f = _mm256_and_si256(P, _mm256_set1_epi32(0xFFFF));
            _mm256_store_si256(reinterpret_cast<__m256i*>(at), _mm256_slli_epi32(_mm256_srai_epi32(P, 16), 2));
            p += 8 * step;
            __m256i v[4];
            for (int q = 0; q < 4; ++q) {
                const __m256i pick = _mm256_setr_epi32(2 * q, 2 * q, 2 * q, 2 * q, 2 * q + 1, 2 * q + 1, 2 * q + 1, 2 * q + 1);
                const __m256i S = colour2<cs>(at[2 * q], at[2 * q + 1], _mm256_permutevar8x32_epi32(f, pick));
                v[q] = whole_rgbq2<clamp, full>(S, d + 8 * q, c.level);
            }
            store_rgbq8(d, v);
        }
        this->pos = p;
        return k;
    }
#endif

#if defined(LORVEX_ISA_AVX2)
    // Eight whole 8-bit RGBQ pixels at a time in 16-bit lanes (lerp4_16), at
    // level 4096, for lines whose elements stay within +-16383 (those of
    // every vertical filter without overshoot; others take quad_run8).
    // Returns the pixels drawn.
    template <bool clamp>
    int32_t quad_run16(typename Dst::sample* d, int32_t n)
    {
        constexpr int cs = Units::colour_shift;
        if constexpr (cs < 1 || cs > 15 || sizeof(typename Dst::sample) != 1) {
            (void)d, (void)n;
            return 0;
        } else {
            const int32_t m = n & ~7;
            if (m == 0 || !colour_within_14_bits(m)) return 0;
            int32_t p = this->pos;
            const __m256i steps = _mm256_mullo_epi32(_mm256_setr_epi32(0, 1, 2, 3, 4, 5, 6, 7), _mm256_set1_epi32(this->step));
            alignas(32) int32_t at[8];
            for (int32_t k = 0; k < m; k += 8, d += 32) {
                const __m256i P = _mm256_add_epi32(_mm256_set1_epi32(p), steps);
                const __m256i f2 = twice16(P);
                _mm256_store_si256(reinterpret_cast<__m256i*>(at), _mm256_slli_epi32(_mm256_srai_epi32(P, 16), 2));
                asm volatile("" : : "r"(at) : "memory");
                p += 8 * this->step;
                store_rgbq8_16<clamp>(d, lerp4_16<cs>(this->line, at, spread4(f2, 0)),
                                      lerp4_16<cs>(this->line, at + 4, spread4(f2, 1)));
            }
            this->pos = p;
            return m;
        }
    }

    // Whether the colour elements the next m pixels read (those of their
    // pixel and the next) lie within +-16383.
    bool colour_within_14_bits(int32_t m) const
    {
        if (m <= 0 || this->step <= 0) return false;
        const int32_t i_first = this->pos >> 16;
        const int32_t i_last = int32_t((int64_t(this->pos) + int64_t(m - 1) * this->step) >> 16);
        return within(this->line, 4 * i_first, 4 * i_last + 8, -16384, 16383);
    }
#endif

    void quad_run(const MapContext& c, typename Dst::sample* d, int32_t n, bool clamp)
    {
        using T = typename Dst::sample;
        constexpr int cs = Units::colour_shift;
#if defined(LORVEX_ISA_AVX2)
        if (c.level == 4096) {
            const int32_t fast = clamp ? quad_run16<true>(d, n) : quad_run16<false>(d, n);
            d += 4 * fast;
            n -= fast;
        }
        const int32_t done =
            with_run_flags(clamp, c.level, [&](auto limit, auto full) { return quad_run8<limit(), full()>(c, d, n); });
        d += 4 * done;
        n -= done;
#endif
        const __m128i bias = _mm_set1_epi64x(int64_t(1) << (15 + cs));
        const __m128i shift = _mm_cvtsi32_si128(16 + cs);
        const __m128i top = _mm_set1_epi32(Dst::max), zero = _mm_setzero_si128();
        const int32_t L = c.level;
        const __m128i lv = _mm_set1_epi32(L), inv = _mm_set1_epi32(4096 - L), half = _mm_set1_epi32(2048);
        for (int32_t k = 0; k < n; ++k, d += 4) {
            const int32_t i = this->pos >> 16, f = this->pos & 0xFFFF;
            this->pos += this->step;
            const __m128i a = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(this->line + 4 * i));
            const __m128i b = _mm_loadl_epi64(reinterpret_cast<const __m128i*>(this->line + 4 * i + 4));
            const __m128i wa = _mm_set1_epi64x(0x10000 - f), wb = _mm_set1_epi64x(f);
            const auto lerp = [&](__m128i x, __m128i y) {
                const __m128i s = _mm_add_epi64(_mm_add_epi64(_mm_mul_epi32(_mm_cvtepi16_epi64(x), wa),
                                                              _mm_mul_epi32(_mm_cvtepi16_epi64(y), wb)),
                                                bias);
                return _mm_srl_epi64(s, shift);  // low halves are the arithmetic shift's
            };
            const __m128i lo = lerp(a, b), hi = lerp(_mm_srli_si128(a, 4), _mm_srli_si128(b, 4));
            __m128i v = _mm_castps_si128(
                _mm_shuffle_ps(_mm_castsi128_ps(lo), _mm_castsi128_ps(hi), _MM_SHUFFLE(2, 0, 2, 0)));
            if (clamp) v = _mm_min_epi32(_mm_max_epi32(v, zero), top);
            if (L != 4096) {
                const __m128i D = _mm_cvtepu8_epi32(_mm_cvtsi32_si128(load32(d)));
                v = _mm_srai_epi32(_mm_add_epi32(_mm_add_epi32(_mm_mullo_epi32(D, inv), _mm_mullo_epi32(v, lv)), half), 12);
            }
            const __m128i out = _mm_shuffle_epi8(v, _mm_setr_epi8(0, 4, 8, 12, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1, -1));
            static_assert(sizeof(T) == 1);
            store32(d, _mm_cvtsi128_si32(out));
        }
    }
};

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
