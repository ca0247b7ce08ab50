#include "colour.h"

#include "cli.h"

#include <cstring>
#include <memory>
#include <new>

extern "C" {
#include <libavutil/opt.h>
#include <libavutil/pixfmt.h>
#include <libswscale/swscale.h>
}

namespace lorvex_cli {

namespace {

struct ContextDeleter {
    void operator()(SwsContext *c) const { sws_freeContext(c); }
};
using Context = std::unique_ptr<SwsContext, ContextDeleter>;

// A same-size conversion between packed RGB and planar 4:2:2. The chroma
// position 0 puts the chroma sample on the even pixel (libswscale's default
// for 4:2:2 is between the two); full chroma input and interpolation make
// libswscale filter RGB chroma at every pixel before it reduces it, and
// rebuild every pixel's chroma on the way back, instead of pairing pixels.
Context make_context(int width, int height, AVPixelFormat from, AVPixelFormat to, Matrix m, bool to_video)
{
    Context c(sws_alloc_context());
    if (!c)
        throw std::bad_alloc();
    const int64_t flags = SWS_BILINEAR | SWS_ACCURATE_RND | SWS_BITEXACT |
                          (to_video ? SWS_FULL_CHR_H_INP : SWS_FULL_CHR_H_INT);
    av_opt_set_int(c.get(), "srcw", width, 0);
    av_opt_set_int(c.get(), "srch", height, 0);
    av_opt_set_int(c.get(), "src_format", from, 0);
    av_opt_set_int(c.get(), "dstw", width, 0);
    av_opt_set_int(c.get(), "dsth", height, 0);
    av_opt_set_int(c.get(), "dst_format", to, 0);
    av_opt_set_int(c.get(), "sws_flags", flags, 0);
    av_opt_set_int(c.get(), to_video ? "dst_h_chr_pos" : "src_h_chr_pos", 0, 0);
    if (sws_init_context(c.get(), nullptr, nullptr) < 0)
        throw Error("libswscale cannot convert a " + std::to_string(width) + "x" + std::to_string(height) +
                    " picture");
    const int *coefficients = sws_getCoefficients(m == Matrix::bt709 ? SWS_CS_ITU709 : SWS_CS_ITU601);
    // Range 1 is full (the RGB side), 0 is video range (the 4:2:2 side).
    if (sws_setColorspaceDetails(c.get(), coefficients, to_video ? 1 : 0, coefficients, to_video ? 0 : 1, 0,
                                 1 << 16, 1 << 16) < 0)
        throw Error("libswscale refuses the " + std::string(matrix_name(m)) + " matrix");
    return c;
}

AVPixelFormat planar_format(int depth)
{
    return depth == 10 ? AV_PIX_FMT_YUV422P10LE : AV_PIX_FMT_YUV422P;
}

// Planes in the layout libswscale reads and writes: 8-bit samples in bytes,
// 10-bit samples in little-endian 16-bit words.
struct Buffers {
    std::vector<uint8_t> plane[3];
    int stride[4] = {};

    Buffers(int width, int height, int depth)
    {
        const int bytes = depth == 10 ? 2 : 1;
        stride[0] = ((width * bytes + 63) / 64) * 64;
        stride[1] = stride[2] = ((((width + 1) / 2) * bytes + 63) / 64) * 64;
        for (int i = 0; i < 3; ++i)
            plane[i].assign(std::size_t(stride[i]) * std::size_t(height) + 64, 0);
    }
    uint8_t *data[4] = {};
    uint8_t *const *pointers()
    {
        for (int i = 0; i < 3; ++i)
            data[i] = plane[i].data();
        return data;
    }
};

void copy_planes(Planes &p, Buffers &b, bool into_buffers)
{
    const int widths[3] = {p.width, p.chroma_width(), p.chroma_width()};
    std::vector<uint16_t> *samples[3] = {&p.y, &p.cb, &p.cr};
    for (int i = 0; i < 3; ++i)
        for (int y = 0; y < p.height; ++y) {
            uint8_t *row = b.plane[i].data() + std::size_t(y) * std::size_t(b.stride[i]);
            uint16_t *s = samples[i]->data() + std::size_t(y) * std::size_t(widths[i]);
            for (int x = 0; x < widths[i]; ++x) {
                if (p.depth == 10) {
                    if (into_buffers)
                        std::memcpy(row + 2 * x, &s[x], 2);
                    else
                        std::memcpy(&s[x], row + 2 * x, 2);
                } else if (into_buffers) {
                    row[x] = uint8_t(s[x]);
                } else {
                    s[x] = row[x];
                }
            }
        }
}

} // namespace

Matrix matrix_for_size(int width, int height)
{
    return width >= 1280 || height >= 720 ? Matrix::bt709 : Matrix::bt601;
}

const char *matrix_name(Matrix m)
{
    return m == Matrix::bt709 ? "BT.709" : "BT.601";
}

Frame rgb_to_video(const Frame &rgbq, int format, Matrix m)
{
    const int depth = format == FORMAT_W210 ? 10 : 8;
    Context c = make_context(rgbq.width, rgbq.height, AV_PIX_FMT_RGB0, planar_format(depth), m, true);
    Buffers b(rgbq.width, rgbq.height, depth);
    const uint8_t *src[4] = {rgbq.line(0), nullptr, nullptr, nullptr};
    const int src_stride[4] = {rgbq.stride, 0, 0, 0};
    sws_scale(c.get(), src, src_stride, 0, rgbq.height, b.pointers(), b.stride);

    Planes p;
    p.width = rgbq.width;
    p.height = rgbq.height;
    p.depth = depth;
    p.y.resize(std::size_t(p.width) * std::size_t(p.height));
    p.cb.resize(std::size_t(p.chroma_width()) * std::size_t(p.height));
    p.cr.resize(p.cb.size());
    copy_planes(p, b, false);
    Frame video = from_planes(p);
    video.alpha = rgbq.alpha;
    video.alpha_mode = rgbq.alpha_mode;
    return video;
}

Frame video_to_rgb(const Frame &video, Matrix m)
{
    Planes p = to_planes(video);
    Context c = make_context(p.width, p.height, planar_format(p.depth), AV_PIX_FMT_RGB0, m, false);
    Buffers b(p.width, p.height, p.depth);
    copy_planes(p, b, true);
    Frame rgbq = make_frame(video.width, video.height, FORMAT_RGBQ);
    uint8_t *dst[4] = {rgbq.line(0), nullptr, nullptr, nullptr};
    const int dst_stride[4] = {rgbq.stride, 0, 0, 0};
    const uint8_t *const *src = b.pointers();
    sws_scale(c.get(), src, b.stride, 0, p.height, dst, dst_stride);
    for (int y = 0; y < rgbq.height; ++y) {
        uint8_t *line = rgbq.line(y);
        for (int x = 0; x < rgbq.width; ++x)
            line[4 * x + 3] = 255;
    }
    rgbq.alpha = video.alpha;
    rgbq.alpha_mode = video.alpha_mode;
    return rgbq;
}

Frame convert(const Frame &frame, int format, Matrix m)
{
    if (frame.format == format)
        return frame;
    if (format == FORMAT_RGBQ)
        return video_to_rgb(frame, m);
    if (frame.format == FORMAT_RGBQ)
        return rgb_to_video(frame, format, m);
    return change_depth(frame, format);
}

} // namespace lorvex_cli
