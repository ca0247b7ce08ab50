#include "frame.h"

#include <algorithm>
#include <cstring>

namespace lorvex_cli {

Surface Frame::surface() const
{
    Surface s;
    std::memset(&s, 0, sizeof s);
    s.width = width;
    s.height = height;
    s.format = uint8_t(format);
    s.data = const_cast<uint64_t *>(storage.data());
    s.stride = stride;
    if (has_alpha()) {
        s.alpha_format = ALPHA_W12B;
        s.alpha_mode = uint8_t(alpha_mode);
        s.alpha_data = const_cast<uint16_t *>(alpha.data());
        s.alpha_stride = alpha_width() * 2;
    }
    return s;
}

int line_bytes(int format, int width)
{
    int pairs = (width + 1) / 2;
    switch (format) {
    case FORMAT_YUY2: return pairs * 4;
    case FORMAT_W210: return pairs * 8;
    default: return width * 4;
    }
}

Frame make_frame(int width, int height, int format, bool with_alpha)
{
    Frame f;
    f.width = width;
    f.height = height;
    f.format = format;
    f.stride = line_bytes(format, width);
    f.storage.assign((f.bytes() + 7) / 8, 0);
    if (format == FORMAT_YUY2) {
        for (int y = 0; y < height; ++y) {
            uint8_t *p = f.line(y);
            for (int i = 0; i < f.stride; i += 2) {
                p[i] = 16;
                p[i + 1] = 128;
            }
        }
    } else if (format == FORMAT_W210) {
        for (int y = 0; y < height; ++y) {
            uint8_t *p = f.line(y);
            for (int i = 0; i < f.stride; i += 4) {
                const uint16_t words[2] = {64, 512};
                std::memcpy(p + i, words, 4);
            }
        }
    } else {
        for (int y = 0; y < height; ++y) {
            uint8_t *p = f.line(y);
            for (int i = 3; i < f.stride; i += 4)
                p[i] = 255;
        }
    }
    if (with_alpha)
        add_alpha(f, 0);
    return f;
}

void add_alpha(Frame &frame, uint16_t value)
{
    if (!frame.has_alpha())
        frame.alpha.assign(std::size_t(frame.alpha_width()) * std::size_t(frame.height), value);
}

const char *format_name(int format)
{
    switch (format) {
    case FORMAT_YUY2: return "yuy2";
    case FORMAT_W210: return "w210";
    default: return "rgbq";
    }
}

bool is_video_format(int format)
{
    return format == FORMAT_YUY2 || format == FORMAT_W210;
}

} // namespace lorvex_cli

namespace lorvex_cli {

Planes to_planes(const Frame &video)
{
    Planes p;
    p.width = video.width;
    p.height = video.height;
    p.depth = video.format == FORMAT_W210 ? 10 : 8;
    const int cw = p.chroma_width();
    p.y.resize(std::size_t(p.width) * std::size_t(p.height));
    p.cb.resize(std::size_t(cw) * std::size_t(p.height));
    p.cr.resize(p.cb.size());
    for (int y = 0; y < p.height; ++y) {
        const uint8_t *line = video.line(y);
        uint16_t *py = &p.y[std::size_t(y) * std::size_t(p.width)];
        for (int k = 0; k < cw; ++k) {
            uint16_t s[4]; // Y0 Cb Y1 Cr
            if (video.format == FORMAT_W210)
                std::memcpy(s, line + 8 * k, 8);
            else
                for (int i = 0; i < 4; ++i)
                    s[i] = line[4 * k + i];
            py[2 * k] = s[0];
            if (2 * k + 1 < p.width)
                py[2 * k + 1] = s[2];
            p.cb[std::size_t(y) * std::size_t(cw) + std::size_t(k)] = s[1];
            p.cr[std::size_t(y) * std::size_t(cw) + std::size_t(k)] = s[3];
        }
    }
    return p;
}

Frame from_planes(const Planes &p)
{
    Frame f = make_frame(p.width, p.height, p.depth == 10 ? FORMAT_W210 : FORMAT_YUY2);
    const int cw = p.chroma_width();
    for (int y = 0; y < p.height; ++y) {
        uint8_t *line = f.line(y);
        const uint16_t *py = &p.y[std::size_t(y) * std::size_t(p.width)];
        for (int k = 0; k < cw; ++k) {
            // The odd partner of an odd width's last pixel repeats the even one.
            const int x1 = 2 * k + 1 < p.width ? 2 * k + 1 : 2 * k;
            const uint16_t s[4] = {py[2 * k], p.cb[std::size_t(y) * std::size_t(cw) + std::size_t(k)], py[x1],
                                   p.cr[std::size_t(y) * std::size_t(cw) + std::size_t(k)]};
            if (f.format == FORMAT_W210)
                std::memcpy(line + 8 * k, s, 8);
            else
                for (int i = 0; i < 4; ++i)
                    line[4 * k + i] = uint8_t(s[i]);
        }
    }
    return f;
}

Frame change_depth(const Frame &video, int format)
{
    if (video.format == format)
        return video;
    Planes p = to_planes(video);
    const bool up = format == FORMAT_W210;
    for (auto *plane : {&p.y, &p.cb, &p.cr})
        for (uint16_t &v : *plane)
            v = up ? uint16_t(v * 4) : uint16_t(std::min((v + 2) >> 2, 255));
    p.depth = up ? 10 : 8;
    Frame f = from_planes(p);
    f.alpha = video.alpha;
    f.alpha_mode = video.alpha_mode;
    return f;
}

} // namespace lorvex_cli
