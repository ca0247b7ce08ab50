// `lorvex demo [--out DIR]`: the showcase. Every picture is drawn by
// map_rectangle or multisrc_map_rectangle from the built-in inputs, mostly
// in YUY2 as a video host would, and written as PNG with an index.html that
// says what each one shows.
#include "card.h"
#include "cli.h"
#include "colour.h"
#include "files.h"

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>

namespace lorvex_cli {

namespace {

namespace fs = std::filesystem;

const char usage[] =
    "usage: lorvex demo [--out DIR]\n"
    "\n"
    "Draws a test card and renders a showcase of the library from it: every\n"
    "filter kind reducing and enlarging side by side, a picture-in-picture at a\n"
    "sub-pixel position and half opacity, an interlaced frame drawn field by\n"
    "field, a straight-alpha logo over a picture and a tiled mosaic. Writes PNG\n"
    "files and index.html into DIR (default: out), and prints the index's path.\n";

const uint8_t label_colour[3] = {225, 225, 225};
const uint8_t title_colour[3] = {255, 214, 120};

uint32_t flags_for(int hkind, int vkind, double opacity = 1.0)
{
    return lorvex_flag_filters(hkind, vkind) | lorvex_flag_opacity(opacity);
}

void map(Frame &dst, const float d[4], const Frame &src, const float s[4], uint32_t flags)
{
    const Surface ds = dst.surface(), ss = src.surface();
    map_rectangle(&ds, d[0], d[1], d[2], d[3], &ss, s[0], s[1], s[2], s[3], int32_t(flags), 0, 1);
}

// The whole of `src` (or its rectangle `s`) into a new black picture.
Frame scaled(const Frame &src, int width, int height, uint32_t flags, const float *s = nullptr)
{
    Frame dst = make_frame(width, height, src.format);
    const float d[4] = {0, 0, float(width), float(height)};
    const float whole[4] = {0, 0, float(src.width), float(src.height)};
    map(dst, d, src, s != nullptr ? s : whole, flags);
    return dst;
}

// A part of a picture enlarged `factor` times with the area kind, which on
// magnification repeats each pixel: the pixels themselves, as blocks.
Frame zoom(const Frame &src, int x, int y, int width, int height, int factor)
{
    const float s[4] = {float(x), float(y), float(x + width), float(y + height)};
    return scaled(src, width * factor, height * factor, flags_for(LORVEX_FILTER_AREA, LORVEX_FILTER_AREA), s);
}

// Largest difference between two 4:2:2 pictures, sample by sample, over the
// pixels that `counts(x, y)` accepts (a chroma sample stands at its pair's
// even pixel).
template <class Counts>
int max_difference(const Frame &a, const Frame &b, Counts counts)
{
    const Planes pa = to_planes(a), pb = to_planes(b);
    int worst = 0;
    for (int y = 0; y < pa.height; ++y)
        for (int x = 0; x < pa.width; ++x) {
            if (!counts(x, y))
                continue;
            const std::size_t i = std::size_t(y) * std::size_t(pa.width) + std::size_t(x);
            worst = std::max(worst, std::abs(int(pa.y[i]) - int(pb.y[i])));
            if (x % 2 == 0) {
                const std::size_t c = std::size_t(y) * std::size_t(pa.chroma_width()) + std::size_t(x / 2);
                worst = std::max({worst, std::abs(int(pa.cb[c]) - int(pb.cb[c])), std::abs(int(pa.cr[c]) - int(pb.cr[c]))});
            }
        }
    return worst;
}

// A dark canvas on which pictures are laid out with labels.
struct Sheet {
    Frame canvas;

    Sheet(int width, int height) : canvas(make_frame(width, height, FORMAT_RGBQ))
    {
        for (int y = 0; y < height; ++y)
            for (int x = 0; x < width; ++x)
                put_rgb(canvas, x, y, 26, 28, 32);
    }
    void paste(const Frame &rgbq, int x, int y)
    {
        for (int row = 0; row < rgbq.height; ++row)
            std::memcpy(canvas.line(y + row) + 4 * x, rgbq.line(row), std::size_t(rgbq.width) * 4);
    }
    void label(int x, int y, std::string_view text, int scale = 1, const uint8_t *colour = label_colour)
    {
        draw_text(canvas, x, y, scale, text, colour);
    }
};

struct Picture {
    std::string file, title, caption;
};

class Showcase {
public:
    explicit Showcase(fs::path dir) : dir_(std::move(dir)) {}

    void write(const std::string &file, const Frame &rgbq, std::string title, std::string caption)
    {
        write_picture((dir_ / file).string(), rgbq, VideoInfo());
        pictures_.push_back({file, std::move(title), std::move(caption)});
    }
    void write_index() const;
    fs::path index() const { return dir_ / "index.html"; }

private:
    fs::path dir_;
    std::vector<Picture> pictures_;
};

void Showcase::write_index() const
{
    std::string html =
        "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
        "<title>lorvex demo</title>\n<style>\n"
        "body { background: #1a1c20; color: #ddd; font: 15px/1.5 sans-serif; margin: 2em auto; max-width: 1400px; "
        "padding: 0 1em; }\n"
        "h1 { color: #ffd678; font-weight: normal; }\n"
        "figure { margin: 2.5em 0; }\n"
        "figure img { max-width: 100%; border: 1px solid #444; }\n"
        "figcaption { max-width: 60em; }\n"
        "figcaption b { color: #ffd678; font-weight: normal; font-size: 1.15em; }\n"
        "code { color: #9cf; }\n"
        "</style>\n</head>\n<body>\n<h1>lorvex demo</h1>\n"
        "<p>Every picture below was drawn by <code>map_rectangle</code> or "
        "<code>multisrc_map_rectangle</code> from inputs the demo draws itself, most of them in YUY2 "
        "(8-bit 4:2:2) as a video host would hold them. RGB and YUY2 meet through libswscale: BT.601 for "
        "the 640x360 card, BT.709 for the 1280x720 pictures, video range, chroma co-sited with the even "
        "pixel. Pictures shown at their own size; the zoomed ones repeat each pixel as a block.</p>\n";
    for (const Picture &p : pictures_)
        html += "<figure>\n<img src=\"" + p.file + "\" alt=\"" + p.title + "\">\n<figcaption><b>" + p.title +
                "</b><br>\n" + p.caption + "\n</figcaption>\n</figure>\n";
    html += "</body>\n</html>\n";
    std::ofstream out(index(), std::ios::binary);
    out << html;
    out.close();
    if (!out)
        throw Error("cannot write '" + index().string() + "': " + std::strerror(errno));
}

// ---- The showcase, picture by picture ------------------------------------

const char *const kind_labels[8] = {"0 AREA",     "1 LINEAR",   "2 CUBIC",    "3 SOFT",
                                    "4 LANCZOS2", "5 LANCZOS3", "6 LANCZOS4", "7 EDGE"};

// Eight panels, one per filter kind, four to a row, each labelled below.
void filter_sheet(Showcase &show, const Frame &card_yuy2, const float *crop, int panel_w, int panel_h,
                  bool enlarge, const std::string &file, const std::string &title, const std::string &caption,
                  const std::string &heading)
{
    constexpr int gap = 16, label_h = 22, top = 34;
    Sheet sheet(4 * panel_w + 5 * gap, top + 2 * (panel_h + label_h) + 2 * gap);
    sheet.label(gap, 12, heading, 2, title_colour);
    for (int kind = 0; kind < 8; ++kind) {
        // Horizontally kind 7 draws only what lies beyond the source's edges,
        // so its panel pairs the vertical edge-adaptive kernel with linear.
        const int hkind = kind == LORVEX_FILTER_EDGE && enlarge ? LORVEX_FILTER_LINEAR : kind;
        const Frame panel = scaled(card_yuy2, panel_w, panel_h, flags_for(hkind, kind), crop);
        const int x = gap + (kind % 4) * (panel_w + gap);
        const int y = top + gap + (kind / 4) * (panel_h + label_h + gap);
        sheet.paste(video_to_rgb(panel, Matrix::bt601), x, y);
        std::string label = kind_labels[kind];
        if (!enlarge && kind >= LORVEX_FILTER_LANCZOS4)
            label += " (AREA ON REDUCTION)";
        if (enlarge && kind == LORVEX_FILTER_EDGE)
            label += " (VERTICAL; LINEAR ACROSS)";
        sheet.label(x, y + panel_h + 7, label);
    }
    show.write(file, sheet.canvas, title, caption);
}

void draw_filters(Showcase &show, const Frame &card_yuy2)
{
    filter_sheet(show, card_yuy2, nullptr, 256, 144, false, "filters-down.png",
                 "Every filter kind, reducing 2.5 times",
                 "The whole card, 640x360 in YUY2, into 256x144 with the same kind horizontally and vertically. "
                 "Area averages exactly by overlap; the other kinds differ in how much of the zone plate's outer "
                 "rings and the fine diagonals they keep and how much moire they leave: soft (squared sinc) is "
                 "the smoothest, the Lanczos kinds the sharpest. On reduction the filters widen with the scale, and kinds 6 "
                 "(Lanczos 4) and 7 (edge), which serve magnification only, average by area. All panels are "
                 "aligned: no kind shifts the picture.",
                 "640X360 TO 256X144");

    // 80x45 of the card's lower left corner, enlarged four times: the end of
    // the grey ramp, the border, large and small text.
    const float crop[4] = {0.0f, 302.0f, 80.0f, 347.0f};
    filter_sheet(show, card_yuy2, crop, 320, 180, true, "filters-up.png", "Every filter kind, enlarging 4 times",
                 "An 80x45 part of the card (x 0-80, y 302-347: the dark end of the grey ramp, the one-pixel "
                 "border, large and small text) into 320x180. Area repeats each pixel as a block; linear "
                 "blurs; cubic and the Lanczos kinds keep the strokes sharp with a faint ring beside them, "
                 "strongest with Lanczos 4; soft blurs most. Kind 7 is shown as the vertical edge-adaptive "
                 "interpolator, with linear across: horizontally, kind 7 draws only the parts of a rectangle that lie beyond the source's edges. The border "
                 "and the letters stand at the same place in every panel: no kind shifts the picture.",
                 "80X45 PART TO 320X180");
}

void draw_pip(Showcase &show, const Frame &card_rgb)
{
    const Frame scene = rgb_to_video(make_scene(1280, 720, 0.3), FORMAT_YUY2, Matrix::bt709);
    const Frame card = rgb_to_video(card_rgb, FORMAT_YUY2, Matrix::bt709);
    Frame picture = scene;
    const float d[4] = {700.25f, 40.5f, 1220.25f, 333.0f};
    const float s[4] = {0, 0, float(card.width), float(card.height)};
    map(picture, d, card, s, flags_for(LORVEX_FILTER_CUBIC, LORVEX_FILTER_CUBIC, 0.5));
    const Frame rgb = video_to_rgb(picture, Matrix::bt709);
    show.write("pip.png", rgb, "Picture in picture at a sub-pixel position, 50% opacity",
               "The card into the rectangle (700.25, 40.5)-(1220.25, 333.0) of a 1280x720 YUY2 picture: "
               "scaled 0.8125 times with the cubic filter and mixed at half opacity, so the landscape shows "
               "through it.");
    // 40x30 around the top left corner, eight times.
    const Frame corner = zoom(rgb, 690, 30, 40, 30, 8);
    show.write("pip-corner.png", corner, "The corner of the picture in picture, 8 times",
               "Pixels 690-730, lines 30-60 of the picture above, each pixel a block. The rectangle starts a "
               "quarter into pixel 700 and half way down line 40: column 700 is drawn at three quarters of "
               "the coverage of its neighbours and line 40 at half, so the edge sits between pixels as it "
               "should; the corner pixel gets the product, three eighths.");
}

void draw_logo(Showcase &show)
{
    const Frame scene = rgb_to_video(make_scene(1280, 720, 0.55), FORMAT_YUY2, Matrix::bt709);
    const Frame logo = rgb_to_video(make_logo(), FORMAT_YUY2, Matrix::bt709);
    const float whole[4] = {0, 0, float(logo.width), float(logo.height)};
    Frame picture = scene;
    const float big[4] = {60.5f, 50.25f, 460.5f, 210.25f};
    map(picture, big, logo, whole, flags_for(LORVEX_FILTER_CUBIC, LORVEX_FILTER_CUBIC));
    const float small[4] = {1060.75f, 40.5f, 1220.75f, 104.5f};
    map(picture, small, logo, whole, flags_for(LORVEX_FILTER_LINEAR, LORVEX_FILTER_LINEAR, 0.5));
    const Frame rgb = video_to_rgb(picture, Matrix::bt709);
    show.write("logo.png", rgb, "A straight-alpha logo over a picture",
               "A 160x64 YUY2 logo with a 12-bit alpha plane in straight form, drawn 2.5 times larger with the "
               "cubic filter at (60.5, 50.25), and at its own size at half opacity at (1060.75, 40.5) with "
               "the linear filter. Its soft edge blends into the sky. Where the logo's alpha is 0 its colour "
               "is magenta, a value that means nothing in straight form: lorvex weights every sample by its "
               "alpha as it reads it, so none of it reaches the picture.");

    // The same enlargement with the logo's colour misread as premultiplied,
    // beside the right one, around the badge's lower left corner.
    Frame wrong_logo = logo;
    wrong_logo.alpha_mode = ALPHA_MODE_PREMULTIPLIED;
    Frame wrong = scene;
    map(wrong, big, wrong_logo, whole, flags_for(LORVEX_FILTER_CUBIC, LORVEX_FILTER_CUBIC));
    const Frame good_zoom = zoom(rgb, 60, 150, 80, 60, 5);
    const Frame bad_zoom = zoom(video_to_rgb(wrong, Matrix::bt709), 60, 150, 80, 60, 5);
    constexpr int gap = 16;
    Sheet sheet(2 * 400 + 3 * gap, 300 + 2 * gap + 22);
    sheet.paste(good_zoom, gap, gap);
    sheet.paste(bad_zoom, 400 + 2 * gap, gap);
    sheet.label(gap, 300 + gap + 7, "STRAIGHT, AS THE LOGO IS");
    sheet.label(400 + 2 * gap, 300 + gap + 7, "THE SAME LOGO MISREAD AS PREMULTIPLIED");
    show.write("logo-edge.png", sheet.canvas, "The logo's edge, 5 times",
               "Left: the lower left corner of the large logo above, each pixel a block; the edge fades from "
               "blue into the sky with no trace of the magenta held where alpha is 0. Right: the same call "
               "with the logo's <code>alpha_mode</code> set to premultiplied, as a compositor that ignored "
               "the form of its input would read it: the magenta is added in as colour and rings the badge.");
}

void draw_fields(Showcase &show)
{
    // Two instants of a scene with a moving ball, a field apart.
    const Frame first = rgb_to_video(make_scene(640, 360, 0.34), FORMAT_YUY2, Matrix::bt601);
    const Frame second = rgb_to_video(make_scene(640, 360, 0.40), FORMAT_YUY2, Matrix::bt601);
    const float whole[4] = {0, 0, 640, 360};
    const uint32_t cubic = flags_for(LORVEX_FILTER_CUBIC, LORVEX_FILTER_CUBIC);
    Frame woven = make_frame(640, 360, FORMAT_YUY2);
    map(woven, whole, first, whole, cubic | LORVEX_DEST_EVEN_FIELD);
    map(woven, whole, second, whole, cubic | LORVEX_DEST_ODD_FIELD);

    // Each field read back into a whole frame.
    Frame even = make_frame(640, 360, FORMAT_YUY2);
    Frame odd = make_frame(640, 360, FORMAT_YUY2);
    map(even, whole, woven, whole, cubic | LORVEX_SOURCE_EVEN_FIELD);
    map(odd, whole, woven, whole, cubic | LORVEX_SOURCE_ODD_FIELD);

    const Frame zoomed = zoom(woven, 160, 200, 160, 90, 4);
    constexpr int gap = 16, label_h = 22;
    Sheet sheet(2 * 640 + 3 * gap, 2 * (360 + label_h) + 3 * gap);
    const int x2 = 640 + 2 * gap, y2 = 360 + label_h + 2 * gap;
    sheet.paste(video_to_rgb(woven, Matrix::bt601), gap, gap);
    sheet.paste(video_to_rgb(zoomed, Matrix::bt601), x2, gap);
    sheet.paste(video_to_rgb(even, Matrix::bt601), gap, y2);
    sheet.paste(video_to_rgb(odd, Matrix::bt601), x2, y2);
    sheet.label(gap, gap + 360 + 7, "WOVEN: EVEN FIELD AT T, ODD FIELD AT T + 1");
    sheet.label(x2, gap + 360 + 7, "THE BALL, 4 TIMES: COMBED WHERE IT MOVED");
    sheet.label(gap, y2 + 360 + 7, "EVEN FIELD READ BACK: BALL AT T");
    sheet.label(x2, y2 + 360 + 7, "ODD FIELD READ BACK: BALL AT T + 1");
    show.write("fields.png", sheet.canvas, "An interlaced frame, drawn field by field",
               "Top left: a 640x360 YUY2 frame drawn by two calls: the picture at one instant into the even "
               "lines (<code>LORVEX_DEST_EVEN_FIELD</code>), the picture a field later, with the ball moved "
               "to the right, into the odd lines (<code>LORVEX_DEST_ODD_FIELD</code>). Each field line is "
               "sampled where it stands in the frame, so what did not move (hills, fence, text) weaves into "
               "a clean picture, while the ball's edges comb, as a moving object does in interlaced video "
               "(top right, four times). Bottom: each field read back into a whole frame with "
               "<code>LORVEX_SOURCE_EVEN_FIELD</code> and <code>LORVEX_SOURCE_ODD_FIELD</code>: each shows "
               "the ball once, at its own instant, with no combing, so each field holds the right lines.");
}

void draw_mosaic(Showcase &show, const Frame &card_yuy2)
{
    // The card cut into 12 tiles of unequal sizes, each a picture of its own
    // at its place in the mosaic. Cuts fall on even columns, so that every
    // tile keeps the card's chroma pairs.
    const int xs[5] = {0, 150, 334, 470, 640};
    const int ys[4] = {0, 97, 250, 360};
    std::vector<Frame> tiles;
    for (int j = 0; j < 3; ++j)
        for (int i = 0; i < 4; ++i) {
            Frame t = make_frame(xs[i + 1] - xs[i], ys[j + 1] - ys[j], FORMAT_YUY2);
            for (int y = 0; y < t.height; ++y)
                std::memcpy(t.line(y), card_yuy2.line(ys[j] + y) + 2 * xs[i], std::size_t(t.stride));
            tiles.push_back(std::move(t));
        }
    std::vector<Surface> records;
    for (std::size_t k = 0; k < tiles.size(); ++k) {
        records.push_back(tiles[k].surface());
        records.back().left = xs[k % 4];
        records.back().top = ys[k / 4];
    }
    std::vector<const Surface *> pointers;
    for (const Surface &r : records)
        pointers.push_back(&r);

    // Exploded: each tile on its own, with gaps between.
    constexpr int gap = 12;
    Sheet exploded(640 + 5 * gap, 360 + 4 * gap + 30);
    exploded.label(gap, 10, "12 TILES, EACH ITS OWN SURFACE", 1, title_colour);
    for (std::size_t k = 0; k < tiles.size(); ++k)
        exploded.paste(video_to_rgb(tiles[k], Matrix::bt601), gap + xs[k % 4] + int(k % 4) * gap,
                       30 + gap + ys[k / 4] + int(k / 4) * gap);

    // The mosaic enlarged 1.53 times into a rectangle with fractional
    // corners, one call for all tiles.
    const double d[4] = {10.25, 10.5, 990.25, 561.75};
    const uint32_t flags = flags_for(LORVEX_FILTER_CUBIC, LORVEX_FILTER_CUBIC) | LORVEX_TILE;
    Frame mosaic = make_frame(1000, 572, FORMAT_YUY2);
    const Surface md = mosaic.surface();
    multisrc_map_rectangle(&md, d[0], d[1], d[2], d[3], pointers.data(), int32_t(pointers.size()), 0, 0, 640, 360,
                           int32_t(flags), 0, 1);
    // The same enlargement of the card in one piece, for comparison.
    Frame whole = make_frame(1000, 572, FORMAT_YUY2);
    const float fd[4] = {float(d[0]), float(d[1]), float(d[2]), float(d[3])};
    const float fs[4] = {0, 0, 640, 360};
    map(whole, fd, card_yuy2, fs, flags_for(LORVEX_FILTER_CUBIC, LORVEX_FILTER_CUBIC));
    // Pixels within 3 of a seam, in destination pixels.
    auto near_seam = [&](int x, int y) {
        const double px = x + 0.5, py = y + 0.5;
        for (int i = 1; i < 4; ++i)
            if (std::abs(px - (d[0] + xs[i] * (d[2] - d[0]) / 640.0)) < 3.0)
                return true;
        for (int j = 1; j < 3; ++j)
            if (std::abs(py - (d[1] + ys[j] * (d[3] - d[1]) / 360.0)) < 3.0)
                return true;
        return false;
    };
    const int away = max_difference(mosaic, whole, [&](int x, int y) { return !near_seam(x, y); });
    const int near = max_difference(mosaic, whole, near_seam);

    show.write("mosaic-tiles.png", exploded.canvas, "A picture held as tiles",
               "The card cut into 12 tiles of unequal sizes (columns at 150, 334 and 470, lines at 97 and "
               "250), each its own YUY2 surface with its <code>left</code> and <code>top</code> in the "
               "mosaic, shown apart.");
    show.write("mosaic.png", video_to_rgb(mosaic, Matrix::bt601), "The tiles drawn as one picture",
               "One <code>multisrc_map_rectangle</code> call draws the 12 tiles 1.53 times larger with the "
               "cubic filter into the rectangle (10.25, 10.5)-(990.25, 561.75), with "
               "<code>LORVEX_TILE</code>: at each seam the partly covered pixels of the two tiles add up "
               "to whole ones, so no seam shows. Compared with the card drawn in one piece by a single "
               "<code>map_rectangle</code> call, the samples more than 3 pixels from a seam differ by at "
               "most " + std::to_string(away) + " code values. Nearer, they differ by up to " +
                   std::to_string(near) +
                   " where one-pixel lines cross a seam: each tile's filter sees that tile's edge pixels "
                   "repeated beyond the seam, not its neighbour's.");
}

} // namespace

int run_demo(Args args)
{
    if (args.wants_help()) {
        std::fputs(usage, stdout);
        return 0;
    }
    std::string out = "out";
    while (!args.done()) {
        const std::string arg = args.take();
        if (arg == "--out")
            out = args.value(arg);
        else
            throw Error("demo: unknown argument '" + arg + "' (--help for usage)");
    }
    if (out.empty())
        throw Error("demo: --out needs a directory name");
    std::error_code ec;
    fs::create_directories(out, ec);
    if (ec || !fs::is_directory(out))
        throw Error("demo: cannot create the directory '" + out + "'" + (ec ? ": " + ec.message() : ""));

    Showcase show(fs::absolute(out).lexically_normal());
    const Frame card = make_card();
    show.write("card.png", card, "The test card",
               "640x360, drawn in RGB: 75% colour bars, a zone plate whose rings reach the Nyquist limit in "
               "its corners, one-pixel diagonal lines with periods of 3, 4, 6 and 8 pixels, a grey ramp, small "
               "text, and the logo, drawn onto the card by <code>map_rectangle</code> at three quarters of its "
               "size from its straight alpha. A one-pixel border marks the edges. For the pictures below it "
               "is converted to YUY2 with BT.601.");
    const Frame card_yuy2 = rgb_to_video(card, FORMAT_YUY2, Matrix::bt601);
    draw_filters(show, card_yuy2);
    draw_pip(show, card);
    draw_logo(show);
    draw_fields(show);
    draw_mosaic(show, card_yuy2);
    show.write_index();
    std::printf("%s\n", show.index().c_str());
    return 0;
}

} // namespace lorvex_cli
