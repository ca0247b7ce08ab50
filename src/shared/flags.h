// Decoding of the 32-bit operation flags word of the rectangle operations.
#pragma once

#include <cstdint>

namespace lorvex {

struct OpFlags {
    bool source_even_field;  // bit 2; wins over bit 3
    bool source_odd_field;   // bit 3 (false when bit 2 is set)
    bool tile;               // bit 4
    bool dest_even_field;    // bit 6; wins over bit 7
    bool dest_odd_field;     // bit 7 (false when bit 6 is set)
    int hfilter;             // bits 8-10
    int vfilter;             // bits 11-13
    int chroma_soften;       // bits 14-15, unsigned 0..3
    int level;               // opacity, 4096 = 1.0, multiple of 4 in 0..8188
    int vsoften_numerator;   // (8 + n) with n the signed bits 29-31: 4..11
};

// The level field holds the opacity less 4096 in 13-bit two's complement; the
// two lowest bits are dropped, so 0x1000..0x1003 all mean "draw nothing".
constexpr int decode_level(int32_t flags)
{
    return ((flags >> 16) - 4096) & 0x1FFC;
}

// Top three bits 0..7 give numerators 8, 9, 10, 11, 4, 5, 6, 7.
constexpr int decode_vsoften_numerator(int32_t flags)
{
    return (((flags >> 29) - 4) & 7) + 4;
}

constexpr OpFlags decode_flags(int32_t flags)
{
    OpFlags f{};
    f.source_even_field = (flags & 0x4) != 0;
    f.source_odd_field = !f.source_even_field && (flags & 0x8) != 0;
    f.tile = (flags & 0x10) != 0;
    f.dest_even_field = (flags & 0x40) != 0;
    f.dest_odd_field = !f.dest_even_field && (flags & 0x80) != 0;
    f.hfilter = (flags >> 8) & 7;
    f.vfilter = (flags >> 11) & 7;
    f.chroma_soften = (flags >> 14) & 3;
    f.level = decode_level(flags);
    f.vsoften_numerator = decode_vsoften_numerator(flags);
    return f;
}

}  // namespace lorvex
