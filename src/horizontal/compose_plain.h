// Plain composition: neither source alpha nor a destination alpha plane
// (tables H_YUY2, H_W210, H_RGBQ).
//
// With S the computed sample in stored depth (limited to 0..M first when the
// call clamps), D the destination sample, L the level (4096 = 1.0), c the
// 14-bit weight of a partly covered pixel and o the sample's black or neutral
// offset:
//
//   whole pixel, L = 4096:   D' = S
//   whole pixel, other L:    D' = (D (4096 - L) + S L + 2048) >> 12
//   partial, overlay:        D' = (D (16384 - c) + S c + 8192) >> 14
//   partial, tile:           D' = clamp(D + (((S - o) c + 8192) >> 14))
//
// Overlay is a plain mix of in-range values and is not clamped. Tile adds the
// contribution above black or neutral, so two tiles whose coverages sum to
// one add up to the whole sample over a black destination; a whole pixel in
// tile mode replaces D (tile acts at partly covered pixels only). A level
// above 4096 is a gain and runs through the same arithmetic; stores keep the
// low bits of the result.
#pragma once

#include "shared/isa.h"

#include "horizontal/pixel.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

struct PlainFamily : FamilyTraits<false> {
    static constexpr bool plain = true;

    // The RGBQ bank kernels of 4 taps and more limit the sample of a whole
    // pixel at full level whatever `clamp` says.
    template <class Dst, class Sampler>
    static constexpr bool clamp_whole_at_full_level()
    {
        return !Dst::pairs && Sampler::taps >= 4;
    }

    template <class Dst, class Shape>
    static void whole(const MapContext& c, typename Dst::sample* d, uint16_t*, const Px& px)
    {
        using T = typename Dst::sample;
        if (c.level == 4096) {
            for (int i = 0; i < Shape::n; ++i) d[Shape::at[i]] = T(px.s[i]);
        } else {
            const int32_t l = c.level;
            for (int i = 0; i < Shape::n; ++i) {
                const int32_t D = d[Shape::at[i]];
                d[Shape::at[i]] = T((D * (4096 - l) + px.s[i] * l + 2048) >> 12);
            }
        }
    }

    // `w` is the 14-bit weight c14 of the pixel.
    template <class Dst, class Shape>
    static void partial(const MapContext& c, typename Dst::sample* d, uint16_t*, const Px& px, int32_t w)
    {
        using T = typename Dst::sample;
        for (int i = 0; i < Shape::n; ++i) {
            const int32_t D = d[Shape::at[i]];
            if (c.tile) {
                const int32_t o = offset_of<Dst, Shape>(i);
                d[Shape::at[i]] = T(clamp_to(D + (((px.s[i] - o) * w + 8192) >> 14), 0, Dst::max));
            } else {
                d[Shape::at[i]] = T((D * (16384 - w) + px.s[i] * w + 8192) >> 14);
            }
        }
    }

    // Constant regions: the samples are limited, then every pixel takes the
    // partial rule. In tile mode the RGBQ regions carry a running sum: after
    // a pixel's four sums are stored, clamped, the unclamped sums become the
    // samples of the next pixel; this compounding is intended.
    template <class Dst>
    static bool region_setup(const MapContext&, Px& px)
    {
        for (int e = 0; e < 4; ++e) px.s[e] = clamp_to(px.s[e], 0, Dst::max);
        return true;
    }

    template <class Dst, class Shape>
    static void region_pixel(const MapContext& c, typename Dst::sample* d, uint16_t* da, Px& px, int32_t w)
    {
        if constexpr (!Dst::pairs) {
            if (c.tile) {
                for (int e = 0; e < 4; ++e) {
                    const int32_t sum = int32_t(uint32_t(d[e]) + uint32_t(mul_round_wrap(px.s[e], w, 8192, 14)));
                    d[e] = typename Dst::sample(clamp_to(sum, 0, Dst::max));
                    px.s[e] = sum;
                }
                return;
            }
        }
        partial<Dst, Shape>(c, d, da, px, w);
    }
};

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
