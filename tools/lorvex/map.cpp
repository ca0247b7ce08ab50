// `lorvex map INPUT OUTPUT`: one map_rectangle call on picture files.
//
// The input is read in its own layout; an RGB file meets a 4:2:2 working
// format (or a video file the RGBQ one) through the colour conversion. The
// destination is the background (--onto) or black, in the working format,
// with an alpha plane when the output is a PNG and the source or background
// has alpha. After the call the destination is converted to the output
// file's layout and written. A Y4M output keeps the frame rate, interlace
// and aspect of a Y4M input or background; it is marked interlaced (top
// field first) when a destination field is drawn into a progressive frame,
// and progressive when a source field is read into a whole frame.
#include "cli.h"
#include "colour.h"
#include "files.h"

#include <algorithm>
#include <cstdio>
#include <thread>
#include <vector>

namespace lorvex_cli {

namespace {

const char usage[] =
    "usage: lorvex map INPUT OUTPUT [OPTIONS]\n"
    "\n"
    "Resamples the source rectangle of INPUT into the destination rectangle of\n"
    "OUTPUT with one map_rectangle call. Files by their name: .png and .jpg (RGB;\n"
    "PNG may have alpha), .y4m (4:2:2, 8-bit C422 or 10-bit C422p10; the first\n"
    "frame), .yuy2 and .w210 (raw frames in the library's own layouts).\n"
    "RGB and 4:2:2 meet through BT.709 for HD sizes (1280 wide or 720 high and\n"
    "up) and BT.601 below, video range, chroma co-sited with the even pixel; the\n"
    "size that decides is the video file's, or the output's.\n"
    "\n"
    "Options:\n"
    "  --format yuy2|w210|rgbq  working format of the call (default: w210 for a\n"
    "                           10-bit input or a .w210 output, else yuy2 if\n"
    "                           either file is video, else rgbq); Y4M output is\n"
    "                           10-bit for w210\n"
    "  --size WxH               output size (default: the input's)\n"
    "  --onto FILE              draw over this picture, which sets the output size\n"
    "  --src X0,Y0,X1,Y1        source rectangle, fractional input pixels\n"
    "                           (default: the whole input)\n"
    "  --dst X0,Y0,X1,Y1        destination rectangle, fractional output pixels\n"
    "                           (default: the whole output)\n"
    "  --alpha straight|premultiplied\n"
    "                           how the input's colour relates to its alpha\n"
    "                           (default straight, as PNG stores it)\n"
    "  --raw WxH                size of a raw input frame (.yuy2, .w210) and of a\n"
    "                           raw background\n"
    "  --threads N              split the call among N threads by line, 1 to 64\n"
    "                           (default 1); the result is the same\n"
    "  --quiet                  print nothing on success\n"
    "The flags word (default: cubic filters, opaque):\n";

struct MapOptions {
    std::string input, output, onto;
    int format = -1;
    int width = 0, height = 0;
    int raw_width = 0, raw_height = 0;
    bool have_src = false, have_dst = false;
    float src[4] = {}, dst[4] = {};
    int alpha_mode = 0; // 0 not given
    int threads = 1;
    bool quiet = false;
    FlagOptions flags;
};

MapOptions parse(Args &args)
{
    MapOptions o;
    o.flags.hfilter = o.flags.vfilter = LORVEX_FILTER_CUBIC;
    std::vector<std::string> files;
    while (!args.done()) {
        const std::string arg = args.take();
        if (!is_option(arg)) {
            files.push_back(arg);
        } else if (parse_flag_option(arg, args, o.flags)) {
        } else if (arg == "--format") {
            const std::string f = args.value(arg);
            if (f == "yuy2")
                o.format = FORMAT_YUY2;
            else if (f == "w210")
                o.format = FORMAT_W210;
            else if (f == "rgbq")
                o.format = FORMAT_RGBQ;
            else
                throw Error("--format: unknown format '" + f + "' (yuy2, w210 or rgbq)");
        } else if (arg == "--size") {
            parse_size(args.value(arg), arg, o.width, o.height);
        } else if (arg == "--onto") {
            o.onto = args.value(arg);
        } else if (arg == "--src") {
            parse_rect(args.value(arg), arg, o.src);
            o.have_src = true;
        } else if (arg == "--dst") {
            parse_rect(args.value(arg), arg, o.dst);
            o.have_dst = true;
        } else if (arg == "--alpha") {
            const std::string m = args.value(arg);
            if (m == "straight")
                o.alpha_mode = ALPHA_MODE_STRAIGHT;
            else if (m == "premultiplied")
                o.alpha_mode = ALPHA_MODE_PREMULTIPLIED;
            else
                throw Error("--alpha: '" + m + "' is not straight or premultiplied");
        } else if (arg == "--raw") {
            parse_size(args.value(arg), arg, o.raw_width, o.raw_height);
        } else if (arg == "--threads") {
            o.threads = parse_int(args.value(arg), arg, 1, 64);
        } else if (arg == "--quiet") {
            o.quiet = true;
        } else {
            throw Error("map: unknown option '" + arg + "' (--help lists them)");
        }
    }
    if (files.size() != 2)
        throw Error(files.size() < 2 ? "map: needs an INPUT and an OUTPUT file"
                                     : "map: too many files ('" + files[2] + "'); give one INPUT and one OUTPUT");
    o.input = files[0];
    o.output = files[1];
    if (!o.onto.empty() && o.width > 0)
        throw Error("map: --size and --onto both set the output size; give one");
    return o;
}

// The refusals of map_rectangle that the tool can see coming, reported
// instead of writing an untouched destination. `hstep` and `vstep` are
// source pixels and lines per destination pixel and line, in the lines the
// call walks (a field has half the frame's lines).
void check_drawable(const MapOptions &o, const Frame &src, const Frame &dst, double hstep, double vstep)
{
    if (o.flags.hfilter == LORVEX_FILTER_EDGE && hstep < 1.0 && dst.format == FORMAT_W210 && !dst.has_alpha())
        throw Error("--hfilter edge does not draw a magnification into w210 without an alpha plane "
                    "(use --format yuy2 or another filter)");
    if (o.flags.vfilter == LORVEX_FILTER_EDGE && vstep <= 1.0 &&
        ((src.format != FORMAT_YUY2 && src.format != FORMAT_RGBQ) || src.has_alpha()))
        throw Error("--vfilter edge does not draw a magnification from a " +
                    std::string(src.has_alpha() ? "source with alpha" : "w210 source") +
                    " (use --format yuy2 or rgbq, or another filter)");
}

} // namespace

int run_map(Args args)
{
    if (args.wants_help()) {
        std::printf("%s%s", usage, flag_options_help);
        return 0;
    }
    const MapOptions o = parse(args);
    const FileKind in_kind = file_kind(o.input);
    const FileKind out_kind = file_kind(o.output);
    if (o.raw_width > 0 && !is_raw_file(in_kind) && !(!o.onto.empty() && is_raw_file(file_kind(o.onto))))
        throw Error("--raw gives the size of a raw frame (.yuy2, .w210), and no file here is one");

    VideoInfo info;
    Frame input = read_picture(o.input, o.raw_width, o.raw_height, &info);
    Frame background;
    if (!o.onto.empty())
        background = read_picture(o.onto, o.raw_width, o.raw_height,
                                  in_kind == FileKind::y4m ? nullptr : &info);
    // A picture drawn into one field makes an interlaced frame; one field
    // read into a whole frame makes a progressive one.
    if (o.flags.dest_field >= 0 && info.interlace == "p")
        info.interlace = "t";
    else if (o.flags.source_field >= 0 && o.flags.dest_field < 0)
        info.interlace = "p";

    if (o.alpha_mode != 0) {
        if (!input.has_alpha())
            throw Error("--alpha: '" + o.input + "' has no alpha channel");
        input.alpha_mode = o.alpha_mode;
    }

    const int out_width = !o.onto.empty() ? background.width : o.width > 0 ? o.width : input.width;
    const int out_height = !o.onto.empty() ? background.height : o.width > 0 ? o.height : input.height;
    int format = o.format;
    if (format < 0)
        format = input.format == FORMAT_W210 || out_kind == FileKind::w210 ? FORMAT_W210
                 : is_video_file(in_kind) || is_video_file(out_kind)       ? FORMAT_YUY2
                                                                           : FORMAT_RGBQ;
    // The video file's size picks the matrix; the output's when both or
    // neither are video.
    const Matrix matrix = is_video_file(in_kind) && !is_video_file(out_kind) ? matrix_for_size(input.width, input.height)
                                                                             : matrix_for_size(out_width, out_height);

    // A 4:2:2 source of either depth pairs with a 4:2:2 destination of either.
    const Frame source =
        is_video_format(input.format) && is_video_format(format) ? input : convert(input, format, matrix);
    const bool dest_alpha = out_kind == FileKind::png && (input.has_alpha() || background.has_alpha());
    Frame dest;
    if (!o.onto.empty()) {
        dest = convert(background, format, matrix);
        if (dest_alpha)
            add_alpha(dest, 4096);
        else
            dest.alpha.clear(); // the output keeps no alpha: draw onto opaque colour
    } else {
        dest = make_frame(out_width, out_height, format, dest_alpha);
    }
    dest.alpha_mode = ALPHA_MODE_STRAIGHT;

    float src_rect[4] = {0, 0, float(input.width), float(input.height)};
    float dst_rect[4] = {0, 0, float(out_width), float(out_height)};
    if (o.have_src)
        std::copy(o.src, o.src + 4, src_rect);
    if (o.have_dst)
        std::copy(o.dst, o.dst + 4, dst_rect);
    double hstep = (src_rect[2] - src_rect[0]) / double(dst_rect[2] - dst_rect[0]);
    double vstep = (src_rect[3] - src_rect[1]) / double(dst_rect[3] - dst_rect[1]);
    if (o.flags.source_field >= 0)
        vstep *= 0.5;
    if (o.flags.dest_field >= 0)
        vstep *= 2.0;
    check_drawable(o, source, dest, hstep, vstep);

    const uint32_t flags = o.flags.word();
    const Surface s = source.surface();
    const Surface d = dest.surface();
    auto draw = [&](int phase) {
        map_rectangle(&d, dst_rect[0], dst_rect[1], dst_rect[2], dst_rect[3], &s, src_rect[0], src_rect[1],
                      src_rect[2], src_rect[3], int32_t(flags), phase, o.threads);
    };
    if (o.threads == 1) {
        draw(0);
    } else {
        std::vector<std::thread> workers;
        for (int phase = 0; phase < o.threads; ++phase)
            workers.emplace_back(draw, phase);
        for (std::thread &t : workers)
            t.join();
    }

    int out_format = FORMAT_RGBQ;
    if (out_kind == FileKind::y4m)
        out_format = format == FORMAT_W210 ? FORMAT_W210 : FORMAT_YUY2;
    else if (out_kind == FileKind::yuy2)
        out_format = FORMAT_YUY2;
    else if (out_kind == FileKind::w210)
        out_format = FORMAT_W210;
    const Frame result = convert(dest, out_format, matrix);
    write_picture(o.output, result, info);

    if (!o.quiet) {
        const bool converted = (input.format == FORMAT_RGBQ) != (format == FORMAT_RGBQ) ||
                               (format == FORMAT_RGBQ) != (out_format == FORMAT_RGBQ);
        std::printf("%s: %dx%d %s, flags 0x%08X (%s/%s)%s%s, %d thread%s\n", o.output.c_str(), out_width,
                    out_height, format_name(format), flags, filter_name(o.flags.hfilter),
                    filter_name(o.flags.vfilter), converted ? ", " : "", converted ? matrix_name(matrix) : "",
                    o.threads, o.threads == 1 ? "" : "s");
    }
    return 0;
}

} // namespace lorvex_cli
