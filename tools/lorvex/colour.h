// Conversion between RGB pictures and the 4:2:2 video layouts. The library
// holds no colour matrix, so the tool does this itself, through libswscale:
// video range (Y 16-235, C 16-240 in 8 bits, four times that in 10 bits),
// RGB at full range, chroma co-sited with the even pixel of each pair.
#pragma once

#include "frame.h"

namespace lorvex_cli {

enum class Matrix { bt601, bt709 };

// BT.709 for HD pictures (at least 1280 wide or 720 high), BT.601 below.
Matrix matrix_for_size(int width, int height);
const char *matrix_name(Matrix m);

// RGBQ (R, G, B, ignored) into YUY2 or W210. Chroma is filtered with
// [1 2 1] / 4 centred on the even pixel. The alpha plane and its mode are
// carried; premultiplied colour stays premultiplied (relative to black and
// neutral chroma, as the library reads it).
Frame rgb_to_video(const Frame &rgbq, int format, Matrix m);

// YUY2 or W210 into RGBQ; the odd pixels' chroma is interpolated between
// the pairs on either side. The alpha plane is carried.
Frame video_to_rgb(const Frame &video, Matrix m);

// Whichever of the two a picture needs to be in `format` (RGBQ, YUY2 or
// W210); a copy when it is already.
Frame convert(const Frame &frame, int format, Matrix m);

} // namespace lorvex_cli
