// A host shares one picture among its threads by giving each call the same
// arguments and its own line_phase. Four threads with line_phase 0 to 3 and
// line_period 4 must leave exactly the bytes of one call with line_period 1,
// whatever the interleaving: each line belongs to one call, the position runs
// on through the lines a call passes over, and the calls share nothing but the
// source, which they only read. Built with ThreadSanitizer, the same test
// checks that no call writes anything the others read or write.
#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <latch>
#include <string>
#include <thread>
#include <vector>

#include "lorvex.h"

namespace {

// An image with its planes in vectors. Lines of the 4:2:2 formats hold whole
// pairs.
struct Picture {
    std::vector<uint8_t> colour, alpha;
    Surface s{};

    Picture(int format, int width, int height, bool with_alpha, int alpha_mode, uint32_t seed)
    {
        int line = 0;
        if (format == FORMAT_YUY2) line = (width + 1) / 2 * 4;
        if (format == FORMAT_W210) line = (width + 1) / 2 * 8;
        if (format == FORMAT_RGBQ) line = width * 4;
        colour.resize(size_t(line) * size_t(height));
        if (with_alpha) alpha.resize(size_t(width + 1) * 2 * size_t(height));

        // A smooth picture with detail, so that every filter has work to do.
        uint32_t r = seed;
        const auto noise = [&r] {
            r = r * 1664525u + 1013904223u;
            return int(r >> 27);
        };
        for (int y = 0; y < height; ++y) {
            for (int i = 0; i < line; i += format == FORMAT_W210 ? 2 : 1) {
                const int v = (i * 7 + y * 5) % 200 + 20 + noise();
                if (format == FORMAT_W210) {
                    const int w = v * 4;
                    colour[size_t(y * line + i)] = uint8_t(w);
                    colour[size_t(y * line + i + 1)] = uint8_t(w >> 8);
                } else {
                    colour[size_t(y * line + i)] = uint8_t(v);
                }
            }
            for (int x = 0; x <= width && with_alpha; ++x) {
                const int a = ((x * 37 + y * 11) % 64) * 72 - 400 + noise() * 8;
                const int v = a < 0 ? 0 : a > 4096 ? 4096 : a;
                alpha[size_t((y * (width + 1) + x) * 2)] = uint8_t(v);
                alpha[size_t((y * (width + 1) + x) * 2 + 1)] = uint8_t(v >> 8);
            }
        }
        s.width = width;
        s.height = height;
        s.format = uint8_t(format);
        s.alpha_mode = uint8_t(alpha_mode);
        s.data = colour.empty() ? nullptr : colour.data();
        s.stride = line;
        s.alpha_format = with_alpha ? ALPHA_W12B : ALPHA_NONE;
        s.alpha_data = with_alpha ? alpha.data() : nullptr;
        s.alpha_stride = with_alpha ? (width + 1) * 2 : 0;
    }

    Picture(const Picture& o) : colour(o.colour), alpha(o.alpha), s(o.s)
    {
        s.data = colour.empty() ? nullptr : colour.data();
        s.alpha_data = alpha.empty() ? nullptr : alpha.data();
    }
    Picture& operator=(const Picture&) = delete;
};

struct Mapping {
    const char* name;
    int src_format, src_w, src_h;
    bool src_alpha;
    int src_mode;
    int dst_format, dst_w, dst_h;
    bool dst_alpha;
    int dst_mode;
    float x0, y0, x1, y1, sx0, sy0, sx1, sy1;
    uint32_t flags;
};

const Mapping kMappings[] = {
    {"YUY2 cubic enlargement", FORMAT_YUY2, 161, 90, false, 0, FORMAT_YUY2, 250, 160, false, 0,
     3.25f, 2.5f, 241.75f, 151.5f, 0.5f, -1.0f, 160.0f, 91.0f,
     lorvex_flag_filters(LORVEX_FILTER_CUBIC, LORVEX_FILTER_CUBIC) | lorvex_flag_level(4096)},
    {"W210 straight alpha into YUY2 with alpha, lanczos 3 reduction", FORMAT_W210, 300, 200, true,
     ALPHA_MODE_STRAIGHT, FORMAT_YUY2, 150, 101, true, ALPHA_MODE_PREMULTIPLIED,
     -4.5f, 1.75f, 140.25f, 99.0f, 0.0f, 0.0f, 300.0f, 200.0f,
     lorvex_flag_filters(LORVEX_FILTER_LANCZOS3, LORVEX_FILTER_LANCZOS3) | lorvex_flag_level(3000) |
         lorvex_flag_chroma_soften(2)},
    {"RGBQ premultiplied alpha into RGBQ with alpha, fields, tile", FORMAT_RGBQ, 120, 121, true,
     ALPHA_MODE_PREMULTIPLIED, FORMAT_RGBQ, 130, 160, true, ALPHA_MODE_STRAIGHT,
     0.5f, 3.25f, 127.5f, 157.0f, -2.0f, 0.0f, 118.0f, 121.0f,
     lorvex_flag_filters(LORVEX_FILTER_AREA, LORVEX_FILTER_SOFT) | lorvex_flag_level(4096) | LORVEX_TILE |
         LORVEX_SOURCE_EVEN_FIELD | LORVEX_DEST_ODD_FIELD},
    {"YUY2 into W210, edge interpolation, even field", FORMAT_YUY2, 96, 60, false, 0, FORMAT_W210, 201,
     170, false, 0, 0.0f, 0.0f, 201.0f, 170.0f, 0.0f, 0.0f, 96.0f, 60.0f,
     lorvex_flag_filters(LORVEX_FILTER_LANCZOS4, LORVEX_FILTER_EDGE) | lorvex_flag_level(4096) |
         LORVEX_DEST_EVEN_FIELD},
    {"ALPHA linear, tile, vertical softening", FORMAT_ALPHA, 77, 50, true, 0, FORMAT_ALPHA, 140, 90, true, 0,
     1.5f, 0.25f, 139.0f, 89.5f, 0.0f, 0.0f, 77.0f, 50.0f,
     lorvex_flag_filters(LORVEX_FILTER_LINEAR, LORVEX_FILTER_LINEAR) | lorvex_flag_level(2500) | LORVEX_TILE |
         lorvex_flag_vsoften(3)},
};

void draw(const Picture& dst, const Picture& src, const Mapping& m, int phase, int period)
{
    map_rectangle(&dst.s, m.x0, m.y0, m.x1, m.y1, &src.s, m.sx0, m.sy0, m.sx1, m.sy1, int32_t(m.flags), phase,
                  period);
}

// Draws with four threads that start together, each with its own phase.
void draw_in_four(const Picture& dst, const Picture& src, const Mapping& m, const int (&phases)[4])
{
    std::latch start(4);
    std::vector<std::thread> threads;
    for (int phase : phases)
        threads.emplace_back([&, phase] {
            start.arrive_and_wait();
            draw(dst, src, m, phase, 4);
        });
    for (std::thread& t : threads) t.join();
}

TEST(Concurrency, FourPhasesOnFourThreadsMatchOneCall)
{
    for (const Mapping& m : kMappings) {
        SCOPED_TRACE(m.name);
        const Picture src(m.src_format, m.src_w, m.src_h, m.src_alpha, m.src_mode, 1);
        const Picture blank(m.dst_format, m.dst_w, m.dst_h, m.dst_alpha, m.dst_mode, 2);

        Picture whole(blank);
        draw(whole, src, m, 0, 1);
        ASSERT_TRUE(whole.colour != blank.colour || whole.alpha != blank.alpha) << "the mapping drew nothing";

        // Phases given as residues and as other members of the same classes.
        const int phase_sets[][4] = {{0, 1, 2, 3}, {3, 2, 1, 0}, {4, -3, 6, -1}};
        for (const auto& phases : phase_sets) {
            for (int round = 0; round < 2; ++round) {
                Picture shared(blank);
                draw_in_four(shared, src, m, phases);
                EXPECT_TRUE(shared.colour == whole.colour) << "colour plane, phases from " << phases[0];
                EXPECT_TRUE(shared.alpha == whole.alpha) << "alpha plane, phases from " << phases[0];
            }
        }
    }
}

// The same call twice gives the same bytes: nothing carries from one call to
// the next.
TEST(Concurrency, RepeatedCallIsDeterministic)
{
    const Mapping& m = kMappings[1];
    const Picture src(m.src_format, m.src_w, m.src_h, m.src_alpha, m.src_mode, 3);
    const Picture blank(m.dst_format, m.dst_w, m.dst_h, m.dst_alpha, m.dst_mode, 4);
    Picture first(blank), other(blank), second(blank);
    draw(first, src, m, 0, 1);
    draw(other, src, kMappings[0], 0, 1);  // a different call in between
    draw(second, src, m, 0, 1);
    EXPECT_TRUE(first.colour == second.colour);
    EXPECT_TRUE(first.alpha == second.alpha);
}

}  // namespace
