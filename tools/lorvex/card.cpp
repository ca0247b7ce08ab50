#include "card.h"

#include <algorithm>
#include <cctype>
#include <cmath>
#include <numbers>

namespace lorvex_cli {

namespace {

// 5x7 glyphs, one byte a row, bit 4 the leftmost column.
struct Glyph {
    char c;
    uint8_t rows[7];
};

constexpr Glyph glyphs[] = {
    {'0', {0x0E, 0x11, 0x13, 0x15, 0x19, 0x11, 0x0E}}, {'1', {0x04, 0x0C, 0x04, 0x04, 0x04, 0x04, 0x0E}},
    {'2', {0x0E, 0x11, 0x01, 0x02, 0x04, 0x08, 0x1F}}, {'3', {0x1F, 0x02, 0x04, 0x02, 0x01, 0x11, 0x0E}},
    {'4', {0x02, 0x06, 0x0A, 0x12, 0x1F, 0x02, 0x02}}, {'5', {0x1F, 0x10, 0x1E, 0x01, 0x01, 0x11, 0x0E}},
    {'6', {0x06, 0x08, 0x10, 0x1E, 0x11, 0x11, 0x0E}}, {'7', {0x1F, 0x01, 0x02, 0x04, 0x08, 0x08, 0x08}},
    {'8', {0x0E, 0x11, 0x11, 0x0E, 0x11, 0x11, 0x0E}}, {'9', {0x0E, 0x11, 0x11, 0x0F, 0x01, 0x02, 0x0C}},
    {'A', {0x0E, 0x11, 0x11, 0x1F, 0x11, 0x11, 0x11}}, {'B', {0x1E, 0x11, 0x11, 0x1E, 0x11, 0x11, 0x1E}},
    {'C', {0x0E, 0x11, 0x10, 0x10, 0x10, 0x11, 0x0E}}, {'D', {0x1C, 0x12, 0x11, 0x11, 0x11, 0x12, 0x1C}},
    {'E', {0x1F, 0x10, 0x10, 0x1E, 0x10, 0x10, 0x1F}}, {'F', {0x1F, 0x10, 0x10, 0x1E, 0x10, 0x10, 0x10}},
    {'G', {0x0E, 0x11, 0x10, 0x17, 0x11, 0x11, 0x0F}}, {'H', {0x11, 0x11, 0x11, 0x1F, 0x11, 0x11, 0x11}},
    {'I', {0x0E, 0x04, 0x04, 0x04, 0x04, 0x04, 0x0E}}, {'J', {0x07, 0x02, 0x02, 0x02, 0x02, 0x12, 0x0C}},
    {'K', {0x11, 0x12, 0x14, 0x18, 0x14, 0x12, 0x11}}, {'L', {0x10, 0x10, 0x10, 0x10, 0x10, 0x10, 0x1F}},
    {'M', {0x11, 0x1B, 0x15, 0x15, 0x11, 0x11, 0x11}}, {'N', {0x11, 0x11, 0x19, 0x15, 0x13, 0x11, 0x11}},
    {'O', {0x0E, 0x11, 0x11, 0x11, 0x11, 0x11, 0x0E}}, {'P', {0x1E, 0x11, 0x11, 0x1E, 0x10, 0x10, 0x10}},
    {'Q', {0x0E, 0x11, 0x11, 0x11, 0x15, 0x12, 0x0D}}, {'R', {0x1E, 0x11, 0x11, 0x1E, 0x14, 0x12, 0x11}},
    {'S', {0x0F, 0x10, 0x10, 0x0E, 0x01, 0x01, 0x1E}}, {'T', {0x1F, 0x04, 0x04, 0x04, 0x04, 0x04, 0x04}},
    {'U', {0x11, 0x11, 0x11, 0x11, 0x11, 0x11, 0x0E}}, {'V', {0x11, 0x11, 0x11, 0x11, 0x11, 0x0A, 0x04}},
    {'W', {0x11, 0x11, 0x11, 0x15, 0x15, 0x15, 0x0A}}, {'X', {0x11, 0x11, 0x0A, 0x04, 0x0A, 0x11, 0x11}},
    {'Y', {0x11, 0x11, 0x11, 0x0A, 0x04, 0x04, 0x04}}, {'Z', {0x1F, 0x01, 0x02, 0x04, 0x08, 0x10, 0x1F}},
    {'.', {0x00, 0x00, 0x00, 0x00, 0x00, 0x0C, 0x0C}}, {',', {0x00, 0x00, 0x00, 0x00, 0x0C, 0x04, 0x08}},
    {':', {0x00, 0x0C, 0x0C, 0x00, 0x0C, 0x0C, 0x00}}, {'-', {0x00, 0x00, 0x00, 0x1F, 0x00, 0x00, 0x00}},
    {'/', {0x00, 0x01, 0x02, 0x04, 0x08, 0x10, 0x00}}, {'%', {0x18, 0x19, 0x02, 0x04, 0x08, 0x13, 0x03}},
    {'(', {0x02, 0x04, 0x08, 0x08, 0x08, 0x04, 0x02}}, {')', {0x08, 0x04, 0x02, 0x02, 0x02, 0x04, 0x08}},
    {'+', {0x00, 0x04, 0x04, 0x1F, 0x04, 0x04, 0x00}}, {'=', {0x00, 0x00, 0x1F, 0x00, 0x1F, 0x00, 0x00}},
};

const uint8_t *glyph_rows(char c)
{
    c = char(std::toupper(static_cast<unsigned char>(c)));
    for (const Glyph &g : glyphs)
        if (g.c == c)
            return g.rows;
    return nullptr;
}

double clamp01(double v)
{
    return std::clamp(v, 0.0, 1.0);
}

double mix(double a, double b, double t)
{
    return a + (b - a) * t;
}

// Coverage of a pixel centred at distance d (pixels) outside a shape's edge,
// for an edge one pixel soft: 1 inside, 0 outside, linear across the pixel.
double coverage(double d)
{
    return clamp01(0.5 - d);
}

} // namespace

void put_rgb(Frame &rgbq, int x, int y, int r, int g, int b)
{
    if (x < 0 || y < 0 || x >= rgbq.width || y >= rgbq.height)
        return;
    uint8_t *p = rgbq.line(y) + 4 * x;
    p[0] = uint8_t(r);
    p[1] = uint8_t(g);
    p[2] = uint8_t(b);
    p[3] = 255;
}

int text_width(std::string_view text, int scale)
{
    return text.empty() ? 0 : int(text.size()) * 6 * scale - scale;
}

int draw_text(Frame &rgbq, int x, int y, int scale, std::string_view text, const uint8_t rgb[3])
{
    for (std::size_t i = 0; i < text.size(); ++i) {
        const uint8_t *rows = glyph_rows(text[i]);
        if (rows == nullptr)
            continue;
        const int left = x + int(i) * 6 * scale;
        for (int gy = 0; gy < 7 * scale; ++gy)
            for (int gx = 0; gx < 5 * scale; ++gx)
                if (rows[gy / scale] & (0x10 >> (gx / scale)))
                    put_rgb(rgbq, left + gx, y + gy, rgb[0], rgb[1], rgb[2]);
    }
    return text_width(text, scale);
}

Frame make_logo()
{
    constexpr int w = 160, h = 64;
    Frame logo = make_frame(w, h, FORMAT_RGBQ);
    add_alpha(logo, 0);
    logo.alpha_mode = ALPHA_MODE_STRAIGHT;
    // A rounded rectangle inset by 8 pixels with corners of radius 16; alpha
    // falls from 1 to 0 over the 6 pixels around its edge.
    const double inset = 8.0, radius = 16.0;
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < w; ++x) {
            const double px = x + 0.5, py = y + 0.5;
            const double cx = std::clamp(px, inset + radius, w - inset - radius);
            const double cy = std::clamp(py, inset + radius, h - inset - radius);
            const double d = std::hypot(px - cx, py - cy) - radius; // < 0 inside
            const double a = clamp01((3.0 - d) / 6.0);
            const double t = py / h;
            logo.alpha_line(y)[x] = uint16_t(std::lround(a * a * (3 - 2 * a) * 4096.0));
            if (logo.alpha_line(y)[x] == 0)
                put_rgb(logo, x, y, 255, 0, 255);
            else
                put_rgb(logo, x, y, int(mix(40, 10, t)), int(mix(120, 60, t)), int(mix(230, 150, t)));
        }
    static const uint8_t white[3] = {250, 250, 250};
    const int tw = text_width("LORVEX", 3);
    draw_text(logo, (w - tw) / 2, (h - 21) / 2, 3, "LORVEX", white);
    return logo;
}

Frame make_card()
{
    // 75% colour bars: white, yellow, cyan, green, magenta, red, blue, black.
    static const uint8_t bars[8][3] = {
        {191, 191, 191}, {191, 191, 0}, {0, 191, 191}, {0, 191, 0}, {191, 0, 191}, {191, 0, 0}, {0, 0, 191}, {0, 0, 0},
    };
    Frame card = make_frame(card_width, card_height, FORMAT_RGBQ);
    for (int y = 0; y < 144; ++y)
        for (int x = 0; x < card_width; ++x) {
            const uint8_t *c = bars[x / 80];
            put_rgb(card, x, y, c[0], c[1], c[2]);
        }

    // Zone plate, 240x120: cos(pi r^2 / R) has the local frequency r / R
    // cycles per pixel, so with R twice the corner distance it reaches the
    // Nyquist limit just at the corners.
    const double cx = 119.5, cy = 59.5;
    const double rr = 2.0 * std::sqrt(cx * cx + cy * cy);
    for (int y = 0; y < 120; ++y)
        for (int x = 0; x < 240; ++x) {
            const double dx = x - cx, dy = y - cy;
            const int v = int(std::lround(128.0 + 127.0 * std::cos(std::numbers::pi * (dx * dx + dy * dy) / rr)));
            put_rgb(card, x, 144 + y, v, v, v);
        }

    // Four panels of one-pixel diagonal lines, periods 3, 4, 6 and 8, leaning
    // alternately right and left.
    static const int periods[4] = {3, 4, 6, 8};
    for (int panel = 0; panel < 4; ++panel)
        for (int y = 0; y < 120; ++y)
            for (int x = 0; x < 100; ++x) {
                const int t = panel % 2 == 0 ? x + y : x + 120 - y;
                const int v = t % periods[panel] == 0 ? 235 : 16;
                put_rgb(card, 240 + panel * 100 + x, 144 + y, v, v, v);
            }

    // Grey ramp from 0 to 255 across the width.
    for (int y = 264; y < 304; ++y)
        for (int x = 0; x < card_width; ++x) {
            const int v = (x * 255 + (card_width - 1) / 2) / (card_width - 1);
            put_rgb(card, x, y, v, v, v);
        }

    // Text on dark grey.
    static const uint8_t light[3] = {235, 235, 235};
    for (int y = 304; y < card_height; ++y)
        for (int x = 0; x < card_width; ++x)
            put_rgb(card, x, y, 40, 40, 40);
    draw_text(card, 8, 308, 2, "LORVEX TEST CARD 640X360", light);
    draw_text(card, 8, 328, 1, "0123456789 ABCDEFGHIJKLMNOPQRSTUVWXYZ 9876543210", light);
    draw_text(card, 8, 340, 1, "THE QUICK BROWN FOX JUMPS OVER THE LAZY DOG. 75% BARS", light);

    // The logo, three quarters of its size, at a fractional position over
    // the text strip.
    const Frame logo = make_logo();
    const Surface d = card.surface(), s = logo.surface();
    map_rectangle(&d, 515.5f, 306.25f, 635.5f, 354.25f, &s, 0.0f, 0.0f, float(logo.width), float(logo.height),
                  int32_t(lorvex_flag_filters(LORVEX_FILTER_LINEAR, LORVEX_FILTER_LINEAR) | lorvex_flag_level(4096)),
                  0, 1);

    // A one-pixel border marks the edges of the picture.
    for (int x = 0; x < card_width; ++x) {
        put_rgb(card, x, 0, 235, 235, 235);
        put_rgb(card, x, card_height - 1, 235, 235, 235);
    }
    for (int y = 0; y < card_height; ++y) {
        put_rgb(card, 0, y, 235, 235, 235);
        put_rgb(card, card_width - 1, y, 235, 235, 235);
    }
    return card;
}

Frame make_scene(int width, int height, double ball_x)
{
    Frame scene = make_frame(width, height, FORMAT_RGBQ);
    const double h = height, w = width;
    const double sun_x = 0.78 * w, sun_y = 0.2 * h, sun_r = 0.07 * h;
    const double ball_cx = ball_x * w, ball_cy = 0.66 * h, ball_r = 0.08 * h;
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x) {
            const double px = x + 0.5, py = y + 0.5;
            const double u = px / w, v = py / h;
            // Sky, brighter toward the horizon, with the sun.
            double t = clamp01(v / 0.6);
            double r = mix(60, 185, t), g = mix(110, 215, t), b = mix(200, 240, t);
            const double sun = coverage(std::hypot(px - sun_x, py - sun_y) - sun_r);
            r = mix(r, 255, sun);
            g = mix(g, 230, sun);
            b = mix(b, 150, sun);
            // Two ranges of hills.
            const double far = (0.50 + 0.05 * std::sin(u * 9.0 + 1.0) + 0.02 * std::sin(u * 23.0)) * h;
            const double near = (0.58 + 0.04 * std::sin(u * 5.0 + 2.5)) * h;
            const double on_far = coverage(far - py);
            r = mix(r, 95, on_far);
            g = mix(g, 140, on_far);
            b = mix(b, 120, on_far);
            const double on_near = coverage(near - py);
            const double depth = clamp01((py - near) / (h - near));
            r = mix(r, mix(70, 40, depth), on_near);
            g = mix(g, mix(150, 110, depth), on_near);
            b = mix(b, mix(60, 40, depth), on_near);
            // A white fence: posts every 3% of the width, two rails.
            const double fence_top = 0.74 * h, fence_bottom = 0.86 * h;
            const double post_w = std::max(1.0, 0.004 * w);
            const double post = std::fmod(px, 0.03 * w);
            const bool in_fence = py >= fence_top && py < fence_bottom;
            const bool rail = std::fabs(py - (fence_top + 0.02 * h)) < 0.006 * h ||
                              std::fabs(py - (fence_top + 0.08 * h)) < 0.006 * h;
            if (in_fence && (post < post_w || rail)) {
                r = 235;
                g = 230;
                b = 220;
            }
            // The ball, lit from the upper left.
            const double dball = std::hypot(px - ball_cx, py - ball_cy);
            const double on_ball = coverage(dball - ball_r);
            if (on_ball > 0) {
                const double lx = (px - ball_cx) / ball_r + 0.35, ly = (py - ball_cy) / ball_r + 0.35;
                const double shade = clamp01(1.1 - 0.6 * std::hypot(lx, ly));
                r = mix(r, 60 + 190 * shade, on_ball);
                g = mix(g, 15 + 60 * shade * shade, on_ball);
                b = mix(b, 20 + 50 * shade * shade, on_ball);
            }
            put_rgb(scene, x, y, int(std::lround(r)), int(std::lround(g)), int(std::lround(b)));
        }
    static const uint8_t white[3] = {245, 245, 245};
    const int scale = std::max(1, height / 180);
    draw_text(scene, width / 24, height - 14 * scale, scale, "LORVEX 0.1 - FIELDS, FILTERS, ALPHA", white);
    return scene;
}

} // namespace lorvex_cli
