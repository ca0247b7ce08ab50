// The operation flags word: opacity with its two dropped bits, the vertical
// softening numerator, the precedence of the field bits, and the header's
// flag builders, which must decode to what they were given.
#include <gtest/gtest.h>

#include <cstdint>
#include <vector>

#include "lorvex.h"
#include "shared/flags.h"

namespace lorvex {
namespace {

int32_t level_field(uint32_t field) { return int32_t(field << 16); }

TEST(Flags, LevelIsOpacityLess4096WithTwoBitsDropped) {
    const struct {
        uint32_t field;
        int level;
    } cases[] = {{0x0000, 4096}, {0x0003, 4096}, {0x1000, 0},    {0x1001, 0},    {0x1002, 0},
                 {0x1003, 0},    {0x1800, 2048}, {0x1801, 2048}, {0x1004, 4},    {0x1FFF, 4092},
                 {0x0004, 4100}, {0x0FFF, 8188}};  // fields 4 to 0x0FFF: a gain, not refused
    for (const auto& c : cases) {
        EXPECT_EQ(decode_level(level_field(c.field)), c.level) << std::hex << "field 0x" << c.field;
        // The neighbouring fields do not leak into the level.
        EXPECT_EQ(decode_level(int32_t(uint32_t(level_field(c.field)) | 0xE000FFFFu)), c.level)
            << std::hex << "field 0x" << c.field << " with all other bits set";
    }
}

TEST(Flags, VsoftenAndFieldPrecedence) {
    const int numerators[8] = {8, 9, 10, 11, 4, 5, 6, 7};
    for (uint32_t top = 0; top < 8; ++top) {
        EXPECT_EQ(decode_vsoften_numerator(int32_t(top << 29)), numerators[top]) << top;
        EXPECT_EQ(decode_vsoften_numerator(int32_t(top << 29 | 0x1FFFFFFFu)), numerators[top]) << top;
    }
    const struct {
        uint32_t word;
        bool se, so, de, dd;
    } cases[] = {{0x00, false, false, false, false}, {0x04, true, false, false, false},
                 {0x08, false, true, false, false},  {0x0C, true, false, false, false},
                 {0x40, false, false, true, false},  {0x80, false, false, false, true},
                 {0xC0, false, false, true, false},  {0xCC, true, false, true, false}};
    for (const auto& c : cases) {
        const OpFlags f = decode_flags(int32_t(c.word));
        EXPECT_EQ(f.source_even_field, c.se) << std::hex << c.word;
        EXPECT_EQ(f.source_odd_field, c.so) << std::hex << c.word;
        EXPECT_EQ(f.dest_even_field, c.de) << std::hex << c.word;
        EXPECT_EQ(f.dest_odd_field, c.dd) << std::hex << c.word;
    }
    // A word of 0: overlay, no field, area both ways, opaque.
    const OpFlags z = decode_flags(0);
    EXPECT_FALSE(z.tile);
    EXPECT_EQ(z.hfilter + z.vfilter + z.chroma_soften, 0);
    EXPECT_EQ(z.level, 4096);
    EXPECT_EQ(z.vsoften_numerator, 8);
}

TEST(Flags, HeaderBuildersRoundTrip) {
    for (int h = 0; h < 8; ++h)
        for (int v = 0; v < 8; ++v)
            for (int cs = 0; cs < 4; ++cs)
                for (int vsoft = -4; vsoft <= 3; ++vsoft) {
                    const uint32_t word = lorvex_flag_filters(h, v) | lorvex_flag_chroma_soften(cs) |
                                          lorvex_flag_vsoften(vsoft) | lorvex_flag_level(1024) | LORVEX_TILE |
                                          LORVEX_DEST_ODD_FIELD | LORVEX_SOURCE_EVEN_FIELD;
                    const OpFlags f = decode_flags(int32_t(word));
                    ASSERT_EQ(f.hfilter, h);
                    ASSERT_EQ(f.vfilter, v);
                    ASSERT_EQ(f.chroma_soften, cs);
                    ASSERT_EQ(f.vsoften_numerator, 8 + vsoft);
                    ASSERT_EQ(f.level, 1024);
                    ASSERT_TRUE(f.tile && f.dest_odd_field && f.source_even_field);
                    ASSERT_FALSE(f.dest_even_field || f.source_odd_field);
                }
    for (int l = 0; l <= 8191; ++l) ASSERT_EQ(decode_level(int32_t(lorvex_flag_level(l))), l & 0x1FFC) << l;
    const struct {
        double opacity;
        int level;
    } opacities[] = {{1.0, 4096}, {0.5, 2048}, {0.25, 1024}, {0.0, 0}, {-1.0, 0}, {2.0, 8188}, {5.0, 8188}};
    for (const auto& o : opacities) EXPECT_EQ(decode_level(int32_t(lorvex_flag_opacity(o.opacity))), o.level);
}

// Level 0 returns before anything else: nothing is drawn.
TEST(Flags, LevelZeroDrawsNothing) {
    constexpr int W = 6, H = 3, stride = 16;
    std::vector<uint8_t> src(stride * H), dst(stride * H);
    for (size_t i = 0; i < src.size(); ++i) {
        src[i] = uint8_t(i % 2 ? 200 : 100);
        dst[i] = uint8_t(i % 2 ? 30 : 51);
    }
    Surface s{}, d{};
    s.width = d.width = W;
    s.height = d.height = H;
    s.format = d.format = FORMAT_YUY2;
    s.stride = d.stride = stride;
    s.data = src.data();
    d.data = dst.data();

    const std::vector<uint8_t> before = dst;
    for (uint32_t field : {0x1000u, 0x1001u, 0x1002u, 0x1003u}) {
        map_rectangle(&d, 0, 0, W, H, &s, 0, 0, W, H, level_field(field), 0, 1);
        EXPECT_EQ(dst, before) << std::hex << "level field 0x" << field;
    }
}

}  // namespace
}  // namespace lorvex
