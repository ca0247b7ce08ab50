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

#include <algorithm>

#include "horizontal/pixel.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {

template <class Dst>
inline typename Dst::sample* dst_pixel(const MapContext& c, int32_t x)
{
    return reinterpret_cast<typename Dst::sample*>(c.dst_line + ptrdiff_t(x) * Dst::bytes_per_pixel);
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

// Slots 2..11: the walk, with Sampler computing the samples and Family
// compositing them.
template <class Dst, class Sampler, class Family, bool RunInPairs>
void main_kernel_C(const MapContext& c, const StripRecord& s)
{
    using Even = std::conditional_t<Dst::pairs, ShapeEven, ShapeQuad>;
    using Odd = std::conditional_t<Dst::pairs, ShapeOdd, ShapeQuad>;
    constexpr int kRun = RunInPairs ? 2 : 1;
    constexpr int kRunShift = RunInPairs ? 17 : 16;
    constexpr int32_t kRunWidth = 0x10000 * kRun;

    int32_t x = s.x;
    auto* d = dst_pixel<Dst>(c, x);
    Sampler smp(c, s, is_even<Dst>(d));
    const bool clamp = c.clamp || Sampler::always_clamp;
    const bool clamp_whole = clamp || (Sampler::clamp_whole_at_full_level && c.level == 4096);
    const bool full_line = c.vcover == 16384;
    int32_t hc = s.first_cover;
    int32_t rem = s.width16;
    Px px{}, px2{};

    for (;;) {
        if (full_line && hc == 0x10000 && is_even<Dst>(d)) {
            if (rem >= kRunWidth) {
                const int32_t n = rem >> kRunShift;
                rem &= (1 << kRunShift) - 1;
                for (int32_t k = 0; k < n; ++k) {
                    smp.sample(px, true);
                    smp.advance();
                    if (clamp_whole) limit<Dst, Even::n>(px);
                    if constexpr (kRun == 2) {
                        smp.sample(px2, false);
                        smp.advance();
                        if (clamp_whole) limit<Dst, Odd::n>(px2);
                        Family::template whole<Dst, Even>(c, d, dst_alpha<Family>(c, x), px);
                        Family::template whole<Dst, Odd>(c, d + Dst::bytes_per_pixel / sizeof(*d),
                                                         dst_alpha<Family>(c, x + 1), px2);
                    } else {
                        Family::template whole<Dst, Even>(c, d, dst_alpha<Family>(c, x), px);
                    }
                    x += kRun;
                    d = dst_pixel<Dst>(c, x);
                }
            }
            if (rem == 0) return;
            hc = std::min(rem, 0x10000);
        }
        const bool even = is_even<Dst>(d);
        smp.sample(px, even);
        smp.advance();
        if (clamp) limit<Dst, 4>(px);
        const int32_t w = Family::template weight<Dst>(c, hc);
        if (!Dst::pairs || even)
            Family::template partial<Dst, Even>(c, d, dst_alpha<Family>(c, x), px, w);
        else
            Family::template partial<Dst, Odd>(c, d, dst_alpha<Family>(c, x), px, w);
        rem -= hc;
        if (rem == 0) return;
        ++x;
        d = dst_pixel<Dst>(c, x);
        hc = std::min(rem, 0x10000);
    }
}

// Slots 0 and 1: paint a constant region with the first (slot 0) or last
// (slot 1) valid sample of the buffer. The samples are read once and brought
// to stored depth by truncation (x >> 5 or x >> 3, no rounding term), then
// limited to 0..M; every pixel takes the partial-pixel rule.
//
// Slot 0 reads pixel `pad_left` (chroma: elements 2 pad_left + 1 and + 3);
// slot 1 reads pixel `last` (chroma: elements 2 last - 1 and 2 last + 1). For a
// source of odd width, `last` is even and those two elements are the chroma of
// the previous pair and of the last one: the region takes them as they stand.
//
// In tile mode the RGBQ regions carry a running sum: after a pixel's four
// sums are stored, clamped, the unclamped sums become the samples of the next
// pixel. This compounding is intended.
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
        for (int e = 0; e < 4; ++e) px.s[e] = c.line[4 * at + e];
    }
    for (int e = 0; e < 4; ++e) px.s[e] = clamp_to(px.s[e] >> Dst::buffer_shift, 0, Dst::max);

    constexpr bool running = !Dst::pairs && Family::running_tile_regions;
    for (int32_t x = first_x;; ++x) {
        auto* d = dst_pixel<Dst>(c, x);
        const int32_t w = Family::template weight<Dst>(c, hc);
        if (running && c.tile) {
            for (int e = 0; e < 4; ++e) {
                const int32_t sum = d[e] + ((px.s[e] * w + 8192) >> 14);
                d[e] = typename Dst::sample(clamp_to(sum, 0, Dst::max));
                px.s[e] = sum;
            }
        } else if (!Dst::pairs || is_even<Dst>(d)) {
            using Even = std::conditional_t<Dst::pairs, ShapeEven, ShapeQuad>;
            Family::template partial<Dst, Even>(c, d, dst_alpha<Family>(c, x), px, w);
        } else {
            Family::template partial<Dst, ShapeOdd>(c, d, dst_alpha<Family>(c, x), px, w);
        }
        rem -= hc;
        if (rem <= 0) return;
        hc = std::min(rem, 0x10000);
    }
}

// Slot 12: the main kernel of horizontal kind 7 draws nothing; only the
// constant regions of such a call are drawn.
inline void empty_C(const MapContext&, const StripRecord&) {}

}  // namespace lorvex::horizontal
