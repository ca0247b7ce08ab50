// Sample layouts as the kernels see them: what stands in memory, the offsets
// and limits of each stored depth, and the shifts that move a sample into the
// line buffer's 13-bit unit and back out (8-bit x 32, 10-bit x 8, alpha x 4).
#pragma once

#include <cstdint>

#include "shared/isa.h"

namespace lorvex {

constexpr int kLineBufferElements = 16384;

// Limit table by stored depth.
struct Depth8 {
    using sample = uint8_t;
    static constexpr int bits = 8;
    static constexpr int luma_offset = 16;
    static constexpr int chroma_offset = 128;
    static constexpr int max = 255;
    static constexpr int buffer_shift = 5;  // into the buffer: << 5; out: (x + 16) >> 5
};

struct Depth10 {
    using sample = uint16_t;
    static constexpr int bits = 10;
    static constexpr int luma_offset = 64;
    static constexpr int chroma_offset = 512;
    static constexpr int max = 1023;
    static constexpr int buffer_shift = 3;  // into the buffer: << 3; out: (x + 4) >> 3
};

// ---------------------------------------------------------------------------
// Source layouts, read by the vertical stage.
//   elements_per_pixel: buffer elements per pixel in `line` (1 for alpha, which
//     goes to `line_a`);
//   pairs: 4:2:2, the element range is rounded up to whole pairs;
//   buffer_shift: one line enters the buffer as sample << buffer_shift;
//   sum_shift: a sum of samples times weights summing to 16384 leaves as
//     sum >> sum_shift (14 - buffer_shift);
//   box16_limit: how many middle lines of a box sum still fit 16 bits.
// ---------------------------------------------------------------------------
struct SrcYuy2 {
    using sample = uint8_t;
    static constexpr int elements_per_pixel = 2;
    static constexpr bool pairs = true;
    static constexpr bool second_plane = false;
    static constexpr int buffer_shift = 5;
    static constexpr int sum_shift = 9;
    static constexpr int box16_limit = 126;  // 126 * 255 = 32130
    // Premultiplying: ((v - offset) * a) >> premul_shift, relative to black or
    // neutral, which stand at 512 and 4096 in the buffer at any alpha.
    static constexpr int luma_offset = 16, chroma_offset = 128;
    static constexpr int luma_base = 512, chroma_base = 4096;
    static constexpr int premul_shift = 7;
};

struct SrcW210 {
    using sample = uint16_t;
    static constexpr int elements_per_pixel = 2;
    static constexpr bool pairs = true;
    static constexpr bool second_plane = false;
    static constexpr int buffer_shift = 3;
    static constexpr int sum_shift = 11;
    static constexpr int box16_limit = 30;  // 30 * 1023 = 30690
    static constexpr int luma_offset = 64, chroma_offset = 512;
    static constexpr int luma_base = 512, chroma_base = 4096;
    static constexpr int premul_shift = 9;
};

struct SrcRgbq {
    using sample = uint8_t;
    static constexpr int elements_per_pixel = 4;
    static constexpr bool pairs = false;
    static constexpr bool second_plane = false;
    static constexpr int buffer_shift = 5;
    static constexpr int sum_shift = 9;
    static constexpr int box16_limit = 126;
    static constexpr int luma_offset = 0, chroma_offset = 0;  // no offsets
    static constexpr int luma_base = 0, chroma_base = 0;
    static constexpr int premul_shift = 7;
};

// The second plane alone (alpha words, 4096 = 1.0), into `line_a`.
struct SrcAlpha {
    using sample = uint16_t;
    static constexpr int elements_per_pixel = 1;
    static constexpr bool pairs = false;
    static constexpr bool second_plane = true;
    static constexpr int buffer_shift = 2;
    static constexpr int sum_shift = 12;
    static constexpr int box16_limit = 0;  // always the 32-bit path
};

// ---------------------------------------------------------------------------
// Destination layouts, written by the horizontal stage.
//   parity_mask: the address bit that tells an even pixel of a pair from an
//     odd one (bit 1 for YUY2, bit 2 for W210); 0 where there are no pairs.
// ---------------------------------------------------------------------------
//   colour_samples: samples per pixel computed from the buffer's colour
//     section (4:2:2: the luma; chroma comes with the even pixel);
//   alpha_only: the image is the second plane.
struct DstYuy2 : Depth8 {
    static constexpr int bytes_per_pixel = 2;
    static constexpr bool pairs = true;
    static constexpr uintptr_t parity_mask = 2;
    static constexpr int colour_samples = 1;
    static constexpr bool alpha_only = false;
};

struct DstW210 : Depth10 {
    static constexpr int bytes_per_pixel = 4;
    static constexpr bool pairs = true;
    static constexpr uintptr_t parity_mask = 4;
    static constexpr int colour_samples = 1;
    static constexpr bool alpha_only = false;
};

struct DstRgbq : Depth8 {
    static constexpr int bytes_per_pixel = 4;
    static constexpr bool pairs = false;
    static constexpr uintptr_t parity_mask = 0;
    static constexpr int luma_offset = 0;  // RGBQ has no offsets
    static constexpr int chroma_offset = 0;
    static constexpr int colour_samples = 4;
    static constexpr bool alpha_only = false;
};

// An image that is alpha alone: the destination's second plane, u16 words.
struct DstAlpha {
    using sample = uint16_t;
    static constexpr int bytes_per_pixel = 2;
    static constexpr bool pairs = false;
    static constexpr uintptr_t parity_mask = 0;
    static constexpr int luma_offset = 0, chroma_offset = 0;
    static constexpr int max = 65535;
    static constexpr int buffer_shift = 2;
    static constexpr int colour_samples = 0;
    static constexpr bool alpha_only = true;
};

inline namespace LORVEX_ISA_NAMESPACE {

// Rounding of buffer samples on their way out, by the sum of the weights that
// mixed them: a single sample, weights summing to 0x10000 (linear and area
// luma), 0x20000 (their chroma) and 16384 (bank coefficients). Shift is the
// unit of the result: 5 for 8-bit samples, 3 for 10-bit samples, 2 for alpha
// in 1/4096, 0 for buffer units (and alpha in 1/16384).
template <int Shift>
constexpr int32_t mix1(int32_t x)
{
    if constexpr (Shift == 0)
        return x;
    else
        return (x + (1 << (Shift - 1))) >> Shift;
}
template <int Shift>
constexpr int32_t mix_w16(int64_t s)
{
    return int32_t((s + (int64_t(1) << (15 + Shift))) >> (16 + Shift));
}
template <int Shift>
constexpr int32_t mix_w17(int64_t s)
{
    return int32_t((s + (int64_t(1) << (16 + Shift))) >> (17 + Shift));
}
template <int Shift>
constexpr int32_t mix_bank(int32_t s)
{
    return (s + (1 << (13 + Shift))) >> (14 + Shift);
}

// Effective weight of a partly covered pixel. hc: horizontal coverage, 16.16,
// at most 0x10000; vcover: at most 16384; level: 4096 = 1.0. Both forms round
// the area to nearest before applying the level.
constexpr int32_t weight_c14(int32_t hc, int32_t vcover, int32_t level)
{
    return ((((hc * vcover + 32767) >> 16) * level) + 2048) >> 12;  // 16384 = 1.0
}
constexpr int32_t weight_c12(int32_t hc, int32_t vcover, int32_t level)
{
    return ((((hc * vcover + 0x1ffff) >> 18) * level) + 2048) >> 12;  // 4096 = 1.0
}

template <class T>
constexpr T clamp_to(T v, T lo, T hi)
{
    return v < lo ? lo : (v > hi ? hi : v);
}

// (a b + round) >> shift in 32 bits that wrap instead of overflowing: the
// running sums of the tiled constant regions compound from pixel to pixel and,
// with a level above 1.0, can outgrow 32 bits; they then wrap as 32-bit
// arithmetic does.
constexpr int32_t mul_round_wrap(int32_t a, int32_t b, int32_t round, int shift)
{
    return int32_t(uint32_t(a) * uint32_t(b) + uint32_t(round)) >> shift;
}

constexpr int16_t saturate_i16(int32_t v)
{
    return int16_t(v < -32768 ? -32768 : (v > 32767 ? 32767 : v));
}

}  // namespace LORVEX_ISA_NAMESPACE
}  // namespace lorvex
