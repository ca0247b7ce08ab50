// Picture files: PNG and JPEG (RGB, PNG with alpha), Y4M with 4:2:2 8-bit
// (C422) or 10-bit (C422p10) planes, and raw frames in the library's own
// YUY2 and W210 layouts. The kind of a file comes from its name's ending.
#pragma once

#include "frame.h"

#include <string>

namespace lorvex_cli {

enum class FileKind { png, jpeg, y4m, yuy2, w210 };

// By the ending: .png, .jpg/.jpeg, .y4m, .yuy2, .w210 (any case).
FileKind file_kind(const std::string &path);
bool is_video_file(FileKind kind); // Y4M or raw
bool is_raw_file(FileKind kind);

// What a Y4M file says besides its pictures, written back unchanged when a
// Y4M file becomes another.
struct VideoInfo {
    std::string rate = "25:1";  // F
    std::string interlace = "p"; // I: p, t (top field first), b, m
    std::string aspect = "1:1"; // A
};

// Reads the first picture of a file: RGBQ for PNG and JPEG (with a straight
// alpha plane when a PNG has alpha), YUY2 or W210 for the others. Raw
// frames have no header: their size is given (0 for other kinds).
Frame read_picture(const std::string &path, int raw_width, int raw_height, VideoInfo *info);

// Writes `frame`, which is in the file's own layout: RGBQ for PNG and JPEG
// (PNG keeps a straight alpha plane; JPEG has none), YUY2 or W210 for Y4M,
// the raw format of the name for raw frames. The file is written under a
// temporary name and renamed, so a failure leaves nothing behind.
void write_picture(const std::string &path, const Frame &frame, const VideoInfo &info);

// 12-bit alpha (4096 = opaque) and 8-bit alpha, rounded to nearest; values
// above 4096 (tile mode adds) are clamped to opaque.
uint16_t alpha_from_8bit(int a);
uint8_t alpha_to_8bit(int a);

} // namespace lorvex_cli
