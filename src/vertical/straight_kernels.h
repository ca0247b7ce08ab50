// Vertical kernels of sources with straight (unweighted) colour and an alpha
// plane: each source line is premultiplied as it is read, so that filtering
// happens on weighted colour, and alpha is filtered beside it with the same
// weights into `line_a`.
//
// For one line k, with a_k the alpha word (4096 = 1.0) of the pixel that owns
// the sample (for chroma, the even pixel of the pair):
//
//   P_k    = ((v_k - offset) * a_k) >> 7        (8 bits; >> 9 for 10 bits)
//   colour = saturate((sum w_k P_k) >> 14) + base   (512 luma, 4096 chroma,
//                                                    0 RGBQ; a 16-bit add)
//   alpha  = (sum w_k a_k) >> 12
//
// with weights w_k summing to 16384 (bank taps, the linear pair, the box
// weights). At a = 4096 P is v x 32 or v x 8 less the black or neutral level,
// and black and neutral keep their buffer values at any alpha. All sums are in
// 32 bits and truncate; the box has no 16-bit shortcut, since each line has
// its own alpha.
#pragma once

#include "shared/isa.h"

#include "vertical/vertical_kernels.h"

namespace lorvex::vertical {
inline namespace LORVEX_ISA_NAMESPACE {

// Premultiplied sample of element e (relative to the source line start) of a
// line, with its alpha line.
template <class Src>
inline int32_t premultiplied(const typename Src::sample* v, const uint16_t* a, int32_t e)
{
    constexpr int E = Src::elements_per_pixel;
    const int32_t x = e / E;
    const bool chroma = Src::pairs && (e & 1);
    const int32_t owner = chroma ? (x & ~1) : x;
    const int32_t off = chroma ? Src::chroma_offset : Src::luma_offset;
    return ((int32_t(v[e]) - off) * int32_t(a[owner])) >> Src::premul_shift;
}

// The weighted sum of `n` premultiplied lines. Row(k) gives line k's colour
// and alpha pointers; Weight(k) its weight.
template <class Src, class Row, class Weight>
void straight_sum(const MapContext& ctx, const StripRecord& s, int32_t n, Row row, Weight weight)
{
    const Span<Src> sp(ctx, s);
    constexpr int E = Src::elements_per_pixel;
    for (int32_t e = 0; e < sp.count; ++e) {
        const int32_t se = sp.first + e;
        int32_t sum = 0;
        for (int32_t k = 0; k < n; ++k) {
            const auto [v, a] = row(k);
            sum += weight(k) * premultiplied<Src>(src_row<Src>(v), reinterpret_cast<const uint16_t*>(a), se);
        }
        const bool chroma = Src::pairs && (se & 1);
        const int32_t base = chroma ? Src::chroma_base : Src::luma_base;
        sp.out[e] = int16_t(saturate_i16(sum >> 14) + base);
    }
    int16_t* out_a = ctx.line_a + s.pad_left;
    const int32_t x0 = sp.first / E;
    for (int32_t x = 0; x < sp.count / E; ++x) {
        int32_t sum = 0;
        for (int32_t k = 0; k < n; ++k)
            sum += weight(k) * int32_t(reinterpret_cast<const uint16_t*>(row(k).second)[x0 + x]);
        out_a[x] = saturate_i16(sum >> 12);
    }
}

struct LinePair {
    const uint8_t* first;
    const uint8_t* second;
};

inline LinePair stride_line(const MapContext& ctx, int32_t k)
{
    return {ctx.lines[0] + ptrdiff_t(ctx.src_stride) * k, ctx.lines2[0] + ptrdiff_t(ctx.src_stride2) * k};
}

// Slots 0 and 1: the colour as in the plain tables, and alpha over the same
// pixels (rounded up to even on the right in 4:2:2): the alpha of pixel
// `pad_left` on the left, of pixel `last` on the right.
template <class Src>
void straight_pad_left_C(const MapContext& ctx, const StripRecord& s)
{
    pad_left_C<Src>(ctx, s);
    for (int32_t q = 0; q < s.pad_left; ++q) ctx.line_a[q] = ctx.line_a[s.pad_left];
}

template <class Src>
void straight_pad_right_C(const MapContext& ctx, const StripRecord& s)
{
    pad_right_C<Src>(ctx, s);
    const int32_t n = Src::pairs ? (s.pad_right + 1) & ~1 : s.pad_right;
    for (int32_t i = 1; i <= n; ++i) ctx.line_a[s.last + i] = ctx.line_a[s.last];
}

// Slots 2 and 3: one line; colour P + base, alpha a x 4.
template <class Src>
void straight_one_line_C(const MapContext& ctx, const StripRecord& s)
{
    straight_sum<Src>(
        ctx, s, 1, [&](int32_t) { return stride_line(ctx, 0); }, [](int32_t) { return 16384; });
}

// Slot 4: the box in its four cases.
template <class Src>
void straight_box_C(const MapContext& ctx, const StripRecord& s)
{
    const int32_t mid = ctx.box_mid, last = ctx.box_last;
    if (mid == 0 && last == 0) {
        straight_one_line_C<Src>(ctx, s);
        return;
    }
    straight_sum<Src>(
        ctx, s, mid + 2, [&](int32_t k) { return stride_line(ctx, k); },
        [&](int32_t k) { return k == 0 ? ctx.box_first : (k <= mid ? ctx.box_step : last); });
}

// Slot 5: two lines with weights 16384 - w and w, w = vphase >> 2.
template <class Src>
void straight_linear_C(const MapContext& ctx, const StripRecord& s)
{
    const int32_t w = ctx.vphase >> 2;
    if (w == 0) {
        straight_one_line_C<Src>(ctx, s);
        return;
    }
    straight_sum<Src>(
        ctx, s, 2, [&](int32_t k) { return stride_line(ctx, k); },
        [&](int32_t k) { return k == 0 ? 16384 - w : w; });
}

// Slots 6..13 and 14..21: 2T bank taps by stride or through the pointer array.
// Line i of 2T bank taps (tap k = i + 1 - T) and its weight.
template <int T, bool ByPointer>
inline LinePair bank_line(const MapContext& ctx, int32_t i)
{
    const int k = int(i) + 1 - T;
    return ByPointer ? LinePair{ctx.lines[k], ctx.lines2[k]} : stride_line(ctx, k);
}
template <int T>
inline int32_t bank_weight(const MapContext& ctx, int32_t i)
{
    return ctx.vbank[ctx.vphase * 16 + 7 + i + 1 - T];
}

template <class Src, int T, bool ByPointer>
void straight_bank_C(const MapContext& ctx, const StripRecord& s)
{
    straight_sum<Src>(
        ctx, s, 2 * T, [&](int32_t i) { return bank_line<T, ByPointer>(ctx, i); },
        [&](int32_t i) { return bank_weight<T>(ctx, i); });
}

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::vertical

namespace lorvex {
extern const VerticalKernelTable V_YUY2_STRAIGHT;
extern const VerticalKernelTable V_W210_STRAIGHT;
extern const VerticalKernelTable V_RGBQ_STRAIGHT;
}  // namespace lorvex
