// Peer libraries on the same pictures and the same scalings as the lorvex
// workloads, single thread, each compiled in only where CMake found it:
//
//   swscale   packed YUYV422 to YUYV422; planar 10-bit 4:2:2; BGRA to BGRA;
//             bicubic, Lanczos (3), area, bilinear
//   libyuv    ARGB scaling with box and bilinear; YUY2 through its 4:2:2
//             planar scaler (unpack, scale, pack: the work a YUY2 user has);
//             10-bit 4:2:2 planar
//   zimg      planar 4:2:2, 8 and 10 bits, bicubic b = 0 c = 1 and Lanczos 3
//   pixman    a8r8g8b8 scaled composite, SRC with bilinear and separable
//             box, cubic, Lanczos 2 and 3 filters; OVER with bilinear and cubic
//   OpenCV    resize with area, linear, cubic and Lanczos 4; 4-channel for
//             RGBQ, three planes for 4:2:2
//   memcpy    the destination frame, the bandwidth floor of the 1:1 copy
//
// Names follow "peer/<format>/<src>-><dst>/<filter>" so that each shares its
// work name with the lorvex workload it is measured against; the label says
// how the peer holds the picture where that differs from the format's own
// packed layout.
#include <benchmark/benchmark.h>

#include <cstring>
#include <string>
#include <vector>

#include "bench_images.h"

#ifdef LORVEX_HAVE_SWSCALE
extern "C" {
#include <libavutil/pixfmt.h>
#include <libswscale/swscale.h>
}
#endif
#ifdef LORVEX_HAVE_LIBYUV
#include <libyuv.h>
#endif
#ifdef LORVEX_HAVE_ZIMG
#include <zimg.h>
#endif
#ifdef LORVEX_HAVE_PIXMAN
#include <pixman.h>
#endif
#ifdef LORVEX_HAVE_OPENCV
#include <opencv2/core.hpp>
#include <opencv2/imgproc.hpp>
#endif

namespace bench {
namespace {

template <class Work>
void add(const std::string& name, Scaling sc, const std::string& label, Work work)
{
    benchmark::RegisterBenchmark(name.c_str(), [=](benchmark::State& state) {
        auto run = work(picture(sc.src.w, sc.src.h));  // set-up, then one frame per call
        for (auto _ : state) {
            run();
            benchmark::ClobberMemory();
        }
        if (!label.empty()) state.SetLabel(label);
        state.counters["MP/s"] = benchmark::Counter(double(sc.dst.w) * sc.dst.h / 1e6,
                                                    benchmark::Counter::kIsIterationInvariantRate);
    })->Unit(benchmark::kMillisecond);
}

// Destination planes of one scaling, in the layouts of Picture.
struct Out {
    Plane packed, y, u, v;
    Out(int format_bytes_per_pair, int w, int h, int sample_bytes)
        : packed(((w + 1) / 2) * format_bytes_per_pair, h),
          y(w * sample_bytes, h),
          u(((w + 1) / 2) * sample_bytes, h),
          v(((w + 1) / 2) * sample_bytes, h)
    {
    }
};

#ifdef LORVEX_HAVE_SWSCALE
void register_swscale()
{
    const struct {
        int flag;
        const char* filter;
    } filters[] = {{SWS_AREA, "area"}, {SWS_BILINEAR, "linear"}, {SWS_BICUBIC, "cubic"}, {SWS_LANCZOS, "lanczos3"}};
    const struct {
        const char* format;
        AVPixelFormat pf;
        const char* label;
    } formats[] = {{"YUY2", AV_PIX_FMT_YUYV422, ""},
                   {"W210", AV_PIX_FMT_YUV422P10LE, "planar 10-bit 4:2:2"},
                   {"RGBQ", AV_PIX_FMT_BGRA, ""}};
    for (const auto& f : formats)
        for (const Scaling& sc : kScalings)
            for (const auto& fl : filters) {
                add(bench_name("swscale", f.format, sc, fl.filter), sc, f.label, [=](const Picture& p) {
                    SwsContext* ctx = sws_getContext(sc.src.w, sc.src.h, f.pf, sc.dst.w, sc.dst.h, f.pf, fl.flag,
                                                     nullptr, nullptr, nullptr);
                    auto out = std::make_shared<Out>(f.pf == AV_PIX_FMT_BGRA ? 8 : 4, sc.dst.w, sc.dst.h,
                                                     f.pf == AV_PIX_FMT_YUV422P10LE ? 2 : 1);
                    std::shared_ptr<SwsContext> owner(ctx, sws_freeContext);
                    return [=, &p] {
                        const uint8_t* src[4] = {};
                        int ss[4] = {};
                        uint8_t* dst[4] = {};
                        int ds[4] = {};
                        if (f.pf == AV_PIX_FMT_YUV422P10LE) {
                            src[0] = p.y16.data(), src[1] = p.u16.data(), src[2] = p.v16.data();
                            ss[0] = p.y16.stride, ss[1] = p.u16.stride, ss[2] = p.v16.stride;
                            dst[0] = out->y.data(), dst[1] = out->u.data(), dst[2] = out->v.data();
                            ds[0] = out->y.stride, ds[1] = out->u.stride, ds[2] = out->v.stride;
                        } else {
                            const Plane& in = f.pf == AV_PIX_FMT_BGRA ? p.rgbq : p.yuy2;
                            src[0] = in.data();
                            ss[0] = in.stride;
                            dst[0] = out->packed.data();
                            ds[0] = out->packed.stride;
                        }
                        sws_scale(owner.get(), src, ss, 0, sc.src.h, dst, ds);
                    };
                });
            }
}
#endif

#ifdef LORVEX_HAVE_LIBYUV
void register_libyuv()
{
    const struct {
        libyuv::FilterMode mode;
        const char* filter;
    } filters[] = {{libyuv::kFilterBox, "area"}, {libyuv::kFilterBilinear, "linear"}};
    for (const Scaling& sc : kScalings)
        for (const auto& fl : filters) {
            add(bench_name("libyuv", "RGBQ", sc, fl.filter), sc, "", [=](const Picture& p) {
                auto out = std::make_shared<Out>(8, sc.dst.w, sc.dst.h, 1);
                return [=, &p] {
                    libyuv::ARGBScale(p.rgbq.data(), p.rgbq.stride, sc.src.w, sc.src.h, out->packed.data(),
                                      out->packed.stride, sc.dst.w, sc.dst.h, fl.mode);
                };
            });
            add(bench_name("libyuv", "YUY2", sc, fl.filter), sc, "unpack, I422Scale, pack", [=](const Picture& p) {
                auto in = std::make_shared<Out>(4, sc.src.w, sc.src.h, 1);
                auto out = std::make_shared<Out>(4, sc.dst.w, sc.dst.h, 1);
                return [=, &p] {
                    libyuv::YUY2ToI422(p.yuy2.data(), p.yuy2.stride, in->y.data(), in->y.stride, in->u.data(),
                                       in->u.stride, in->v.data(), in->v.stride, sc.src.w, sc.src.h);
                    libyuv::I422Scale(in->y.data(), in->y.stride, in->u.data(), in->u.stride, in->v.data(),
                                      in->v.stride, sc.src.w, sc.src.h, out->y.data(), out->y.stride,
                                      out->u.data(), out->u.stride, out->v.data(), out->v.stride, sc.dst.w,
                                      sc.dst.h, fl.mode);
                    libyuv::I422ToYUY2(out->y.data(), out->y.stride, out->u.data(), out->u.stride, out->v.data(),
                                       out->v.stride, out->packed.data(), out->packed.stride, sc.dst.w, sc.dst.h);
                };
            });
            add(bench_name("libyuv", "W210", sc, fl.filter), sc, "planar 10-bit 4:2:2", [=](const Picture& p) {
                auto out = std::make_shared<Out>(8, sc.dst.w, sc.dst.h, 2);
                return [=, &p] {
                    libyuv::I422Scale_16(p.y16.line_as<uint16_t>(0), p.y16.stride / 2, p.u16.line_as<uint16_t>(0),
                                         p.u16.stride / 2, p.v16.line_as<uint16_t>(0), p.v16.stride / 2, sc.src.w,
                                         sc.src.h, out->y.line_as<uint16_t>(0), out->y.stride / 2,
                                         out->u.line_as<uint16_t>(0), out->u.stride / 2,
                                         out->v.line_as<uint16_t>(0), out->v.stride / 2, sc.dst.w, sc.dst.h,
                                         fl.mode);
                };
            });
        }
}
#endif

#ifdef LORVEX_HAVE_ZIMG
// A zimg graph for planar 4:2:2 with co-sited chroma, the same kernel on luma
// and chroma.
struct ZimgGraph {
    zimg_filter_graph* graph = nullptr;
    std::vector<uint8_t> tmp_storage;
    void* tmp = nullptr;

    ZimgGraph(Scaling sc, bool ten_bits, zimg_resample_filter_e filter, double a, double b)
    {
        zimg_image_format in, out;
        zimg_image_format_default(&in, ZIMG_API_VERSION);
        zimg_image_format_default(&out, ZIMG_API_VERSION);
        for (zimg_image_format* f : {&in, &out}) {
            f->pixel_type = ten_bits ? ZIMG_PIXEL_WORD : ZIMG_PIXEL_BYTE;
            f->depth = ten_bits ? 10 : 8;
            f->subsample_w = 1;
            f->subsample_h = 0;
            f->color_family = ZIMG_COLOR_YUV;
            f->matrix_coefficients = ZIMG_MATRIX_BT709;
            f->pixel_range = ZIMG_RANGE_LIMITED;
            f->chroma_location = ZIMG_CHROMA_LEFT;
        }
        in.width = unsigned(sc.src.w);
        in.height = unsigned(sc.src.h);
        out.width = unsigned(sc.dst.w);
        out.height = unsigned(sc.dst.h);
        zimg_graph_builder_params params;
        zimg_graph_builder_params_default(&params, ZIMG_API_VERSION);
        params.resample_filter = params.resample_filter_uv = filter;
        params.filter_param_a = params.filter_param_a_uv = a;
        params.filter_param_b = params.filter_param_b_uv = b;
        graph = zimg_filter_graph_build(&in, &out, &params);
        size_t n = 0;
        zimg_filter_graph_get_tmp_size(graph, &n);
        tmp_storage.resize(n + 64);
        tmp = reinterpret_cast<void*>((reinterpret_cast<uintptr_t>(tmp_storage.data()) + 63) & ~uintptr_t(63));
    }
    ~ZimgGraph() { zimg_filter_graph_free(graph); }

    void run(const Plane& sy, const Plane& su, const Plane& sv, const Plane& dy, const Plane& du, const Plane& dv)
    {
        zimg_image_buffer_const src;
        zimg_image_buffer dst;
        std::memset(&src, 0, sizeof src);
        std::memset(&dst, 0, sizeof dst);
        src.version = dst.version = ZIMG_API_VERSION;
        const Plane* si[] = {&sy, &su, &sv};
        const Plane* di[] = {&dy, &du, &dv};
        for (int i = 0; i < 3; ++i) {
            src.plane[i] = {si[i]->data(), si[i]->stride, ZIMG_BUFFER_MAX};
            dst.plane[i] = {di[i]->data(), di[i]->stride, ZIMG_BUFFER_MAX};
        }
        zimg_filter_graph_process(graph, &src, &dst, tmp, nullptr, nullptr, nullptr, nullptr);
    }
};

void register_zimg()
{
    const struct {
        zimg_resample_filter_e filter;
        double a, b;
        const char* name;
    } filters[] = {{ZIMG_RESIZE_BICUBIC, 0.0, 1.0, "cubic"}, {ZIMG_RESIZE_LANCZOS, 3.0, 0.0, "lanczos3"}};
    for (bool ten : {false, true})
        for (const Scaling& sc : kScalings)
            for (const auto& fl : filters) {
                add(bench_name("zimg", ten ? "W210" : "YUY2", sc, fl.name), sc,
                    ten ? "planar 10-bit 4:2:2" : "planar 8-bit 4:2:2", [=](const Picture& p) {
                        auto g = std::make_shared<ZimgGraph>(sc, ten, fl.filter, fl.a, fl.b);
                        auto out = std::make_shared<Out>(4, sc.dst.w, sc.dst.h, ten ? 2 : 1);
                        return [=, &p] {
                            if (ten) g->run(p.y16, p.u16, p.v16, out->y, out->u, out->v);
                            else g->run(p.y8, p.u8, p.v8, out->y, out->u, out->v);
                        };
                    });
            }
}
#endif

#ifdef LORVEX_HAVE_PIXMAN
// A scaled a8r8g8b8 source with edge pixels repeated, as lorvex continues an
// image. Separable filters follow the usual pairing: reconstruct with the
// kernel when enlarging, sample with it (widened by the scale) when reducing.
struct PixmanScaled {
    pixman_image_t* src = nullptr;
    pixman_image_t* dst = nullptr;
    Plane out;

    PixmanScaled(const Picture& p, Scaling sc, pixman_filter_t filter, pixman_kernel_t kernel) : out(sc.dst.w * 4, sc.dst.h)
    {
        src = pixman_image_create_bits(PIXMAN_a8r8g8b8, p.width, p.height, reinterpret_cast<uint32_t*>(p.rgbq.data()),
                                       p.rgbq.stride);
        dst = pixman_image_create_bits(PIXMAN_a8r8g8b8, sc.dst.w, sc.dst.h, reinterpret_cast<uint32_t*>(out.data()),
                                       out.stride);
        const double kx = double(sc.src.w) / sc.dst.w, ky = double(sc.src.h) / sc.dst.h;
        pixman_transform_t t;
        pixman_transform_init_scale(&t, pixman_double_to_fixed(kx), pixman_double_to_fixed(ky));
        pixman_image_set_transform(src, &t);
        pixman_image_set_repeat(src, PIXMAN_REPEAT_PAD);
        if (filter == PIXMAN_FILTER_SEPARABLE_CONVOLUTION) {
            const pixman_kernel_t rx = kx > 1 ? PIXMAN_KERNEL_IMPULSE : kernel, ry = ky > 1 ? PIXMAN_KERNEL_IMPULSE : kernel;
            const pixman_kernel_t sx = kx > 1 ? kernel : PIXMAN_KERNEL_IMPULSE, sy = ky > 1 ? kernel : PIXMAN_KERNEL_IMPULSE;
            int n = 0;
            pixman_fixed_t* params = pixman_filter_create_separable_convolution(
                &n, pixman_double_to_fixed(std::max(kx, 1.0)), pixman_double_to_fixed(std::max(ky, 1.0)), rx, ry, sx, sy,
                4, 4);
            pixman_image_set_filter(src, filter, params, n);
            free(params);
        } else {
            pixman_image_set_filter(src, filter, nullptr, 0);
        }
    }
    ~PixmanScaled()
    {
        pixman_image_unref(src);
        pixman_image_unref(dst);
    }
};

void register_pixman()
{
    const struct {
        pixman_filter_t filter;
        pixman_kernel_t kernel;
        const char* name;
    } filters[] = {
        {PIXMAN_FILTER_BILINEAR, PIXMAN_KERNEL_IMPULSE, "linear"},
        {PIXMAN_FILTER_SEPARABLE_CONVOLUTION, PIXMAN_KERNEL_BOX, "area"},
        {PIXMAN_FILTER_SEPARABLE_CONVOLUTION, PIXMAN_KERNEL_CUBIC, "cubic"},
        {PIXMAN_FILTER_SEPARABLE_CONVOLUTION, PIXMAN_KERNEL_LANCZOS2, "lanczos2"},
        {PIXMAN_FILTER_SEPARABLE_CONVOLUTION, PIXMAN_KERNEL_LANCZOS3, "lanczos3"},
    };
    for (const Scaling& sc : kScalings)
        for (const auto& fl : filters) {
            add(bench_name("pixman", "RGBQ", sc, fl.name), sc, "a8r8g8b8 SRC", [=](const Picture& p) {
                auto img = std::make_shared<PixmanScaled>(p, sc, fl.filter, fl.kernel);
                return [=] {
                    pixman_image_composite32(PIXMAN_OP_SRC, img->src, nullptr, img->dst, 0, 0, 0, 0, 0, 0, sc.dst.w,
                                             sc.dst.h);
                };
            });
            if (fl.kernel == PIXMAN_KERNEL_IMPULSE || fl.kernel == PIXMAN_KERNEL_CUBIC)
                add(bench_name("pixman", "RGBQ+alpha over RGBQ", sc, fl.name), sc, "premultiplied a8r8g8b8 OVER",
                    [=](const Picture& p) {
                        auto img = std::make_shared<PixmanScaled>(p, sc, fl.filter, fl.kernel);
                        return [=] {
                            pixman_image_composite32(PIXMAN_OP_OVER, img->src, nullptr, img->dst, 0, 0, 0, 0, 0, 0,
                                                     sc.dst.w, sc.dst.h);
                        };
                    });
        }
}
#endif

#ifdef LORVEX_HAVE_OPENCV
void register_opencv()
{
    cv::setNumThreads(1);
    const struct {
        int interpolation;
        const char* name;
    } filters[] = {{cv::INTER_AREA, "area"}, {cv::INTER_LINEAR, "linear"}, {cv::INTER_CUBIC, "cubic"},
                   {cv::INTER_LANCZOS4, "lanczos4"}};
    for (const Scaling& sc : kScalings)
        for (const auto& fl : filters) {
            const cv::Size dsize(sc.dst.w, sc.dst.h), csize((sc.dst.w + 1) / 2, sc.dst.h);
            add(bench_name("opencv", "RGBQ", sc, fl.name), sc, "CV_8UC4", [=](const Picture& p) {
                auto out = std::make_shared<cv::Mat>();
                return [=, &p] {
                    const cv::Mat in(p.height, p.width, CV_8UC4, p.rgbq.data(), size_t(p.rgbq.stride));
                    cv::resize(in, *out, dsize, 0, 0, fl.interpolation);
                };
            });
            for (bool ten : {false, true})
                add(bench_name("opencv", ten ? "W210" : "YUY2", sc, fl.name), sc,
                    ten ? "three 16-bit planes" : "three 8-bit planes", [=](const Picture& p) {
                        auto out = std::make_shared<std::vector<cv::Mat>>(3);
                        const int type = ten ? CV_16UC1 : CV_8UC1;
                        const Plane* planes[] = {ten ? &p.y16 : &p.y8, ten ? &p.u16 : &p.u8, ten ? &p.v16 : &p.v8};
                        return [=, &p] {
                            for (int i = 0; i < 3; ++i) {
                                const int w = i == 0 ? p.width : (p.width + 1) / 2;
                                const cv::Mat in(p.height, w, type, planes[i]->data(), size_t(planes[i]->stride));
                                cv::resize(in, (*out)[size_t(i)], i == 0 ? dsize : csize, 0, 0, fl.interpolation);
                            }
                        };
                    });
        }
}
#endif

void register_memcpy()
{
    const struct {
        const char* format;
        int bytes_per_pixel;
    } formats[] = {{"YUY2", 2}, {"W210", 4}, {"RGBQ", 4}};
    for (const auto& f : formats)
        add(bench_name("memcpy", f.format, kCopy, "copy"), kCopy, "", [=](const Picture&) {
            const size_t n = size_t(kCopy.dst.w) * kCopy.dst.h * size_t(f.bytes_per_pixel);
            auto a = std::make_shared<Plane>(int(n / kCopy.dst.h), kCopy.dst.h);
            auto b = std::make_shared<Plane>(int(n / kCopy.dst.h), kCopy.dst.h);
            std::memset(a->data(), 0x55, n);
            return [=] {
                std::memcpy(b->data(), a->data(), n);
                benchmark::DoNotOptimize(b->data());
            };
        });
}

}  // namespace

void register_peers()
{
#ifdef LORVEX_HAVE_SWSCALE
    register_swscale();
#endif
#ifdef LORVEX_HAVE_LIBYUV
    register_libyuv();
#endif
#ifdef LORVEX_HAVE_ZIMG
    register_zimg();
#endif
#ifdef LORVEX_HAVE_PIXMAN
    register_pixman();
#endif
#ifdef LORVEX_HAVE_OPENCV
    register_opencv();
#endif
    register_memcpy();
}

}  // namespace bench
