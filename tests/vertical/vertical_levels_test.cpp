// The vector vertical kernels give the same bytes as the scalar kernels: for
// every vector level this processor has, every slot with a vector form, random
// rows of every width from 1 to twice the widest register plus one, every tap
// count and phase, both buffer offsets and random box weights.
#include <gtest/gtest.h>

#include <random>
#include <vector>

#include "shared/banks.h"
#include "shared/map_context.h"
#include "shared/simd.h"
#include "vertical/straight_kernels.h"
#include "vertical/vertical_kernels.h"

namespace lorvex {
namespace {

struct Case {
    const char* name;
    const VerticalKernelTable* table;
    int elements;   // per pixel
    bool pairs;
    bool words;     // 16-bit samples
    int max_sample;
    bool alpha;     // the second plane, into line_a
};

const Case kCases[] = {
    {"V_YUY2", &V_YUY2, 2, true, false, 255, false},
    {"V_W210", &V_W210, 2, true, true, 1023, false},
    {"V_RGBQ", &V_RGBQ, 4, false, false, 255, false},
    {"V_ALPHA", &V_ALPHA, 1, false, true, 4096, true},
};

// Slots that have vector forms.
const int kVectorSlots[] = {2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16, 17, 18, 19, 20, 21};

std::vector<SimdLevel> vector_levels()
{
    std::vector<SimdLevel> levels;
    for (SimdLevel l : {SimdLevel::sse41, SimdLevel::avx2})
        if (int(l) <= int(detected_simd_level())) levels.push_back(l);
    return levels;
}

TEST(VerticalLevels, VectorTablesAreNotTheScalarTables)
{
    for (SimdLevel level : vector_levels())
        for (const Case& c : kCases) {
            const VerticalKernelTable* v = vertical_table_for(c.table, level);
            ASSERT_NE(v, c.table) << c.name;
            for (int slot : kVectorSlots) EXPECT_NE((*v)[slot], (*c.table)[slot]) << c.name << " slot " << slot;
            // Slots without a vector form are the same kernels in effect; the
            // null slots stay null.
            EXPECT_EQ((*v)[23], nullptr);
            EXPECT_EQ((*v)[22] == nullptr, (*c.table)[22] == nullptr);
        }
    if (vector_levels().empty()) GTEST_SKIP() << "no vector level on this processor";
}

TEST(VerticalLevels, VectorKernelsMatchScalarOnRandomRows)
{
    const auto levels = vector_levels();
    if (levels.empty()) GTEST_SKIP() << "no vector level on this processor";
    std::mt19937 rng(20261122);
    constexpr int kLines = 24, kMaxPixels = 40, kPad = 8;
    int compared = 0;
    for (const Case& c : kCases) {
        const int bytes = c.words ? 2 : 1;
        const int stride = (kMaxPixels + kPad + 2) * c.elements * bytes;
        std::vector<uint8_t> plane(size_t(stride) * kLines);
        for (int width = 1; width <= 2 * 16 + 1; ++width) {
            for (int slot : kVectorSlots) {
                // Random samples, random geometry.
                for (size_t i = 0; i < plane.size(); i += bytes) {
                    const int v = int(rng() % uint32_t(c.max_sample + 1));
                    plane[i] = uint8_t(v);
                    if (c.words) plane[i + 1] = uint8_t(v >> 8);
                }
                StripRecord s{};
                s.src_first = int32_t(rng() % 4) * 2;
                s.src_end = s.src_first + width;
                s.pad_left = int32_t(rng() % 3) * 2;

                MapContext ctx;
                const int T = slot >= 14 ? slot - 13 : slot >= 6 ? slot - 5 : 1;
                const int centre = 8 + int(rng() % 4);
                const uint8_t* base = plane.data() + size_t(stride) * centre;
                LineSet& lines = c.alpha ? ctx.lines2 : ctx.lines;
                (c.alpha ? ctx.src_stride2 : ctx.src_stride) = stride;
                lines[0] = base;
                for (int k = 1 - T; k <= T; ++k) {
                    const int l = centre + k + int(rng() % 3) - 1;  // pointer kernels read any lines
                    if (slot >= 14) lines[k] = plane.data() + size_t(stride) * l;
                }
                if (slot >= 14) lines[0] = lines[0] ? lines[0] : base;
                const int bank_choice = int(rng() % 3);
                ctx.vbank = bank_choice == 0   ? &BANK_CUBIC[rng() % 49][0][0]
                            : bank_choice == 1 ? &BANK_LANCZOS3[rng() % 28][0][0]
                                               : &BANK_LINEAR[rng() % 113][0][0];
                ctx.vphase = slot == 5 ? int(rng() % 0x10000) : int(rng() % 16);
                ctx.box_mid = int(rng() % 4) == 0 ? int(rng() % 3) : int(rng() % 10);
                if (rng() % 8 == 0) ctx.box_mid = 0;
                ctx.box_step = 1 + int(rng() % 4000);
                ctx.box_first = int(rng() % 4000);
                ctx.box_last = 16384 - ctx.box_first - ctx.box_mid * ctx.box_step;
                if (ctx.box_last < 0) ctx.box_last = int(rng() % 3000);
                if (rng() % 6 == 0) ctx.box_last = 0;

                std::vector<int16_t> a(4096, 0x5A5A), b(4096, 0x5A5A);
                for (SimdLevel level : levels) {
                    std::fill(a.begin(), a.end(), int16_t(0x5A5A));
                    std::fill(b.begin(), b.end(), int16_t(0x5A5A));
                    ctx.line = ctx.line_a = a.data() + 64;
                    (*c.table)[slot](ctx, s);
                    ctx.line = ctx.line_a = b.data() + 64;
                    (*vertical_table_for(c.table, level))[slot](ctx, s);
                    ASSERT_EQ(a, b) << c.name << " slot " << slot << " width " << width << " level "
                                    << int(level) << " src_first " << s.src_first << " pad_left "
                                    << s.pad_left << " vphase " << ctx.vphase << " box " << ctx.box_first
                                    << "/" << ctx.box_mid << "x" << ctx.box_step << "/" << ctx.box_last;
                    ++compared;
                }
            }
        }
    }
    EXPECT_GT(compared, 1000);
}

TEST(VerticalLevels, BoxPathsAgreeAcrossTheSixteenBitLimit)
{
    const auto levels = vector_levels();
    if (levels.empty()) GTEST_SKIP() << "no vector level on this processor";
    // 126 and 127 middle lines of bytes, 30 and 31 of ten-bit words.
    for (const Case& c : {kCases[0], kCases[1]}) {
        const int bytes = c.words ? 2 : 1;
        const int width = 37, stride = 64 * bytes;
        std::vector<uint8_t> plane(size_t(stride) * 140, 0);
        std::mt19937 rng(5);
        for (size_t i = 0; i < plane.size(); i += bytes) {
            const int v = int(rng() % uint32_t(c.max_sample + 1));
            plane[i] = uint8_t(v);
            if (c.words) plane[i + 1] = uint8_t(v >> 8);
        }
        for (int mid : c.words ? std::vector<int>{30, 31} : std::vector<int>{126, 127}) {
            MapContext ctx;
            ctx.lines[0] = plane.data();
            ctx.src_stride = stride;
            ctx.box_mid = mid;
            ctx.box_step = 16384 / (mid + 2);
            ctx.box_first = 100;
            ctx.box_last = 16384 - 100 - mid * ctx.box_step;
            StripRecord s{};
            s.src_end = width;
            std::vector<int16_t> a(256), b(256);
            ctx.line = a.data();
            (*c.table)[4](ctx, s);
            for (SimdLevel level : levels) {
                ctx.line = b.data();
                (*vertical_table_for(c.table, level))[4](ctx, s);
                ASSERT_EQ(a, b) << c.name << " box_mid " << mid << " level " << int(level);
            }
        }
    }
}

// The straight tables' kernels (one line, linear, bank taps by stride and
// through the pointer array) premultiply each line as they read it; random
// colour and alpha lines, widths around the vector widths, random phases.
TEST(VerticalLevels, StraightKernelsMatchScalar)
{
    const auto levels = vector_levels();
    if (levels.empty()) GTEST_SKIP() << "no vector level on this processor";
    struct Straight {
        const char* name;
        const VerticalKernelTable* table;
        int elements;
        bool words;
        int max_sample;
    };
    const Straight tables[] = {{"V_YUY2_STRAIGHT", &V_YUY2_STRAIGHT, 2, false, 255},
                               {"V_W210_STRAIGHT", &V_W210_STRAIGHT, 2, true, 1023},
                               {"V_RGBQ_STRAIGHT", &V_RGBQ_STRAIGHT, 4, false, 255}};
    constexpr int kLines = 16, kPixels = 80;
    std::mt19937 rng(77);
    for (const Straight& t : tables) {
        const int bytes = t.words ? 2 : 1;
        const int32_t stride = kPixels * t.elements * bytes, stride2 = kPixels * 2;
        std::vector<uint8_t> colour(size_t(stride) * kLines);
        std::vector<uint16_t> alpha(size_t(kPixels) * kLines);
        for (int width = 1; width <= 4 * 16 + 1; ++width) {
            // Some widths take words beyond a picture's range (alpha of 8192
            // and above; 10-bit samples of 2048 and above), which the narrow
            // vector forms leave to the wide ones. The scalar sums still fit
            // 32 bits with these.
            const bool wide_alpha = width % 4 == 0, wide_samples = width % 4 == 2 && t.words;
            for (size_t i = 0; i < colour.size(); i += bytes) {
                const int v = wide_samples && rng() % 8 == 0 ? 2048 + int(rng() % 2048) : int(rng() % uint32_t(t.max_sample + 1));
                colour[i] = uint8_t(v);
                if (t.words) colour[i + 1] = uint8_t(v >> 8);
            }
            for (auto& a : alpha) a = uint16_t(rng() % 3 == 0 ? (rng() % 2) * 4096 : rng() % 4097);
            if (wide_alpha)
                for (auto& a : alpha)
                    if (rng() % 8 == 0) a = uint16_t(8192 + rng() % 8192);
            // Any alpha word at all: only the kernels of weights that are
            // never negative keep the scalar sums within 32 bits then.
            const bool any_alpha = width % 4 == 1;
            if (any_alpha)
                for (auto& a : alpha)
                    if (rng() % 8 == 0) a = uint16_t(rng());
            MapContext ctx;
            ctx.src_stride = stride;
            ctx.src_stride2 = stride2;
            // Line 0 in the middle, so that taps reach 7 lines up and 8 down.
            for (int k = -7; k <= 8; ++k) {
                ctx.lines[k] = colour.data() + ptrdiff_t(stride) * (7 + k);
                ctx.lines2[k] = reinterpret_cast<const uint8_t*>(alpha.data() + kPixels * (7 + k));
            }
            StripRecord s{};
            s.src_first = int32_t(rng() % 4) * 2;
            s.src_end = s.src_first + width;
            s.pad_left = int32_t(rng() % 3) * 2;
            const int16_t* banks[2] = {&BANK_CUBIC[rng() % 49][0][0], &BANK_LANCZOS3[rng() % 28][0][0]};
            ctx.vbank = banks[rng() % 2];
            for (int slot = 2; slot <= 21; ++slot) {
                if (slot == 4) continue;  // the box keeps its scalar form
                if (any_alpha && slot != 2 && slot != 3 && slot != 5) continue;
                ctx.vphase = slot == 5 ? int32_t(rng() % 0x10000) : int32_t(rng() % 16);
                std::vector<int16_t> a(2048, 0x5A5A), b(2048, 0x5A5A);
                ctx.line = a.data() + 16;
                ctx.line_a = a.data() + 1024;
                (*t.table)[slot](ctx, s);
                for (SimdLevel level : levels) {
                    std::fill(b.begin(), b.end(), int16_t(0x5A5A));
                    ctx.line = b.data() + 16;
                    ctx.line_a = b.data() + 1024;
                    const VerticalKernelTable* v = vertical_table_for(t.table, level);
                    ASSERT_NE((*v)[slot], (*t.table)[slot]) << t.name;
                    (*v)[slot](ctx, s);
                    ASSERT_EQ(a, b) << t.name << " slot " << slot << " width " << width << " level " << int(level);
                }
            }
        }
    }
}

}  // namespace
}  // namespace lorvex
