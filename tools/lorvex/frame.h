// Pictures as the tool holds them: one plane in a lorvex format (RGBQ, YUY2
// or W210) and an optional 12-bit alpha plane, handed to the library as a
// Surface. Lines of the 4:2:2 formats hold whole pixel pairs, and the alpha
// plane is as wide as the pairs, so the pair partner of an odd-width image's
// last pixel is always there to be read.
#pragma once

#include <lorvex.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace lorvex_cli {

struct Frame {
    int width = 0;
    int height = 0;
    int format = FORMAT_RGBQ; // FORMAT_RGBQ, FORMAT_YUY2 or FORMAT_W210
    int stride = 0;           // bytes per line of the colour plane
    std::vector<uint64_t> storage; // colour plane; 64-bit words keep lines 8-byte aligned
    std::vector<uint16_t> alpha;   // empty: opaque. Else alpha_width() words a line
    int alpha_mode = ALPHA_MODE_STRAIGHT;

    bool has_alpha() const { return !alpha.empty(); }
    int alpha_width() const { return (width + 1) & ~1; }

    uint8_t *line(int y) { return reinterpret_cast<uint8_t *>(storage.data()) + std::size_t(y) * std::size_t(stride); }
    const uint8_t *line(int y) const
    {
        return reinterpret_cast<const uint8_t *>(storage.data()) + std::size_t(y) * std::size_t(stride);
    }
    uint16_t *alpha_line(int y) { return alpha.data() + std::size_t(y) * std::size_t(alpha_width()); }
    const uint16_t *alpha_line(int y) const
    {
        return alpha.data() + std::size_t(y) * std::size_t(alpha_width());
    }
    std::size_t bytes() const { return std::size_t(height) * std::size_t(stride); }

    // The record the library reads: zeroed, then filled in.
    Surface surface() const;
};

// Bytes per line of a format at a width: RGBQ 4 a pixel, YUY2 4 and W210 8
// a pair.
int line_bytes(int format, int width);

// A picture filled with opaque black (RGB 0, Y 16 / 64, C 128 / 512). With
// `with_alpha` the alpha plane is added, all clear (0).
Frame make_frame(int width, int height, int format, bool with_alpha = false);

// Adds an alpha plane set to `value` (4096 = opaque) if there is none.
void add_alpha(Frame &frame, uint16_t value);

// A 4:2:2 picture as three planes, as Y4M files hold it: chroma planes
// (width + 1) / 2 samples wide, co-sited with the even pixels. Samples are
// 8 or 10 bits, kept in 16-bit words either way.
struct Planes {
    int width = 0;
    int height = 0;
    int depth = 8;
    std::vector<uint16_t> y, cb, cr;
    int chroma_width() const { return (width + 1) / 2; }
};

// Between planes and YUY2 (depth 8) or W210 (depth 10). The alpha plane is
// not part of Planes and is not carried.
Planes to_planes(const Frame &video);
Frame from_planes(const Planes &planes);

// YUY2 into W210 and back: 8-bit v is 10-bit 4v, and 10-bit v becomes
// (v + 2) >> 2, at most 255 - the roundings of the library's own buffer unit.
// The alpha plane is carried.
Frame change_depth(const Frame &video, int format);

// "yuy2", "w210", "rgbq".
const char *format_name(int format);

bool is_video_format(int format); // YUY2 or W210

} // namespace lorvex_cli
