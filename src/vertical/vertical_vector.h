// Vector forms of the vertical kernels, one template for both vector widths
// (Vec of shared/vec.h). Each gives the same bytes as its scalar twin in
// vertical_kernels.h / straight_kernels.h: the element loop runs a register of
// elements at a time with 16-bit multiply-add into 32-bit lanes, the same
// truncating shift and the same saturation, and hands the last elements that
// do not fill a register to the scalar form of the same kernel. Loads stay
// within the elements the scalar form reads.
//
// 16-bit sample lanes hold bytes, 10-bit words and alpha words as signed
// values: words must stay below 32768, as every legal sample does.
#pragma once

#include "shared/vec.h"
#include "vertical/straight_kernels.h"
#include "vertical/vertical_kernels.h"

namespace lorvex::vertical {
inline namespace LORVEX_ISA_NAMESPACE {

template <class Src>
inline typename Vec::reg load_samples(const uint8_t* line, int32_t e)
{
    if constexpr (sizeof(typename Src::sample) == 1)
        return Vec::load_u8(line + e);
    else
        return Vec::load_u16(reinterpret_cast<const uint16_t*>(line) + e);
}

// The scalar kernel run over elements [from, count) of the strip: the part
// the vector loop left. The scalar kernels take a whole strip, so the tail is
// expressed as the same strip with its range cut, which is exact because every
// element is computed by itself.
template <class Src>
inline StripRecord tail_strip(const StripRecord& s, int32_t from_element)
{
    constexpr int E = Src::elements_per_pixel;
    // Tails start on a whole pixel (vector lanes are a multiple of E); in pairs
    // the range's end was already rounded up to even, so it stays whole too.
    StripRecord t = s;
    const int32_t px = from_element / E;
    t.src_first = s.src_first + px;
    t.pad_left = s.pad_left + px;
    return t;
}

// Weighted sum of n lines with 16-bit weights w[k] (pairs of lines at a time),
// a register of elements starting at element e of the source lines.
template <class Src, int N>
inline typename Vec::reg weighted(const uint8_t* const* rows, const int32_t* pair_coef, int32_t e)
{
    using V = Vec;
    typename V::reg lo = V::zero(), hi = V::zero();
    for (int k = 0; k < N; k += 2) {
        const typename V::reg a = load_samples<Src>(rows[k], e), b = load_samples<Src>(rows[k + 1], e);
        const typename V::reg c = V::set1_32(pair_coef[k / 2]);
        lo = V::add32(lo, V::madd(V::unpack_lo16(a, b), c));
        hi = V::add32(hi, V::madd(V::unpack_hi16(a, b), c));
    }
    return V::packs32(V::srai32(lo, Src::sum_shift), V::srai32(hi, Src::sum_shift));
}

inline int32_t coef_pair(int32_t c0, int32_t c1)
{
    return int32_t((uint32_t(uint16_t(c1)) << 16) | uint16_t(c0));
}

// Slots 6..21: 2T taps by stride or through the pointer array.
template <class Src, int T, bool ByPointer>
void bank_V(const MapContext& ctx, const StripRecord& s)
{
    const Span<Src> sp(ctx, s);
    const LineSet& lines = src_lines<Src>(ctx);
    const int32_t stride = src_stride<Src>(ctx);
    const int16_t* row = ctx.vbank + ctx.vphase * 16;
    const uint8_t* rows[2 * T];
    int32_t coef[T];
    for (int k = 1 - T; k <= T; ++k)
        rows[k + T - 1] = ByPointer ? lines[k] : lines[0] + ptrdiff_t(stride) * k;
    for (int m = 0; m < T; ++m) coef[m] = coef_pair(row[7 + 1 - T + 2 * m], row[7 + 2 - T + 2 * m]);
    int32_t e = 0;
    for (; e + Vec::lanes16 <= sp.count; e += Vec::lanes16)
        Vec::store_i16(sp.out + e, weighted<Src, 2 * T>(rows, coef, sp.first + e));
    if (e < sp.count) bank_C<Src, T, ByPointer>(ctx, tail_strip<Src>(s, e));
}

// Slots 2 and 3: one line into buffer units.
template <class Src>
void one_line_V(const MapContext& ctx, const StripRecord& s)
{
    const Span<Src> sp(ctx, s);
    const uint8_t* line = src_lines<Src>(ctx)[0];
    int32_t e = 0;
    for (; e + Vec::lanes16 <= sp.count; e += Vec::lanes16)
        Vec::store_i16(sp.out + e, Vec::slli16(load_samples<Src>(line, sp.first + e), Src::buffer_shift));
    if (e < sp.count) one_line_C<Src>(ctx, tail_strip<Src>(s, e));
}

// Slot 5: two lines with weights 16384 - w and w.
template <class Src>
void linear_V(const MapContext& ctx, const StripRecord& s)
{
    const int32_t w = ctx.vphase >> 2;
    if (w == 0) {
        one_line_V<Src>(ctx, s);
        return;
    }
    const Span<Src> sp(ctx, s);
    const LineSet& lines = src_lines<Src>(ctx);
    const uint8_t* rows[2] = {lines[0], lines[0] + src_stride<Src>(ctx)};
    const int32_t coef[1] = {coef_pair(16384 - w, w)};
    int32_t e = 0;
    for (; e + Vec::lanes16 <= sp.count; e += Vec::lanes16)
        Vec::store_i16(sp.out + e, weighted<Src, 2>(rows, coef, sp.first + e));
    if (e < sp.count) linear_C<Src>(ctx, tail_strip<Src>(s, e));
}

// Slot 4: the box. The middle lines are summed in 16-bit lanes while that sum
// fits, else in 32-bit lanes; then one multiply each.
template <class Src>
void box_V(const MapContext& ctx, const StripRecord& s)
{
    using V = Vec;
    const int32_t mid = ctx.box_mid, wl = ctx.box_last;
    if (mid == 0 && wl == 0) {
        one_line_V<Src>(ctx, s);
        return;
    }
    const Span<Src> sp(ctx, s);
    const LineSet& lines = src_lines<Src>(ctx);
    const int32_t stride = src_stride<Src>(ctx);
    const uint8_t* l0 = lines[0];
    const uint8_t* llast = lines[0] + ptrdiff_t(stride) * (mid + 1);
    const typename V::reg c_first_last = V::set1_32(coef_pair(ctx.box_first, wl));
    int32_t e = 0;
    if (mid == 0) {
        for (; e + V::lanes16 <= sp.count; e += V::lanes16) {
            const typename V::reg a = load_samples<Src>(l0, sp.first + e), b = load_samples<Src>(llast, sp.first + e);
            const typename V::reg lo = V::madd(V::unpack_lo16(a, b), c_first_last);
            const typename V::reg hi = V::madd(V::unpack_hi16(a, b), c_first_last);
            V::store_i16(sp.out + e, V::packs32(V::srai32(lo, Src::sum_shift), V::srai32(hi, Src::sum_shift)));
        }
    } else if (mid <= Src::box16_limit) {
        const typename V::reg c_mid = V::set1_32(coef_pair(ctx.box_step, 0));
        for (; e + V::lanes16 <= sp.count; e += V::lanes16) {
            typename V::reg m = V::zero();
            for (int32_t k = 1; k <= mid; ++k)
                m = V::add16(m, load_samples<Src>(lines[0] + ptrdiff_t(stride) * k, sp.first + e));
            const typename V::reg a = load_samples<Src>(l0, sp.first + e), b = load_samples<Src>(llast, sp.first + e);
            const typename V::reg z = V::zero();
            const typename V::reg lo = V::add32(V::madd(V::unpack_lo16(a, b), c_first_last),
                                                V::madd(V::unpack_lo16(m, z), c_mid));
            const typename V::reg hi = V::add32(V::madd(V::unpack_hi16(a, b), c_first_last),
                                                V::madd(V::unpack_hi16(m, z), c_mid));
            V::store_i16(sp.out + e, V::packs32(V::srai32(lo, Src::sum_shift), V::srai32(hi, Src::sum_shift)));
        }
    } else {
        const typename V::reg wm = V::set1_32(ctx.box_step), w0 = V::set1_32(ctx.box_first),
                              wlv = V::set1_32(wl);
        for (; e + V::lanes16 <= sp.count; e += V::lanes16) {
            typename V::reg mlo = V::zero(), mhi = V::zero();
            for (int32_t k = 1; k <= mid; ++k) {
                const typename V::reg v = load_samples<Src>(lines[0] + ptrdiff_t(stride) * k, sp.first + e);
                mlo = V::add32(mlo, V::widen_lo_u16(v));
                mhi = V::add32(mhi, V::widen_hi_u16(v));
            }
            const typename V::reg a = load_samples<Src>(l0, sp.first + e), b = load_samples<Src>(llast, sp.first + e);
            // In element order: widened samples times the weights.
            const typename V::reg slo = V::add32(V::add32(V::mullo32(V::widen_lo_u16(a), w0), V::mullo32(mlo, wm)),
                                                 V::mullo32(V::widen_lo_u16(b), wlv));
            const typename V::reg shi = V::add32(V::add32(V::mullo32(V::widen_hi_u16(a), w0), V::mullo32(mhi, wm)),
                                                 V::mullo32(V::widen_hi_u16(b), wlv));
            V::store_i16(sp.out + e, V::narrow_s32(V::srai32(slo, Src::sum_shift), V::srai32(shi, Src::sum_shift)));
        }
    }
    if (e < sp.count) box_C<Src>(ctx, tail_strip<Src>(s, e));
}

// The lanes of the straight kernels: a register of 32-bit lanes of colour
// elements (a sample less its offset times an alpha word needs more than 16
// bits), the alpha word of each element's owner (chroma: the even pixel of
// its pair), and the narrowing that saturates to 16 bits as the scalar form
// stores.
template <class Src>
struct StraightLanes {
#if defined(LORVEX_ISA_AVX2)
    static constexpr int kLanes = 8;
    using reg = __m256i;
    static reg load_v(const typename Src::sample* p)
    {
        if constexpr (sizeof(typename Src::sample) == 1)
            return _mm256_cvtepu8_epi32(_mm_loadl_epi64((const __m128i*)p));
        else
            return _mm256_cvtepu16_epi32(_mm_loadu_si128((const __m128i*)p));
    }
    // Exactly the pixels of the register: four words, or two for RGBQ.
    static reg load_a(const uint16_t* a)
    {
        const __m128i words = Src::pairs ? _mm_loadl_epi64((const __m128i*)a) : _mm_cvtsi32_si128(load32(a));
        const reg w = _mm256_castsi128_si256(_mm_cvtepu16_epi32(words));
        const reg idx = Src::pairs ? _mm256_setr_epi32(0, 0, 1, 0, 2, 2, 3, 2) : _mm256_setr_epi32(0, 0, 0, 0, 1, 1, 1, 1);
        return _mm256_permutevar8x32_epi32(w, idx);
    }
    static reg offsets()
    {
        return Src::pairs ? _mm256_setr_epi32(Src::luma_offset, Src::chroma_offset, Src::luma_offset, Src::chroma_offset,
                                              Src::luma_offset, Src::chroma_offset, Src::luma_offset, Src::chroma_offset)
                          : _mm256_setzero_si256();
    }
    static __m128i bases()
    {
        return Src::pairs ? _mm_setr_epi16(Src::luma_base, Src::chroma_base, Src::luma_base, Src::chroma_base,
                                           Src::luma_base, Src::chroma_base, Src::luma_base, Src::chroma_base)
                          : _mm_setzero_si128();
    }
    static __m128i narrow(reg v) { return _mm_packs_epi32(_mm256_castsi256_si128(v), _mm256_extracti128_si256(v, 1)); }
    static reg set1(int32_t v) { return _mm256_set1_epi32(v); }
    static reg zero() { return _mm256_setzero_si256(); }
    static reg add(reg a, reg b) { return _mm256_add_epi32(a, b); }
    static reg sub(reg a, reg b) { return _mm256_sub_epi32(a, b); }
    static reg mul(reg a, reg b) { return _mm256_mullo_epi32(a, b); }
    static reg sra(reg a, int n) { return _mm256_srai_epi32(a, n); }
    static void store(int16_t* out, __m128i v) { _mm_storeu_si128((__m128i*)out, v); }
#else
    static constexpr int kLanes = 4;
    using reg = __m128i;
    static reg load_v(const typename Src::sample* p)
    {
        if constexpr (sizeof(typename Src::sample) == 1)
            return _mm_cvtepu8_epi32(_mm_cvtsi32_si128(load32(p)));
        else
            return _mm_cvtepu16_epi32(_mm_loadl_epi64((const __m128i*)p));
    }
    // Exactly the pixels of the register: two words, or one for RGBQ.
    static reg load_a(const uint16_t* a)
    {
        const reg w = _mm_cvtepu16_epi32(_mm_cvtsi32_si128(Src::pairs ? load32(a) : int32_t(*a)));
        return Src::pairs ? _mm_shuffle_epi32(w, _MM_SHUFFLE(0, 1, 0, 0)) : _mm_shuffle_epi32(w, 0);
    }
    static reg offsets()
    {
        return Src::pairs ? _mm_setr_epi32(Src::luma_offset, Src::chroma_offset, Src::luma_offset, Src::chroma_offset)
                          : _mm_setzero_si128();
    }
    static __m128i bases()
    {
        return Src::pairs ? _mm_setr_epi16(Src::luma_base, Src::chroma_base, Src::luma_base, Src::chroma_base, 0, 0, 0, 0)
                          : _mm_setzero_si128();
    }
    static __m128i narrow(reg v) { return _mm_packs_epi32(v, v); }
    static reg set1(int32_t v) { return _mm_set1_epi32(v); }
    static reg zero() { return _mm_setzero_si128(); }
    static reg add(reg a, reg b) { return _mm_add_epi32(a, b); }
    static reg sub(reg a, reg b) { return _mm_sub_epi32(a, b); }
    static reg mul(reg a, reg b) { return _mm_mullo_epi32(a, b); }
    static reg sra(reg a, int n) { return _mm_srai_epi32(a, n); }
    static void store(int16_t* out, __m128i v) { _mm_storel_epi64((__m128i*)out, v); }
#endif
};

// The most lines a straight sum weighs: the widest bank.
constexpr int32_t kMaxStraightLines = 16;

// The alpha of the pixels [0, pixels) of a straight strip, four at a time:
// (sum w_k a_k) >> 12 saturated, or a x 4 for one line.
template <class Src, class Row, class Weight>
inline void straight_alpha_V(const MapContext& ctx, const StripRecord& s, int32_t x0, int32_t pixels, int32_t n,
                             Row row, Weight weight)
{
    int16_t* out_a = ctx.line_a + s.pad_left;
    int32_t x = 0;
#if defined(LORVEX_ISA_AVX2)
    // Sixteen pixels at a time, pairs of lines by one multiply-add, while the
    // words stay below 32768 (every alpha word of a picture does).
    if (n <= kMaxStraightLines) {
        int32_t coef[kMaxStraightLines / 2];
        const uint16_t* arow[kMaxStraightLines];
        for (int32_t k = 0; k < n; ++k) arow[k] = reinterpret_cast<const uint16_t*>(row(k).second) + x0;
        for (int32_t k = 0; k < n; k += 2) coef[k / 2] = coef_pair(weight(k), k + 1 < n ? weight(k + 1) : 0);
        for (; x + 16 <= pixels; x += 16) {
            __m256i lo = _mm256_setzero_si256(), hi = lo, bad = lo;
            for (int32_t k = 0; k < n; k += 2) {
                const auto words = [&](int32_t m) {
                    const __m256i w = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(arow[m] + x));
                    bad = _mm256_or_si256(bad, w);
                    return w;
                };
                const __m256i a0 = words(k), a1 = k + 1 < n ? words(k + 1) : _mm256_setzero_si256();
                const __m256i c = _mm256_set1_epi32(coef[k / 2]);
                lo = _mm256_add_epi32(lo, _mm256_madd_epi16(_mm256_unpacklo_epi16(a0, a1), c));
                hi = _mm256_add_epi32(hi, _mm256_madd_epi16(_mm256_unpackhi_epi16(a0, a1), c));
            }
            if (_mm256_movemask_epi8(bad) & 0xAAAAAAAA) break;  // a word of 32768 or more
            _mm256_storeu_si256(reinterpret_cast<__m256i*>(out_a + x),
                                _mm256_packs_epi32(_mm256_srai_epi32(lo, 12), _mm256_srai_epi32(hi, 12)));
        }
    }
#endif
    for (; x + 4 <= pixels; x += 4) {
        __m128i sum = _mm_setzero_si128();
        for (int32_t k = 0; k < n; ++k) {
            const __m128i a = _mm_cvtepu16_epi32(
                _mm_loadl_epi64((const __m128i*)(reinterpret_cast<const uint16_t*>(row(k).second) + x0 + x)));
            sum = _mm_add_epi32(sum, _mm_mullo_epi32(a, _mm_set1_epi32(weight(k))));
        }
        const __m128i w = _mm_srai_epi32(sum, 12);
        _mm_storel_epi64((__m128i*)(out_a + x), _mm_packs_epi32(w, w));
    }
    for (; x < pixels; ++x) {
        int32_t sum = 0;
        for (int32_t k = 0; k < n; ++k)
            sum += weight(k) * int32_t(reinterpret_cast<const uint16_t*>(row(k).second)[x0 + x]);
        out_a[x] = saturate_i16(sum >> 12);
    }
}

#if defined(LORVEX_ISA_AVX2)
// straight_sum_V sixteen elements at a time in 16-bit lanes, while the
// samples and alpha words allow. P = ((v - offset) a) >> shift is the high
// product of (v - offset) 2^s1 and a 2^3 (s1 = 13 - shift; a 2^3 taken as
// unsigned: the signed product plus the first factor where its top bit is
// set), exact while both factors fit 16 bits: alpha words below 8192, and
// for 10-bit samples words below 2048 (8-bit samples always fit). Pairs of
// lines are then weighed by one multiply-add into the same 32-bit sums.
// Returns the elements drawn; it stops before the first register beyond
// those limits.
template <class Src, class Row, class Weight>
int32_t straight_sum16(const Span<Src>& sp, int32_t n, Row row, Weight weight)
{
    constexpr int E = Src::elements_per_pixel;
    constexpr int s1 = 13 - Src::premul_shift;
    static_assert(s1 >= 0);
    constexpr bool bytes = sizeof(typename Src::sample) == 1;
    const __m256i off = _mm256_set1_epi32(int32_t(uint32_t(Src::luma_offset) | uint32_t(Src::chroma_offset) << 16));
    const __m256i base = _mm256_set1_epi32(int32_t(uint32_t(Src::luma_base) | uint32_t(Src::chroma_base) << 16));
    // Each element's alpha word: its pixel's (chroma: the even pixel of its pair).
    const __m256i spread = Src::pairs ? _mm256_setr_epi8(0, 1, 0, 1, 2, 3, 0, 1, 4, 5, 4, 5, 6, 7, 4, 5,  //
                                                         8, 9, 8, 9, 10, 11, 8, 9, 12, 13, 12, 13, 14, 15, 12, 13)
                                      : _mm256_setr_epi8(0, 1, 0, 1, 0, 1, 0, 1, 2, 3, 2, 3, 2, 3, 2, 3,  //
                                                         4, 5, 4, 5, 4, 5, 4, 5, 6, 7, 6, 7, 6, 7, 6, 7);
    if (n > kMaxStraightLines) return 0;
    const typename Src::sample* vrow[kMaxStraightLines];
    const uint16_t* arow[kMaxStraightLines];
    int32_t coef[kMaxStraightLines / 2];
    for (int32_t k = 0; k < n; ++k) {
        const LinePair l = row(k);
        vrow[k] = src_row<Src>(l.first) + sp.first;
        arow[k] = reinterpret_cast<const uint16_t*>(l.second) + sp.first / E;
    }
    for (int32_t k = 0; k < n; k += 2) coef[k / 2] = coef_pair(weight(k), k + 1 < n ? weight(k + 1) : 0);
    const auto premultiplied = [&](int32_t k, int32_t e, __m256i& bad) {
        const auto* v = vrow[k] + e;
        const uint16_t* a = arow[k] + e / E;
        const __m256i x = bytes ? _mm256_cvtepu8_epi16(_mm_loadu_si128(reinterpret_cast<const __m128i*>(v)))
                                : _mm256_loadu_si256(reinterpret_cast<const __m256i*>(v));
        const __m128i words = Src::pairs ? _mm_loadu_si128(reinterpret_cast<const __m128i*>(a))
                                         : _mm_loadl_epi64(reinterpret_cast<const __m128i*>(a));
        const __m256i aw = _mm256_shuffle_epi8(_mm256_broadcastsi128_si256(words), spread);
        bad = _mm256_or_si256(bad, _mm256_srli_epi16(aw, 13));
        if constexpr (!bytes) bad = _mm256_or_si256(bad, _mm256_srli_epi16(x, 11));
        const __m256i f = _mm256_slli_epi16(_mm256_sub_epi16(x, Src::pairs ? off : _mm256_setzero_si256()), s1);
        const __m256i g = _mm256_slli_epi16(aw, 3);
        return _mm256_add_epi16(_mm256_mulhi_epi16(f, g), _mm256_and_si256(f, _mm256_srai_epi16(g, 15)));
    };
    int32_t e = 0;
    for (; e + 16 <= sp.count; e += 16) {
        __m256i bad = _mm256_setzero_si256(), out;
        if (n == 1) {
            out = premultiplied(0, e, bad);  // 16384 P >> 14 is P
        } else {
            __m256i lo = _mm256_setzero_si256(), hi = lo;
            for (int32_t k = 0; k < n; k += 2) {
                const __m256i p0 = premultiplied(k, e, bad);
                const __m256i p1 = k + 1 < n ? premultiplied(k + 1, e, bad) : _mm256_setzero_si256();
                const __m256i c = _mm256_set1_epi32(coef[k / 2]);
                lo = _mm256_add_epi32(lo, _mm256_madd_epi16(_mm256_unpacklo_epi16(p0, p1), c));
                hi = _mm256_add_epi32(hi, _mm256_madd_epi16(_mm256_unpackhi_epi16(p0, p1), c));
            }
            out = _mm256_packs_epi32(_mm256_srai_epi32(lo, 14), _mm256_srai_epi32(hi, 14));
        }
        if (!_mm256_testz_si256(bad, bad)) break;
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(sp.out + e),
                            _mm256_add_epi16(out, Src::pairs ? base : _mm256_setzero_si256()));
    }
    return e;
}
#endif

// The weighted sum of n premultiplied lines, as straight_sum: colour
// saturate((sum w_k P_k) >> 14) + base with P_k = ((v_k - offset) a_k) >>
// premul_shift, alpha (sum w_k a_k) >> 12; the elements the registers leave
// take the scalar kernel `Tail`.
template <class Src, Kernel Tail, class Row, class Weight>
void straight_sum_V(const MapContext& ctx, const StripRecord& s, int32_t n, Row row, Weight weight)
{
    using V = StraightLanes<Src>;
    constexpr int E = Src::elements_per_pixel;
    const typename V::reg off = V::offsets();
    const __m128i base = V::bases();
    const Span<Src> sp(ctx, s);
    int32_t e = 0;
#if defined(LORVEX_ISA_AVX2)
    e = straight_sum16<Src>(sp, n, row, weight);
#endif
    for (; e + V::kLanes <= sp.count; e += V::kLanes) {
        const int32_t se = sp.first + e;
        typename V::reg sum = V::zero();
        for (int32_t k = 0; k < n; ++k) {
            const LinePair l = row(k);
            const typename V::reg p = V::sra(
                V::mul(V::sub(V::load_v(src_row<Src>(l.first) + se), off),
                       V::load_a(reinterpret_cast<const uint16_t*>(l.second) + se / E)),
                Src::premul_shift);
            // One line: 16384 P >> 14 is P.
            sum = n == 1 ? p : V::add(sum, V::mul(p, V::set1(weight(k))));
        }
        if (n != 1) sum = V::sra(sum, 14);
        V::store(sp.out + e, _mm_add_epi16(V::narrow(sum), base));
    }
    straight_alpha_V<Src>(ctx, s, sp.first / E, e / E, n, row, weight);
    if (e < sp.count) Tail(ctx, tail_strip<Src>(s, e));
}

// Slots 2 and 3 of the straight tables: one line premultiplied; colour P +
// base, alpha a x 4.
template <class Src>
void straight_one_line_V(const MapContext& ctx, const StripRecord& s)
{
    straight_sum_V<Src, straight_one_line_C<Src>>(
        ctx, s, 1, [&](int32_t) { return stride_line(ctx, 0); }, [](int32_t) { return 16384; });
}

// Slot 5 of the straight tables: two lines with weights 16384 - w and w.
template <class Src>
void straight_linear_V(const MapContext& ctx, const StripRecord& s)
{
    const int32_t w = ctx.vphase >> 2;
    if (w == 0) {
        straight_one_line_V<Src>(ctx, s);
        return;
    }
    straight_sum_V<Src, straight_linear_C<Src>>(
        ctx, s, 2, [&](int32_t k) { return stride_line(ctx, k); }, [&](int32_t k) { return k == 0 ? 16384 - w : w; });
}

// Slots 6..21 of the straight tables: 2T bank taps.
template <class Src, int T, bool ByPointer>
void straight_bank_V(const MapContext& ctx, const StripRecord& s)
{
    straight_sum_V<Src, straight_bank_C<Src, T, ByPointer>>(
        ctx, s, 2 * T, [&](int32_t i) { return bank_line<T, ByPointer>(ctx, i); },
        [&](int32_t i) { return bank_weight<T>(ctx, i); });
}

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::vertical

namespace lorvex::vertical {
inline namespace LORVEX_ISA_NAMESPACE {

// A straight table: every slot but the box has a vector form.
template <class Src>
constexpr VerticalKernelTable make_straight_vector_table()
{
    return {
        straight_pad_left_C<Src>,       straight_pad_right_C<Src>,      straight_one_line_V<Src>,
        straight_one_line_V<Src>,       straight_box_C<Src>,            straight_linear_V<Src>,
        straight_bank_V<Src, 1, false>, straight_bank_V<Src, 2, false>, straight_bank_V<Src, 3, false>,
        straight_bank_V<Src, 4, false>, straight_bank_V<Src, 5, false>, straight_bank_V<Src, 6, false>,
        straight_bank_V<Src, 7, false>, straight_bank_V<Src, 8, false>, straight_bank_V<Src, 1, true>,
        straight_bank_V<Src, 2, true>,  straight_bank_V<Src, 3, true>,  straight_bank_V<Src, 4, true>,
        straight_bank_V<Src, 5, true>,  straight_bank_V<Src, 6, true>,  straight_bank_V<Src, 7, true>,
        straight_bank_V<Src, 8, true>,  nullptr,                        nullptr,
    };
}

// A plain table with the vector kernels in the slots they serve.
template <class Src, Kernel Edge>
constexpr VerticalKernelTable make_vector_table()
{
    return {
        pad_left_C<Src>,       pad_right_C<Src>,      one_line_V<Src>,       one_line_V<Src>,
        box_V<Src>,            linear_V<Src>,         bank_V<Src, 1, false>, bank_V<Src, 2, false>,
        bank_V<Src, 3, false>, bank_V<Src, 4, false>, bank_V<Src, 5, false>, bank_V<Src, 6, false>,
        bank_V<Src, 7, false>, bank_V<Src, 8, false>, bank_V<Src, 1, true>,  bank_V<Src, 2, true>,
        bank_V<Src, 3, true>,  bank_V<Src, 4, true>,  bank_V<Src, 5, true>,  bank_V<Src, 6, true>,
        bank_V<Src, 7, true>,  bank_V<Src, 8, true>,  Edge,                  nullptr,
    };
}

// The tables of this instruction set, in the order declared beside
// vertical_table_for.
constexpr std::array<VerticalKernelTable, kVectorVerticalTables> make_vector_tables()
{
    return {
        make_vector_table<SrcYuy2, edge7_yuy2_C>(), make_vector_table<SrcW210, nullptr>(),
        make_vector_table<SrcRgbq, edge7_rgbq_C>(), make_vector_table<SrcAlpha, nullptr>(),
        make_straight_vector_table<SrcYuy2>(),       make_straight_vector_table<SrcW210>(),
        make_straight_vector_table<SrcRgbq>(),
    };
}

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::vertical
