// The demo's built-in pictures, drawn in RGBQ: the test card, a logo with a
// soft straight alpha edge, an outdoor scene with a moving ball, and small
// capital text for labels.
#pragma once

#include "frame.h"

#include <string_view>

namespace lorvex_cli {

constexpr int card_width = 640;
constexpr int card_height = 360;

// 640x360: 75% colour bars, a zone plate, panels of one-pixel diagonal
// lines, a grey ramp, small text and, over the text strip, the logo drawn
// with map_rectangle at a fractional position. A one-pixel border marks the
// picture's edges.
Frame make_card();

// A rounded badge with the word LORVEX, 160x64, with a straight alpha plane
// whose edge falls off over a few pixels. Where alpha is 0 the colour is
// magenta: straight colour there is meaningless, and a compositor that
// filters it without weighting by alpha shows it as a fringe.
Frame make_logo();

// A landscape (sky, sun, hills, a fence, a title) with a red ball whose
// centre is at x = ball_x (in picture widths, 0 to 1). Any size.
Frame make_scene(int width, int height, double ball_x);

// Capital letters, digits and a little punctuation in a 5x7 font, each cell
// `scale` pixels square, one blank column between glyphs; lower case is
// drawn as upper case, anything else as a space. Returns the width drawn.
int draw_text(Frame &rgbq, int x, int y, int scale, std::string_view text, const uint8_t rgb[3]);
int text_width(std::string_view text, int scale);

// Writes one RGB pixel of an RGBQ picture (Q = 255); outside is ignored.
void put_rgb(Frame &rgbq, int x, int y, int r, int g, int b);

} // namespace lorvex_cli
