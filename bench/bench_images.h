// The pictures every benchmark works on, the same for lorvex and its peers.
//
// One scene, a continuous function of the position in the unit square, is
// sampled at the pixel centres of every size, so the sources of all sizes show
// the same picture: a sky gradient, textured ground made of value noise with a
// 1/f spectrum, discs and bars with one-pixel soft edges. It has the mix of
// smooth areas, texture and sharp edges of a natural picture, so that a
// misplaced grid or chroma shows up in a comparison.
//
// Layouts: packed YUY2 (Y0 Cb Y1 Cr, 8 bits), W210 (the same in 16-bit words,
// 10 bits), RGBQ (4 bytes), a 4096-based alpha plane, and planar 4:2:2 copies
// (8 and 16 bits) for the peers that scale planes. Chroma of a pair is
// co-sited with its even pixel. Every plane's lines start on 64 bytes.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <map>
#include <memory>
#include <string>
#include <utility>

namespace bench {

// A plane of `height` lines of `row_bytes`, lines 64-byte aligned.
struct Plane {
    int row_bytes = 0, height = 0;
    int stride = 0;
    std::unique_ptr<uint8_t, void (*)(void*)> mem{nullptr, std::free};

    Plane() = default;
    Plane(int bytes, int lines) : row_bytes(bytes), height(lines), stride((bytes + 63) & ~63)
    {
        mem.reset(static_cast<uint8_t*>(std::aligned_alloc(64, size_t(stride) * size_t(lines) + 64)));
        std::memset(mem.get(), 0, size_t(stride) * size_t(lines) + 64);
    }
    uint8_t* line(int y) const { return mem.get() + size_t(y) * size_t(stride); }
    template <class T>
    T* line_as(int y) const
    {
        return reinterpret_cast<T*>(line(y));
    }
    uint8_t* data() const { return mem.get(); }
};

// One source picture in every layout.
struct Picture {
    int width = 0, height = 0;
    Plane yuy2, w210, rgbq, alpha;         // packed layouts and the alpha plane
    Plane y8, u8, v8, y16, u16, v16;       // planar 4:2:2 copies
};

namespace detail {

inline uint32_t hash(int x, int y, int octave)
{
    uint32_t h = uint32_t(x) * 0x8DA6B343u ^ uint32_t(y) * 0xD8163841u ^ uint32_t(octave) * 0xCB1AB31Fu;
    h ^= h >> 15;
    h *= 0x2C1B3C6Du;
    h ^= h >> 12;
    return h;
}

inline double lattice(int x, int y, int octave) { return double(hash(x, y, octave) & 0xFFFF) / 65535.0; }

// Value noise: a lattice of random values with smooth interpolation.
inline double value_noise(double u, double v, int octave)
{
    const double fx = std::floor(u), fy = std::floor(v);
    const int x = int(fx), y = int(fy);
    double tx = u - fx, ty = v - fy;
    tx = tx * tx * (3 - 2 * tx);
    ty = ty * ty * (3 - 2 * ty);
    const double a = lattice(x, y, octave), b = lattice(x + 1, y, octave);
    const double c = lattice(x, y + 1, octave), d = lattice(x + 1, y + 1, octave);
    return (a + (b - a) * tx) * (1 - ty) + (c + (d - c) * tx) * ty;
}

// Octaves of noise with amplitudes falling as 1/f, up to a finest cell of
// about 2 pixels of a 1920-wide picture.
inline double texture(double u, double v)
{
    double sum = 0, amp = 0.5, freq = 6;
    for (int o = 0; o < 9; ++o) {
        sum += amp * (value_noise(u * freq, v * freq * 0.5625, o) - 0.5);
        amp *= 0.55;
        freq *= 2;
    }
    return sum;
}

inline double smooth_edge(double signed_distance_pixels)
{
    return std::clamp(0.5 - signed_distance_pixels, 0.0, 1.0);
}

struct Rgb {
    double r, g, b;
};

// The scene at (u, v) of the unit square; `px` is one pixel in u units, for
// the edges' soft ramp. Values 0..1.
inline Rgb scene(double u, double v, double px)
{
    Rgb c;
    if (v < 0.42) {  // sky
        const double t = v / 0.42;
        c = {0.35 + 0.25 * t, 0.55 + 0.2 * t, 0.85 - 0.1 * t};
        const double cloud = std::max(0.0, texture(u * 0.7 + 3, v * 1.5) * 2.2);
        c.r += cloud;
        c.g += cloud;
        c.b += cloud * 0.8;
    } else {  // textured ground
        const double n = texture(u, v);
        c = {0.32 + n * 0.9, 0.42 + n * 0.8 - (v - 0.42) * 0.2, 0.18 + n * 0.5};
    }
    // Discs.
    const struct { double x, y, r; Rgb col; } discs[] = {
        {0.22, 0.30, 0.08, {0.95, 0.85, 0.3}},
        {0.70, 0.62, 0.12, {0.75, 0.15, 0.12}},
        {0.48, 0.78, 0.05, {0.1, 0.2, 0.7}},
    };
    for (const auto& d : discs) {
        const double dx = u - d.x, dy = (v - d.y) * 0.5625;
        const double dist = (std::sqrt(dx * dx + dy * dy) - d.r) / px;
        const double a = smooth_edge(dist);
        c = {c.r + (d.col.r - c.r) * a, c.g + (d.col.g - c.g) * a, c.b + (d.col.b - c.b) * a};
    }
    // A fence of bars, one of the finest regular structures in the picture.
    if (v > 0.5 && v < 0.6) {
        const double period = 0.013;
        const double phase = std::fmod(u, period) / period;
        const double a = smooth_edge((std::abs(phase - 0.5) - 0.18) * period / px);
        c = {c.r * (1 - a) + 0.9 * a, c.g * (1 - a) + 0.9 * a, c.b * (1 - a) + 0.88 * a};
    }
    c.r = std::clamp(c.r, 0.0, 1.0);
    c.g = std::clamp(c.g, 0.0, 1.0);
    c.b = std::clamp(c.b, 0.0, 1.0);
    return c;
}

// BT.709 limited range, in units of the 8-bit scale (Y 16..235, C 16..240).
inline void to_ycc(const Rgb& c, double& y, double& cb, double& cr)
{
    const double Y = 0.2126 * c.r + 0.7152 * c.g + 0.0722 * c.b;
    y = 16 + 219 * Y;
    cb = 128 + 224 * (c.b - Y) / 1.8556;
    cr = 128 + 224 * (c.r - Y) / 1.5748;
}

}  // namespace detail

inline Picture make_picture(int width, int height)
{
    Picture p;
    p.width = width;
    p.height = height;
    const int pairs = (width + 1) / 2;
    p.yuy2 = Plane(pairs * 4, height);
    p.w210 = Plane(pairs * 8, height);
    p.rgbq = Plane(width * 4, height);
    p.alpha = Plane(width * 2, height);
    p.y8 = Plane(width, height);
    p.u8 = Plane(pairs, height);
    p.v8 = Plane(pairs, height);
    p.y16 = Plane(width * 2, height);
    p.u16 = Plane(pairs * 2, height);
    p.v16 = Plane(pairs * 2, height);

    const double px = 1.0 / width;
    for (int y = 0; y < height; ++y) {
        const double v = (y + 0.5) / height;
        uint8_t* yuy2 = p.yuy2.line(y);
        uint16_t* w210 = p.w210.line_as<uint16_t>(y);
        uint8_t* rgbq = p.rgbq.line(y);
        uint16_t* alpha = p.alpha.line_as<uint16_t>(y);
        for (int x = 0; x < width; ++x) {
            const double u = (x + 0.5) / width;
            const detail::Rgb c = detail::scene(u, v, px);
            double Y, Cb, Cr;
            detail::to_ycc(c, Y, Cb, Cr);
            const int y8 = std::clamp(int(std::lround(Y)), 0, 255);
            const int y10 = std::clamp(int(std::lround(Y * 4)), 0, 1023);
            yuy2[2 * x] = uint8_t(y8);
            w210[2 * x] = uint16_t(y10);
            p.y8.line(y)[x] = uint8_t(y8);
            p.y16.line_as<uint16_t>(y)[x] = uint16_t(y10);
            if ((x & 1) == 0) {  // co-sited chroma of the pair
                const int cb8 = std::clamp(int(std::lround(Cb)), 0, 255), cr8 = std::clamp(int(std::lround(Cr)), 0, 255);
                const int cb10 = std::clamp(int(std::lround(Cb * 4)), 0, 1023),
                          cr10 = std::clamp(int(std::lround(Cr * 4)), 0, 1023);
                yuy2[2 * x + 1] = uint8_t(cb8);
                yuy2[2 * x + 3] = uint8_t(cr8);
                w210[2 * x + 1] = uint16_t(cb10);
                w210[2 * x + 3] = uint16_t(cr10);
                p.u8.line(y)[x / 2] = uint8_t(cb8);
                p.v8.line(y)[x / 2] = uint8_t(cr8);
                p.u16.line_as<uint16_t>(y)[x / 2] = uint16_t(cb10);
                p.v16.line_as<uint16_t>(y)[x / 2] = uint16_t(cr10);
            }
            // RGBQ as B, G, R, A in memory (a8r8g8b8 little-endian, BGRA),
            // premultiplied by the alpha below where a peer composites.
            const double a = std::clamp(1.4 - 1.6 * std::hypot(u - 0.5, (v - 0.5) * 0.5625) * 2, 0.0, 1.0);
            rgbq[4 * x + 0] = uint8_t(std::lround(c.b * 255 * a));
            rgbq[4 * x + 1] = uint8_t(std::lround(c.g * 255 * a));
            rgbq[4 * x + 2] = uint8_t(std::lround(c.r * 255 * a));
            rgbq[4 * x + 3] = uint8_t(std::lround(255 * a));
            alpha[x] = uint16_t(std::lround(4096 * a));
        }
    }
    return p;
}

// The pictures are made once per size and shared.
inline const Picture& picture(int width, int height)
{
    static std::map<std::pair<int, int>, std::unique_ptr<Picture>> cache;
    auto& slot = cache[{width, height}];
    if (!slot) slot = std::make_unique<Picture>(make_picture(width, height));
    return *slot;
}

struct Size {
    int w, h;
};

struct Scaling {
    Size src, dst;
};

// The four scalings of the workloads and the 1:1 copy.
inline constexpr Scaling kScalings[] = {
    {{1920, 1080}, {1280, 720}},
    {{1280, 720}, {1920, 1080}},
    {{3840, 2160}, {1920, 1080}},
    {{720, 576}, {1920, 1080}},
};
inline constexpr Scaling kCopy = {{1920, 1080}, {1920, 1080}};

inline std::string size_name(const Scaling& s)
{
    return std::to_string(s.src.w) + "x" + std::to_string(s.src.h) + "->" + std::to_string(s.dst.w) + "x" +
           std::to_string(s.dst.h);
}

// "impl/format/scaling/filter": everything after the first slash names the
// work, which lorvex and its peers share.
inline std::string bench_name(const std::string& impl, const std::string& format, const Scaling& s,
                              const std::string& filter)
{
    return impl + "/" + format + "/" + size_name(s) + "/" + filter;
}

// Peers, registered by bench_peers.cpp.
void register_peers();

}  // namespace bench
