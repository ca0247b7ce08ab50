// What passes between a horizontal sampler and a composition family: the
// samples of one destination pixel, and where they go in the destination.
#pragma once

#include "shared/isa.h"

#include <cstdint>

#include "shared/formats.h"
#include "shared/map_context.h"

namespace lorvex::horizontal {
inline namespace LORVEX_ISA_NAMESPACE {

// The samples computed for one destination pixel. 4:2:2: s[0] luma, s[1] Cb,
// s[2] Cr (chroma only on even pixels). RGBQ: s[0..3]. `a` is source alpha
// where the table has it.
struct Px {
    int32_t s[4];
    int32_t a;
};

// Where the samples of a pixel stand in the destination, relative to the
// pixel's address (in samples of the destination's depth), and whether each
// takes the luma or the chroma offset.
struct ShapeEven {  // even pixel of a pair: its luma, and the pair's Cb and Cr
    static constexpr int n = 3;
    static constexpr int at[3] = {0, 1, 3};
    static constexpr bool chroma[3] = {false, true, true};
};
struct ShapeOdd {  // odd pixel of a pair: its luma only
    static constexpr int n = 1;
    static constexpr int at[1] = {0};
    static constexpr bool chroma[1] = {false};
};
struct ShapeQuad {  // RGBQ: four samples alike
    static constexpr int n = 4;
    static constexpr int at[4] = {0, 1, 2, 3};
    static constexpr bool chroma[4] = {false, false, false, false};
};

struct ShapeNone {  // alpha-only images: no colour samples
    static constexpr int n = 0;
    static constexpr int at[1] = {0};
    static constexpr bool chroma[1] = {false};
};

// What the walk asks of a composition family, with the common answers; each
// family states where it differs. Weight12 picks the 12-bit weight c12 of a
// partly covered pixel (tables with a destination alpha plane or alpha only)
// over the 14-bit c14.
template <bool Weight12>
struct FamilyTraits {
    static constexpr bool dest_alpha = false;     // writes the destination's alpha plane
    static constexpr bool source_alpha = false;   // reads the buffer's alpha section
    static constexpr bool plain = false;          // the plain whole-pixel rule
    static constexpr bool fast_alpha = false;     // the fast source-alpha rule
    static constexpr bool general_alpha = false;  // the general source-alpha rule
    static constexpr bool clamps_always = false;  // limits every sample whatever `clamp` says
    static constexpr int unclamped_max_taps = 8;  // more taps than this always limit

    template <class Dst, class Sampler>
    static constexpr bool clamp_whole_at_full_level()
    {
        return false;
    }

    template <class Dst>
    static int32_t weight(const MapContext& c, int32_t hc)
    {
        return Weight12 ? weight_c12(hc, c.vcover, c.level) : weight_c14(hc, c.vcover, c.level);
    }
};

template <class Dst, class Shape>
constexpr int32_t offset_of(int i)
{
    return Shape::chroma[i] ? Dst::chroma_offset : Dst::luma_offset;
}

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
