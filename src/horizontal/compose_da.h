// Composition of a source without alpha into a destination with an alpha
// plane (tables H_YUY2_DA, H_W210_DA, H_RGBQ_DA). Source pixels count as
// opaque. Dα is the destination's alpha word (4096 = 1.0); its colour is
// premultiplied when `dst_assoc` is 2 and straight otherwise. L is the level,
// c the 12-bit weight of a partly covered pixel, o the sample's offset, and
// / divides truncating toward zero.
//
// Whole pixel:
//   L = 4096                      Dα' = 4096    D' = S
//   tile, premultiplied           Dα' = L       D' = (((S - o) L + 2048) >> 12) + o
//   tile, straight                Dα' = L       D' = S
//   overlay, premultiplied        Dα' = ((Dα (4096 - L) + 2048) >> 12) + L
//                                 D'  = (D (4096 - L) + S L + 2048) >> 12
//   overlay, straight             d = ((4096 - L) Dα + 2048) >> 12, t = d + L
//                                 Dα' = t       D' = clamp((D d + S L + t/2) / t)
// A wholly covered pixel in tile mode belongs to this tile alone.
//
// Partly covered pixel:
//   tile, premultiplied           Dα' = Dα + c  D' = D + (((S - o) c + 2048) >> 12), not clamped
//   tile, straight (c > 0)        t = Dα + c    D' = (D Dα + S c + t/2) / t
//   overlay, premultiplied        Dα' = ((Dα (4096 - c) + 2048) >> 12) + c
//                                 D'  = (D (4096 - c) + S c + 2048) >> 12
//   overlay, straight (c > 0)     d = ((4096 - c) Dα + 2048) >> 12, t = d + c
//                                 Dα' = t       D' = (D d + S c + t/2) / t, not clamped
// With c = 0 the straight rows write nothing. Chroma of a pair takes the same
// weights; where luma divides, chroma is divided by the new Dα. The alpha word
// is never clamped: in tile mode it adds up and may exceed 4096.
#pragma once

#include "shared/isa.h"

#include "horizontal/pixel.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

struct DestAlphaFamily : FamilyTraits<true> {
    static constexpr bool dest_alpha = true;

    template <class Dst, class Shape>
    static void whole(const MapContext& c, typename Dst::sample* d, uint16_t* da, const Px& px)
    {
        using T = typename Dst::sample;
        const int32_t L = c.level;
        if (L == 4096) {
            *da = 4096;
            for (int i = 0; i < Shape::n; ++i) d[Shape::at[i]] = T(px.s[i]);
            return;
        }
        const bool pre = c.dst_assoc == 2;
        if (c.tile) {
            *da = uint16_t(L);
            for (int i = 0; i < Shape::n; ++i) {
                const int32_t o = offset_of<Dst, Shape>(i);
                d[Shape::at[i]] = T(pre ? (((px.s[i] - o) * L + 2048) >> 12) + o : px.s[i]);
            }
            return;
        }
        const int32_t Da = *da;
        if (pre) {
            *da = uint16_t(((Da * (4096 - L) + 2048) >> 12) + L);
            for (int i = 0; i < Shape::n; ++i) {
                const int32_t D = d[Shape::at[i]];
                d[Shape::at[i]] = T((D * (4096 - L) + px.s[i] * L + 2048) >> 12);
            }
        } else {
            const int32_t dd = ((4096 - L) * Da + 2048) >> 12;
            const int32_t t = dd + L;
            *da = uint16_t(t);
            for (int i = 0; i < Shape::n; ++i) {
                const int32_t D = d[Shape::at[i]];
                d[Shape::at[i]] = T(clamp_to((D * dd + px.s[i] * L + t / 2) / t, 0, Dst::max));
            }
        }
    }

    template <class Dst, class Shape>
    static void partial(const MapContext& c, typename Dst::sample* d, uint16_t* da, const Px& px, int32_t w)
    {
        using T = typename Dst::sample;
        const bool pre = c.dst_assoc == 2;
        const int32_t Da = *da;
        if (c.tile) {
            if (pre) {
                *da = uint16_t(Da + w);
                for (int i = 0; i < Shape::n; ++i) {
                    const int32_t o = offset_of<Dst, Shape>(i);
                    const int32_t D = d[Shape::at[i]];
                    d[Shape::at[i]] = T(D + (((px.s[i] - o) * w + 2048) >> 12));
                }
            } else if (w != 0) {
                const int32_t t = Da + w;
                *da = uint16_t(t);
                for (int i = 0; i < Shape::n; ++i) {
                    const int32_t D = d[Shape::at[i]];
                    d[Shape::at[i]] = T((D * Da + px.s[i] * w + t / 2) / t);
                }
            }
            return;
        }
        if (pre) {
            *da = uint16_t(((Da * (4096 - w) + 2048) >> 12) + w);
            for (int i = 0; i < Shape::n; ++i) {
                const int32_t D = d[Shape::at[i]];
                d[Shape::at[i]] = T((D * (4096 - w) + px.s[i] * w + 2048) >> 12);
            }
        } else if (w != 0) {
            const int32_t dd = ((4096 - w) * Da + 2048) >> 12;
            const int32_t t = dd + w;
            *da = uint16_t(t);
            for (int i = 0; i < Shape::n; ++i) {
                const int32_t D = d[Shape::at[i]];
                d[Shape::at[i]] = T((D * dd + px.s[i] * w + t / 2) / t);
            }
        }
    }

    // Constant regions: limited samples, the partial rule on every pixel.
    template <class Dst>
    static bool region_setup(const MapContext&, Px& px)
    {
        for (int e = 0; e < 4; ++e) px.s[e] = clamp_to(px.s[e], 0, Dst::max);
        return true;
    }

    template <class Dst, class Shape>
    static void region_pixel(const MapContext& c, typename Dst::sample* d, uint16_t* da, Px& px, int32_t w)
    {
        partial<Dst, Shape>(c, d, da, px, w);
    }
};

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
