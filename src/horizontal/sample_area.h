// The area sampler (slot 2): each destination pixel is the exact box average
// of the buffer samples under it.
//
// Units: `hstep` (w) is the width of one buffer sample in destination 16.16
// units (at least 128), and the strip's `phase` is where the first destination
// pixel begins on that scale, so sample n occupies [n w, (n + 1) w). There is
// no position per pixel: the walk keeps the width r still unused of the
// current sample, so no error builds up along a line.
//
// Luma: every destination pixel consumes exactly 0x10000 of width, whatever
// its coverage (coverage weighs the result, not the span); the weights n sum
// to 0x10000 and S = (sum + half) >> (16 + buffer shift).
//
// Chroma (4:2:2): chroma sample j is 2w wide and centred on even sample 2j, so
// its box runs from half a sample before that sample's start. The box of a
// destination pair runs from half a pixel before the even pixel's start:
// v = phase + w / 2, less 0x8000 when the strip's first pixel is even and
// plus 0x8000 when it is odd (the first chroma span then belongs to the next
// pixel). Index v / 2w and remainder r2 = 2w - v mod 2w by truncating
// division; a negative v makes the first chroma sample last longer. Even
// pixels consume 0x20000 of chroma width, odd pixels none.
//
// RGBQ: the four samples of a pixel share the luma walk.
#pragma once

#include "horizontal/pixel.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {

template <class Dst>
struct AreaSampler {
    static constexpr bool always_clamp = false;
    static constexpr bool clamp_whole_at_full_level = false;

    const int16_t* line;
    int32_t w;
    int32_t p;   // current luma sample (pixel index)
    int32_t r;   // width of it still to use
    int32_t p2;  // current chroma pair
    int32_t r2;

    AreaSampler(const MapContext& c, const StripRecord& s, bool first_even) : line(c.line), w(c.hstep)
    {
        p = s.phase / w;
        r = w - s.phase % w;
        if constexpr (Dst::pairs) {
            const int32_t w2 = 2 * w;
            const int32_t v = s.phase + w / 2 + (first_even ? -0x8000 : 0x8000);
            p2 = v / w2;
            r2 = w2 - v % w2;
        } else {
            p2 = 0;
            r2 = 0;
        }
    }

    void sample(Px& px, bool with_chroma)
    {
        constexpr int N = Dst::pairs ? 1 : 4;
        constexpr int E = Dst::pairs ? 2 : 4;
        int64_t acc[N];
        for (int e = 0; e < N; ++e) acc[e] = int64_t(1) << (15 + Dst::buffer_shift);
        int32_t span = 0x10000;
        do {
            const int32_t n = r < span ? r : span;
            for (int e = 0; e < N; ++e) acc[e] += int64_t(line[p * E + e]) * n;
            span -= n;
            r -= n;
            if (r == 0) {
                ++p;
                r = w;
            }
        } while (span != 0);
        for (int e = 0; e < N; ++e) px.s[e] = int32_t(acc[e] >> (16 + Dst::buffer_shift));

        if constexpr (Dst::pairs) {
            if (!with_chroma) return;
            int64_t cb = int64_t(1) << (16 + Dst::buffer_shift), cr = cb;
            int32_t cspan = 0x20000;
            do {
                const int32_t n = r2 < cspan ? r2 : cspan;
                cb += int64_t(line[4 * p2 + 1]) * n;
                cr += int64_t(line[4 * p2 + 3]) * n;
                cspan -= n;
                r2 -= n;
                if (r2 == 0) {
                    ++p2;
                    r2 = 2 * w;
                }
            } while (cspan != 0);
            px.s[1] = int32_t(cb >> (17 + Dst::buffer_shift));
            px.s[2] = int32_t(cr >> (17 + Dst::buffer_shift));
        }
    }

    void advance() {}
};

}  // namespace lorvex::horizontal
