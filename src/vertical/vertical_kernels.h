// Vertical kernels: the source lines around one position become one line of
// the line buffer, in its 13-bit unit.
//
// Every kernel is a fixed-shape filter over source lines at one column: the
// column is never resampled here, so the work is the same for every element.
// A kernel writes source pixel `src_first` to buffer pixel `pad_left` and so on
// without a gap up to `src_end` - 1; in the 4:2:2 layouts the end is first
// rounded up to even so that pairs stay whole (the source must allow reading
// the pair partner of an odd-width line). Nothing else of the buffer is
// touched. The edge-adaptive kernel of kind 7 is the one exception: it writes
// from element 0 and ignores `pad_left`.
//
// Arithmetic: weights sum to 16384 (taps, box weights, linear weights), and
// a sum leaves as sum >> (14 - buffer shift), arithmetic, truncating toward
// minus infinity, saturated to i16. The vertical stage never rounds; rounding
// happens once, when a sample leaves the buffer.
//
// Kernels are templates over the source layout (Src: sample type, elements
// per pixel, pairs, buffer shift) and the tap count, instantiated into the
// tables of vertical_tables.cpp.
#pragma once

#include "shared/isa.h"

#include <cstdint>

#include "shared/formats.h"
#include "shared/map_context.h"

namespace lorvex::vertical {
inline namespace LORVEX_ISA_NAMESPACE {

// Where a kernel reads and writes, for one strip.
template <class Src>
struct Span {
    int32_t first;   // first source element
    int32_t count;   // elements to produce
    int16_t* out;    // buffer element of `first`

    Span(const MapContext& ctx, const StripRecord& s)
    {
        constexpr int E = Src::elements_per_pixel;
        int32_t end = Src::pairs ? ((s.src_end + 1) & ~1) : s.src_end;
        first = s.src_first * E;
        count = (end - s.src_first) * E;
        out = (Src::second_plane ? ctx.line_a : ctx.line) + s.pad_left * E;
    }
};

template <class Src>
inline const typename Src::sample* src_row(const uint8_t* p)
{
    return reinterpret_cast<const typename Src::sample*>(p);
}

template <class Src>
inline const LineSet& src_lines(const MapContext& ctx)
{
    return Src::second_plane ? ctx.lines2 : ctx.lines;
}

template <class Src>
inline int32_t src_stride(const MapContext& ctx)
{
    return Src::second_plane ? ctx.src_stride2 : ctx.src_stride;
}

template <class Src>
inline int16_t* buffer(const MapContext& ctx)
{
    return Src::second_plane ? ctx.line_a : ctx.line;
}

// A sum of samples times weights that add up to 16384, into buffer units.
template <class Src>
inline int16_t leave_sum(int32_t sum)
{
    return saturate_i16(sum >> Src::sum_shift);
}

// Slot 0: replicate the first valid pixel over the `pad_left` pixels before
// it. In pairs the fill is Y Cb Y Cr of the first valid pair.
template <class Src>
void pad_left_C(const MapContext& ctx, const StripRecord& s)
{
    int16_t* line = buffer<Src>(ctx);
    constexpr int E = Src::elements_per_pixel;
    const int32_t p = s.pad_left;
    if constexpr (Src::pairs) {
        const int16_t y = line[2 * p], cb = line[2 * p + 1], cr = line[2 * p + 3];
        for (int32_t q = 0; q < p; ++q) {
            line[2 * q] = y;
            line[2 * q + 1] = (q & 1) ? cr : cb;
        }
    } else {
        for (int32_t q = 0; q < p; ++q)
            for (int e = 0; e < E; ++e) line[q * E + e] = line[p * E + e];
    }
}

// Slot 1: replicate the last valid pixel over `pad_right` pixels after it. In
// pairs the count is rounded up to even and the fill is Y Cb Y Cr, with Y the
// luma of pixel `last`, Cb the chroma element of pixel `last` - 1 and Cr that
// of pixel `last`.
template <class Src>
void pad_right_C(const MapContext& ctx, const StripRecord& s)
{
    int16_t* line = buffer<Src>(ctx);
    constexpr int E = Src::elements_per_pixel;
    const int32_t l = s.last;
    if constexpr (Src::pairs) {
        const int16_t y = line[2 * l], cb = line[2 * l - 1], cr = line[2 * l + 1];
        const int32_t n = (s.pad_right + 1) & ~1;
        for (int32_t i = 0; i < n; ++i) {
            const int32_t q = l + 1 + i;
            line[2 * q] = y;
            line[2 * q + 1] = (i & 1) ? cr : cb;
        }
    } else {
        for (int32_t i = 1; i <= s.pad_right; ++i)
            for (int e = 0; e < E; ++e) line[(l + i) * E + e] = line[l * E + e];
    }
}

// Slots 2 and 3: one line, scaled into buffer units.
template <class Src>
void one_line_C(const MapContext& ctx, const StripRecord& s)
{
    const Span<Src> sp(ctx, s);
    const auto* a = src_row<Src>(src_lines<Src>(ctx)[0]) + sp.first;
    for (int32_t e = 0; e < sp.count; ++e) sp.out[e] = int16_t(int32_t(a[e]) << Src::buffer_shift);
}

// Slot 4: box filter for area reduction. box_first x line 0, box_step x each
// of the box_mid middle lines, box_last x the line after them; the weights add
// up to 16384. The middle lines are summed first as plain integers and
// multiplied once; while that sum fits 16 bits (box_mid up to 126 bytes or 30
// ten-bit words) it is formed in 16-bit lanes, beyond that per line in 32
// bits. Both give the same result.
template <class Src>
void box_C(const MapContext& ctx, const StripRecord& s)
{
    const Span<Src> sp(ctx, s);
    const LineSet& lines = src_lines<Src>(ctx);
    const int32_t stride = src_stride<Src>(ctx);
    const auto row = [&](int32_t k) { return src_row<Src>(lines[0] + ptrdiff_t(stride) * k) + sp.first; };
    const int32_t w0 = ctx.box_first, wm = ctx.box_step, wl = ctx.box_last, mid = ctx.box_mid;

    if (mid == 0 && wl == 0) {
        one_line_C<Src>(ctx, s);
        return;
    }
    const auto* l0 = row(0);
    const auto* llast = row(mid + 1);
    if (mid == 0) {
        for (int32_t e = 0; e < sp.count; ++e)
            sp.out[e] = leave_sum<Src>(w0 * l0[e] + wl * llast[e]);
        return;
    }
    if (mid <= Src::box16_limit) {
        for (int32_t e = 0; e < sp.count; ++e) {
            uint16_t m = 0;
            for (int32_t k = 1; k <= mid; ++k) m = uint16_t(m + row(k)[e]);
            sp.out[e] = leave_sum<Src>(w0 * l0[e] + wm * int32_t(m) + wl * llast[e]);
        }
    } else {
        for (int32_t e = 0; e < sp.count; ++e) {
            int32_t m = 0;
            for (int32_t k = 1; k <= mid; ++k) m += row(k)[e];
            sp.out[e] = leave_sum<Src>(w0 * l0[e] + wm * m + wl * llast[e]);
        }
    }
}

// Slot 5: two lines with a 16-bit fraction; w = vphase >> 2 in 1/16384. A w
// of 0 is a plain copy of line 0 (this is what a four-bit phase of 0..3 gives).
template <class Src>
void linear_C(const MapContext& ctx, const StripRecord& s)
{
    const int32_t w = ctx.vphase >> 2;
    if (w == 0) {
        one_line_C<Src>(ctx, s);
        return;
    }
    const Span<Src> sp(ctx, s);
    const LineSet& lines = src_lines<Src>(ctx);
    const auto* a = src_row<Src>(lines[0]) + sp.first;
    const auto* b = src_row<Src>(lines[0] + src_stride<Src>(ctx)) + sp.first;
    for (int32_t e = 0; e < sp.count; ++e)
        sp.out[e] = leave_sum<Src>((16384 - w) * a[e] + w * b[e]);
}

// Slots 6..13 (by stride) and 14..21 (through the pointer array): 2T taps,
// lines k = 1 - T .. T around the current line with coefficient row[7 + k] of
// phase `vphase` of the bank row `vbank`.
template <class Src, int T, bool ByPointer>
void bank_C(const MapContext& ctx, const StripRecord& s)
{
    const Span<Src> sp(ctx, s);
    const LineSet& lines = src_lines<Src>(ctx);
    const int32_t stride = src_stride<Src>(ctx);
    const int16_t* row = ctx.vbank + ctx.vphase * 16;
    const typename Src::sample* in[2 * T];
    for (int k = 1 - T; k <= T; ++k) {
        const uint8_t* p = ByPointer ? lines[k] : lines[0] + ptrdiff_t(stride) * k;
        in[k + T - 1] = src_row<Src>(p) + sp.first;
    }
    for (int32_t e = 0; e < sp.count; ++e) {
        int32_t sum = 0;
        for (int k = 1 - T; k <= T; ++k) sum += row[7 + k] * int32_t(in[k + T - 1][e]);
        sp.out[e] = leave_sum<Src>(sum);
    }
}

}  // namespace LORVEX_ISA_NAMESPACE

// Slot 22: the edge-adaptive interpolator of kind 7 (byte layouts only).
void edge7_yuy2_C(const MapContext& ctx, const StripRecord& s);
void edge7_rgbq_C(const MapContext& ctx, const StripRecord& s);

}  // namespace lorvex::vertical

namespace lorvex {
enum class SimdLevel : int;

extern const VerticalKernelTable V_YUY2;
extern const VerticalKernelTable V_W210;
extern const VerticalKernelTable V_RGBQ;
extern const VerticalKernelTable V_ALPHA;

// The tables with vector kernels, one set per instruction set, in the order
// V_YUY2, V_W210, V_RGBQ, V_ALPHA, V_YUY2_STRAIGHT, V_W210_STRAIGHT,
// V_RGBQ_STRAIGHT.
constexpr int kVectorVerticalTables = 7;
extern const std::array<VerticalKernelTable, kVectorVerticalTables> vertical_tables_isa_sse41;
extern const std::array<VerticalKernelTable, kVectorVerticalTables> vertical_tables_isa_avx2;

// The twin of a table whose kernels use the vectors of `level`, where one
// exists; the table itself otherwise.
const VerticalKernelTable* vertical_table_for(const VerticalKernelTable* table, SimdLevel level);
}  // namespace lorvex
