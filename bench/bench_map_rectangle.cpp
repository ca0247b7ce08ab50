// map_rectangle workloads, single thread: YUY2, W210 and RGBQ over the four
// scalings and every filter kind, sources and destinations with alpha planes,
// and the 1:1 copy. The counter "MP/s" is destination megapixels per second.
//
// Each workload maps the whole source frame onto the whole destination frame
// with the same kind in both directions, opaque. Kind 7 draws nothing in the
// main region horizontally, so its workload pairs vertical kind 7 with
// horizontal Lanczos 4 (both magnification kinds); W210 sources have no
// vertical kind 7 and skip it.
//
// Benchmark names are "lorvex/<format>/<src>-><dst>/<filter>"; bench_peers.cpp
// names the same work the same way after its own prefix.
#include <benchmark/benchmark.h>

#include <string>

#include "bench_images.h"
#include "lorvex.h"

namespace bench {
namespace {

enum class Alpha {
    none,
    source_straight,     // source with a straight alpha plane, destination without
    source_premultiplied,// source with a premultiplied alpha plane, destination without
    both,                // straight source alpha into a destination with an alpha plane
};

struct Target {
    Plane colour, alpha;
    Surface s{};
};

Surface source_surface(const Picture& p, int format, Alpha alpha)
{
    Surface s{};
    s.width = p.width;
    s.height = p.height;
    s.format = uint8_t(format);
    const Plane& plane = format == FORMAT_YUY2 ? p.yuy2 : format == FORMAT_W210 ? p.w210 : p.rgbq;
    s.data = plane.data();
    s.stride = plane.stride;
    if (alpha != Alpha::none) {
        s.alpha_format = ALPHA_W12B;
        s.alpha_mode = alpha == Alpha::source_premultiplied ? ALPHA_MODE_PREMULTIPLIED : ALPHA_MODE_STRAIGHT;
        s.alpha_data = p.alpha.data();
        s.alpha_stride = p.alpha.stride;
    }
    return s;
}

void make_target(Target& t, int format, int width, int height, bool with_alpha)
{
    const int pairs = (width + 1) / 2;
    const int bytes = format == FORMAT_YUY2 ? pairs * 4 : format == FORMAT_W210 ? pairs * 8 : width * 4;
    t.colour = Plane(bytes, height);
    t.s.width = width;
    t.s.height = height;
    t.s.format = uint8_t(format);
    t.s.data = t.colour.data();
    t.s.stride = t.colour.stride;
    if (with_alpha) {
        t.alpha = Plane(width * 2, height);
        t.s.alpha_format = ALPHA_W12B;
        t.s.alpha_mode = ALPHA_MODE_PREMULTIPLIED;
        t.s.alpha_data = t.alpha.data();
        t.s.alpha_stride = t.alpha.stride;
    }
}

const char* const kFilterNames[] = {"area", "linear", "cubic", "soft", "lanczos2", "lanczos3", "lanczos4", "edge"};

void add(const std::string& name, int format, Scaling sc, uint32_t flags, Alpha alpha)
{
    benchmark::RegisterBenchmark(name.c_str(), [=](benchmark::State& state) {
        const Picture& src = picture(sc.src.w, sc.src.h);
        const Surface s = source_surface(src, format, alpha);
        Target t;
        make_target(t, format, sc.dst.w, sc.dst.h, alpha == Alpha::both);
        for (auto _ : state) {
            map_rectangle(&t.s, 0, 0, float(sc.dst.w), float(sc.dst.h), &s, 0, 0, float(sc.src.w),
                          float(sc.src.h), int32_t(flags), 0, 1);
            benchmark::DoNotOptimize(t.colour.data());
            benchmark::ClobberMemory();
        }
        state.counters["MP/s"] = benchmark::Counter(double(sc.dst.w) * sc.dst.h / 1e6,
                                                    benchmark::Counter::kIsIterationInvariantRate);
    })->Unit(benchmark::kMillisecond);
}

void register_lorvex()
{
    const struct {
        int format;
        const char* name;
    } formats[] = {{FORMAT_YUY2, "YUY2"}, {FORMAT_W210, "W210"}, {FORMAT_RGBQ, "RGBQ"}};

    for (const auto& f : formats) {
        for (const Scaling& sc : kScalings) {
            for (int kind = 0; kind < 8; ++kind) {
                if (kind == LORVEX_FILTER_EDGE && f.format == FORMAT_W210) continue;
                const int h = kind == LORVEX_FILTER_EDGE ? LORVEX_FILTER_LANCZOS4 : kind;
                add(bench_name("lorvex", f.name, sc, kFilterNames[kind]), f.format, sc,
                    lorvex_flag_filters(h, kind) | lorvex_flag_level(4096), Alpha::none);
            }
        }
        add(bench_name("lorvex", f.name, kCopy, "copy"), f.format, kCopy,
            lorvex_flag_filters(LORVEX_FILTER_AREA, LORVEX_FILTER_AREA) | lorvex_flag_level(4096), Alpha::none);
    }

    // Alpha: keying a straight source over YUY2, a premultiplied RGBQ source
    // over RGBQ (the work of a compositor's OVER), and a straight source into
    // a destination that keeps its own alpha.
    for (const Scaling& sc : kScalings) {
        for (int kind : {LORVEX_FILTER_LINEAR, LORVEX_FILTER_CUBIC}) {
            const uint32_t flags = lorvex_flag_filters(kind, kind) | lorvex_flag_level(4096);
            add(bench_name("lorvex", "YUY2+alpha over YUY2", sc, kFilterNames[kind]), FORMAT_YUY2, sc, flags,
                Alpha::source_straight);
            add(bench_name("lorvex", "RGBQ+alpha over RGBQ", sc, kFilterNames[kind]), FORMAT_RGBQ, sc, flags,
                Alpha::source_premultiplied);
            add(bench_name("lorvex", "YUY2+alpha into YUY2+alpha", sc, kFilterNames[kind]), FORMAT_YUY2, sc,
                flags, Alpha::both);
        }
    }
}

}  // namespace
}  // namespace bench

int main(int argc, char** argv)
{
    bench::register_lorvex();
    bench::register_peers();
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
