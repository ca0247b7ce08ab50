// The frame shared by all horizontal main kernels, and the constant-region
// kernels of slots 0 and 1.
//
// The walk goes over the destination pixels of a region by coverage: hc, the
// coverage of the current pixel (16.16, at most 0x10000), starts at
// `first_cover`; rem, the coverage left including the current pixel, at
// `width16`; it stops exactly when rem is used up.
//
// 4:2:2 destinations: when the line is wholly covered (vcover 16384), the
// pixel is wholly covered and it is the even pixel of a pair (by the parity of
// its address), a run of rem >> 17 whole pairs is drawn by the whole-pixel rule
// (the even pixel at pos, its Cb and Cr, the odd pixel at pos + hstep). Every
// other pixel - an odd first pixel, a pixel left over after a run, every pixel
// of a partly covered line - is drawn alone by the partial-pixel rule, even at
// full coverage; an even pixel then also draws its pair's chroma, an odd pixel
// luma only. So a pair is written whole only when both of its pixels and the
// line are wholly covered.
//
// RGBQ destinations have no pairs: the run is rem >> 16 whole pixels. The RGBQ
// area kernel alone runs in steps of two pixels like the 4:2:2 ones, so that a
// single whole pixel left over falls to the partial rule.
//
// Samples are limited to 0..M before composition when the call clamps, and
// always in the kernels whose sampler says so.
#pragma once

#include "shared/isa.h"

#include "horizontal/pixel.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

template <class Dst>
inline typename Dst::sample* dst_pixel(const MapContext& c, int32_t x)
{
    uint8_t* base = Dst::alpha_only ? c.dst_line2 : c.dst_line;
    return reinterpret_cast<typename Dst::sample*>(base + ptrdiff_t(x) * Dst::bytes_per_pixel);
}

template <class Family>
inline uint16_t* dst_alpha(const MapContext& c, int32_t x)
{
    if constexpr (Family::dest_alpha)
        return reinterpret_cast<uint16_t*>(c.dst_line2) + x;
    else
        return nullptr;
}

template <class Dst>
inline bool is_even(const typename Dst::sample* p)
{
    return (reinterpret_cast<uintptr_t>(p) & Dst::parity_mask) == 0;
}

template <class Dst, int N>
inline void limit(Px& px)
{
    for (int i = 0; i < N; ++i) px.s[i] = clamp_to(px.s[i], 0, Dst::max);
}

// The shape of a pixel that draws its pair's chroma (or all its samples), and
// of one that draws luma only.
template <class Dst>
using FullShape = std::conditional_t<Dst::pairs, ShapeEven, std::conditional_t<Dst::alpha_only, ShapeNone, ShapeQuad>>;
template <class Dst>
using LumaShape = std::conditional_t<Dst::pairs, ShapeOdd, FullShape<Dst>>;

// Whether a sampler has a vector run of whole pixels for the plain rule.
template <class Sampler, class Family>
constexpr bool uses_plain_run()
{
    if constexpr (requires { Sampler::has_plain_run; })
        return Sampler::has_plain_run && Family::plain;
    else
        return false;
}

// Whether a sampler has a vector run of whole pixels for the fast form of the
// source-alpha tables.
template <class Sampler, class Family>
constexpr bool uses_fast_alpha_run()
{
    if constexpr (requires { Sampler::has_fast_alpha_run; })
        return Sampler::has_fast_alpha_run && Family::fast_alpha;
    else
        return false;
}

// Whether a sampler has a vector run of whole pixels for the general form of
// the source-alpha tables; it may decline a call, or draw part of a run.
template <class Sampler, class Family>
constexpr bool uses_general_alpha_run()
{
    if constexpr (requires { Sampler::has_general_alpha_run; })
        return Sampler::has_general_alpha_run && Family::general_alpha;
    else
        return false;
}

// Slots 2..11: the walk, with Sampler computing the samples and Family
// compositing them.
template <class Dst, class Sampler, class Family, bool RunInPairs>
void main_kernel_C(const MapContext& c, const StripRecord& s)
{
    using Even = FullShape<Dst>;
    using Odd = LumaShape<Dst>;
    constexpr int kRun = RunInPairs ? 2 : 1;
    constexpr int kRunShift = RunInPairs ? 17 : 16;
    constexpr int32_t kRunWidth = 0x10000 * kRun;
    constexpr bool kAlwaysClamp = Family::clamps_always || Sampler::taps > Family::unclamped_max_taps;

    int32_t x = s.x;
    auto* d = dst_pixel<Dst>(c, x);
    Sampler smp(c, s, is_even<Dst>(d));
    const bool clamp = c.clamp || kAlwaysClamp;
    const bool clamp_whole =
        clamp || (Family::template clamp_whole_at_full_level<Dst, Sampler>() && c.level == 4096);
    const bool full_line = c.vcover == 16384;
    int32_t hc = s.first_cover;
    int32_t rem = s.width16;
    Px px{}, px2{};

    for (;;) {
        if (full_line && hc == 0x10000 && is_even<Dst>(d)) {
            if (rem >= kRunWidth) {
                const int32_t n = rem >> kRunShift;
                rem &= (1 << kRunShift) - 1;
                if constexpr (uses_plain_run<Sampler, Family>()) {
                    smp.plain_run(c, d, n, clamp_whole);
                    x += kRun * n;
                    d = dst_pixel<Dst>(c, x);
                } else if constexpr (uses_fast_alpha_run<Sampler, Family>()) {
                    smp.fast_alpha_run(d, n);
                    x += kRun * n;
                    d = dst_pixel<Dst>(c, x);
                } else {
                    int32_t k = 0;
                    if constexpr (uses_general_alpha_run<Sampler, Family>()) {
                        k = smp.general_alpha_run(c, d, n, clamp_whole);
                        x += kRun * k;
                        d = dst_pixel<Dst>(c, x);
                    }
                    for (; k < n; ++k) {
                        smp.sample(px, true, true);
                        smp.advance();
                        if (clamp_whole) limit<Dst, Even::n>(px);
                        if constexpr (kRun == 2) {
                            smp.sample(px2, false, true);
                            smp.advance();
                            if (clamp_whole) limit<Dst, Odd::n>(px2);
                            Family::template whole<Dst, Even>(c, d, dst_alpha<Family>(c, x), px);
                            Family::template whole<Dst, Odd>(c, dst_pixel<Dst>(c, x + 1), dst_alpha<Family>(c, x + 1),
                                                             px2);
                        } else {
                            Family::template whole<Dst, Even>(c, d, dst_alpha<Family>(c, x), px);
                        }
                        x += kRun;
                        d = dst_pixel<Dst>(c, x);
                    }
                }
            }
            if (rem == 0) return;
            hc = (rem < 0x10000 ? rem : 0x10000);
        }
        const bool even = is_even<Dst>(d);
        smp.sample(px, even, false);
        smp.advance();
        if (clamp) limit<Dst, Even::n>(px);
        const int32_t w = Family::template weight<Dst>(c, hc);
        if (even)
            Family::template partial<Dst, Even>(c, d, dst_alpha<Family>(c, x), px, w);
        else
            Family::template partial<Dst, Odd>(c, d, dst_alpha<Family>(c, x), px, w);
        rem -= hc;
        if (rem == 0) return;
        ++x;
        d = dst_pixel<Dst>(c, x);
        hc = (rem < 0x10000 ? rem : 0x10000);
    }
}

// The main kernels of the source-alpha tables in slots 2 to 5: the fast form
// in buffer units at `clamp` 0 and full level, the general form otherwise.
template <class Dst, class Sampler, class FastSampler, class Family, class FastFamily, bool RunInPairs>
void fast_or_general_C(const MapContext& c, const StripRecord& s)
{
    if (!c.clamp && c.level == 4096)
        main_kernel_C<Dst, FastSampler, FastFamily, RunInPairs>(c, s);
    else
        main_kernel_C<Dst, Sampler, Family, RunInPairs>(c, s);
}

// Slots 0 and 1: paint a constant region with the first (slot 0) or last
// (slot 1) valid sample of the buffer. The samples are read once and brought
// to stored depth by truncation (x >> 5 or x >> 3, no rounding term); the
// family then limits them and handles source alpha, and every pixel takes
// its partial rule.
//
// Slot 0 reads pixel `pad_left` (chroma: elements 2 pad_left + 1 and + 3);
// slot 1 reads pixel `last` (chroma: elements 2 last - 1 and 2 last + 1). For a
// source of odd width, `last` is even and those two elements are the chroma of
// the previous pair and of the last one: the region takes them as they stand.
template <class Dst, class Family, bool Right>
void region_C(const MapContext& c, const StripRecord& s)
{
    const int32_t at = Right ? s.last : s.pad_left;
    const int32_t first_x = Right ? s.right_x : s.left_x;
    int32_t hc = Right ? s.right_first_cover : s.left_first_cover;
    int32_t rem = Right ? s.right_width16 : s.left_width16;

    Px px{};
    if constexpr (Dst::pairs) {
        px.s[0] = c.line[2 * at];
        px.s[1] = Right ? c.line[2 * at - 1] : c.line[2 * at + 1];
        px.s[2] = Right ? c.line[2 * at + 1] : c.line[2 * at + 3];
    } else {
        for (int e = 0; e < Dst::colour_samples; ++e) px.s[e] = c.line[4 * at + e];
    }
    for (int e = 0; e < 4; ++e) px.s[e] >>= Dst::buffer_shift;
    if constexpr (Family::source_alpha) px.a = c.line_a[at];
    if (!Family::template region_setup<Dst>(c, px)) return;

    for (int32_t x = first_x;; ++x) {
        auto* d = dst_pixel<Dst>(c, x);
        const int32_t w = Family::template weight<Dst>(c, hc);
        if (is_even<Dst>(d))
            Family::template region_pixel<Dst, FullShape<Dst>>(c, d, dst_alpha<Family>(c, x), px, w);
        else
            Family::template region_pixel<Dst, LumaShape<Dst>>(c, d, dst_alpha<Family>(c, x), px, w);
        rem -= hc;
        if (rem <= 0) return;
        hc = (rem < 0x10000 ? rem : 0x10000);
    }
}

// Slot 12: the main kernel of horizontal kind 7 draws nothing; only the
// constant regions of such a call are drawn.
inline void empty_C(const MapContext&, const StripRecord&) {}

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
