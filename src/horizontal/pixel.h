// What passes between a horizontal sampler and a composition family: the
// samples of one destination pixel, and where they go in the destination.
#pragma once

#include "shared/isa.h"

#include <cstdint>

#include "shared/formats.h"

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

template <class Dst, class Shape>
constexpr int32_t offset_of(int i)
{
    return Shape::chroma[i] ? Dst::chroma_offset : Dst::luma_offset;
}

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex::horizontal
