#include "files.h"

#include "cli.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <csetjmp>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <sstream>

#include <jpeglib.h>
#include <png.h>

namespace lorvex_cli {

namespace {

constexpr int max_side = 16384;

std::string q(const std::string &path)
{
    return "'" + path + "'";
}

std::string lower(std::string s)
{
    for (char &c : s)
        c = char(std::tolower(static_cast<unsigned char>(c)));
    return s;
}

std::vector<uint8_t> read_all(const std::string &path)
{
    std::ifstream in(path, std::ios::binary);
    if (!in)
        throw Error("cannot read " + q(path) + ": " + std::strerror(errno));
    std::vector<uint8_t> bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    if (in.bad())
        throw Error("cannot read " + q(path) + ": " + std::strerror(errno));
    return bytes;
}

// ---- PNG -----------------------------------------------------------------

Frame read_png(const std::string &path)
{
    const std::vector<uint8_t> bytes = read_all(path);
    png_image image;
    std::memset(&image, 0, sizeof image);
    image.version = PNG_IMAGE_VERSION;
    if (!png_image_begin_read_from_memory(&image, bytes.data(), bytes.size())) {
        std::string message = image.message;
        png_image_free(&image);
        throw Error("cannot read " + q(path) + " as PNG: " + message);
    }
    if (image.width > max_side || image.height > max_side) {
        png_image_free(&image);
        throw Error(q(path) + " is larger than lorvex reads (16384 pixels a side)");
    }
    const bool alpha = (image.format & PNG_FORMAT_FLAG_ALPHA) != 0;
    image.format = PNG_FORMAT_RGBA; // 8-bit sRGB samples, alpha not premultiplied
    Frame f = make_frame(int(image.width), int(image.height), FORMAT_RGBQ, alpha);
    if (!png_image_finish_read(&image, nullptr, f.line(0), f.stride, nullptr)) {
        std::string message = image.message;
        png_image_free(&image);
        throw Error("cannot read " + q(path) + " as PNG: " + message);
    }
    for (int y = 0; y < f.height; ++y) {
        uint8_t *line = f.line(y);
        for (int x = 0; x < f.width; ++x) {
            if (alpha)
                f.alpha_line(y)[x] = alpha_from_8bit(line[4 * x + 3]);
            line[4 * x + 3] = 255;
        }
    }
    f.alpha_mode = ALPHA_MODE_STRAIGHT;
    return f;
}

void write_png(const std::string &path, const Frame &f)
{
    png_image image;
    std::memset(&image, 0, sizeof image);
    image.version = PNG_IMAGE_VERSION;
    image.width = png_uint_32(f.width);
    image.height = png_uint_32(f.height);
    image.format = f.has_alpha() ? PNG_FORMAT_RGBA : PNG_FORMAT_RGB;
    const int channels = f.has_alpha() ? 4 : 3;
    std::vector<uint8_t> rows(std::size_t(f.width) * std::size_t(f.height) * std::size_t(channels));
    for (int y = 0; y < f.height; ++y) {
        const uint8_t *line = f.line(y);
        uint8_t *out = rows.data() + std::size_t(y) * std::size_t(f.width) * std::size_t(channels);
        for (int x = 0; x < f.width; ++x) {
            std::memcpy(out + channels * x, line + 4 * x, 3);
            if (f.has_alpha())
                out[channels * x + 3] = alpha_to_8bit(f.alpha_line(y)[x]);
        }
    }
    if (!png_image_write_to_file(&image, path.c_str(), 0, rows.data(), f.width * channels, nullptr)) {
        std::string message = image.message;
        png_image_free(&image);
        throw Error("cannot write " + q(path) + ": " + message);
    }
    png_image_free(&image);
}

// ---- JPEG ----------------------------------------------------------------

// libjpeg reports errors through a callback that must not return; it jumps
// back into the function that called libjpeg, whose frame holds nothing
// with a destructor.
struct JpegError {
    jpeg_error_mgr mgr;
    std::jmp_buf jump;
    char message[JMSG_LENGTH_MAX];
};

void jpeg_fail(j_common_ptr cinfo)
{
    auto *err = reinterpret_cast<JpegError *>(cinfo->err);
    (*cinfo->err->format_message)(cinfo, err->message);
    std::longjmp(err->jump, 1);
}

// Fills `f` (made by `make`) from the compressed bytes; returns an empty
// string or libjpeg's message.
std::string decode_jpeg(const std::vector<uint8_t> &bytes, Frame &f, std::vector<uint8_t> &row)
{
    jpeg_decompress_struct cinfo;
    JpegError err;
    cinfo.err = jpeg_std_error(&err.mgr);
    err.mgr.error_exit = jpeg_fail;
    if (setjmp(err.jump)) {
        jpeg_destroy_decompress(&cinfo);
        return err.message;
    }
    jpeg_create_decompress(&cinfo);
    jpeg_mem_src(&cinfo, bytes.data(), static_cast<unsigned long>(bytes.size()));
    jpeg_read_header(&cinfo, TRUE);
    if (cinfo.jpeg_color_space == JCS_CMYK || cinfo.jpeg_color_space == JCS_YCCK) {
        jpeg_destroy_decompress(&cinfo);
        return "CMYK JPEG files are not supported";
    }
    if (cinfo.image_width > max_side || cinfo.image_height > max_side) {
        jpeg_destroy_decompress(&cinfo);
        return "larger than lorvex reads (16384 pixels a side)";
    }
    cinfo.out_color_space = JCS_RGB;
    jpeg_start_decompress(&cinfo);
    f = make_frame(int(cinfo.output_width), int(cinfo.output_height), FORMAT_RGBQ);
    row.resize(std::size_t(cinfo.output_width) * 3);
    while (cinfo.output_scanline < cinfo.output_height) {
        const int y = int(cinfo.output_scanline);
        JSAMPROW rows[1] = {row.data()};
        jpeg_read_scanlines(&cinfo, rows, 1);
        uint8_t *line = f.line(y);
        for (int x = 0; x < f.width; ++x)
            std::memcpy(line + 4 * x, row.data() + 3 * x, 3);
    }
    jpeg_finish_decompress(&cinfo);
    jpeg_destroy_decompress(&cinfo);
    return {};
}

Frame read_jpeg(const std::string &path)
{
    std::vector<uint8_t> bytes = read_all(path);
    Frame f;
    std::vector<uint8_t> row;
    std::string message = decode_jpeg(bytes, f, row);
    if (!message.empty())
        throw Error("cannot read " + q(path) + " as JPEG: " + message);
    return f;
}

std::string encode_jpeg(FILE *file, const Frame &f, std::vector<uint8_t> &row)
{
    jpeg_compress_struct cinfo;
    JpegError err;
    cinfo.err = jpeg_std_error(&err.mgr);
    err.mgr.error_exit = jpeg_fail;
    if (setjmp(err.jump)) {
        jpeg_destroy_compress(&cinfo);
        return err.message;
    }
    jpeg_create_compress(&cinfo);
    jpeg_stdio_dest(&cinfo, file);
    cinfo.image_width = JDIMENSION(f.width);
    cinfo.image_height = JDIMENSION(f.height);
    cinfo.input_components = 3;
    cinfo.in_color_space = JCS_RGB;
    jpeg_set_defaults(&cinfo);
    jpeg_set_quality(&cinfo, 95, TRUE);
    for (int i = 0; i < cinfo.num_components; ++i) // full-resolution chroma
        cinfo.comp_info[i].h_samp_factor = cinfo.comp_info[i].v_samp_factor = 1;
    jpeg_start_compress(&cinfo, TRUE);
    row.resize(std::size_t(f.width) * 3);
    while (cinfo.next_scanline < cinfo.image_height) {
        const uint8_t *line = f.line(int(cinfo.next_scanline));
        for (int x = 0; x < f.width; ++x)
            std::memcpy(row.data() + 3 * x, line + 4 * x, 3);
        JSAMPROW rows[1] = {row.data()};
        jpeg_write_scanlines(&cinfo, rows, 1);
    }
    jpeg_finish_compress(&cinfo);
    jpeg_destroy_compress(&cinfo);
    return {};
}

void write_jpeg(const std::string &path, const Frame &f)
{
    FILE *file = std::fopen(path.c_str(), "wb");
    if (file == nullptr)
        throw Error("cannot write " + q(path) + ": " + std::strerror(errno));
    std::vector<uint8_t> row;
    std::string message = encode_jpeg(file, f, row);
    if (std::fclose(file) != 0 && message.empty())
        message = std::strerror(errno);
    if (!message.empty())
        throw Error("cannot write " + q(path) + ": " + message);
}

// ---- Y4M -----------------------------------------------------------------

Frame read_y4m(const std::string &path, VideoInfo *info)
{
    const std::vector<uint8_t> bytes = read_all(path);
    auto header_end = std::find(bytes.begin(), bytes.begin() + std::min<std::size_t>(bytes.size(), 1024), '\n');
    if (bytes.size() < 10 || std::memcmp(bytes.data(), "YUV4MPEG2 ", 10) != 0 ||
        header_end == bytes.begin() + std::min<std::size_t>(bytes.size(), 1024))
        throw Error(q(path) + " is not a Y4M file (no YUV4MPEG2 header)");
    std::istringstream header(std::string(bytes.begin() + 10, header_end));
    int width = 0, height = 0;
    std::string colour = "420jpeg"; // what a header without C means
    VideoInfo found;
    for (std::string token; header >> token;) {
        const std::string value = token.substr(1);
        switch (token[0]) {
        case 'W': width = std::atoi(value.c_str()); break;
        case 'H': height = std::atoi(value.c_str()); break;
        case 'C': colour = value; break;
        case 'F': found.rate = value; break;
        case 'I': found.interlace = value; break;
        case 'A': found.aspect = value; break;
        default: break; // X and unknown parameters
        }
    }
    if (width < 1 || height < 1 || width > max_side || height > max_side)
        throw Error(q(path) + " has no valid picture size in its Y4M header");
    int depth;
    if (colour == "422")
        depth = 8;
    else if (colour == "422p10")
        depth = 10;
    else
        throw Error(q(path) + " is Y4M with colour space C" + colour + "; lorvex reads 4:2:2 only (C422, C422p10)");

    std::size_t at = std::size_t(header_end - bytes.begin()) + 1;
    if (bytes.size() < at + 5 || std::memcmp(bytes.data() + at, "FRAME", 5) != 0)
        throw Error(q(path) + " has no frame after its Y4M header");
    while (at < bytes.size() && bytes[at] != '\n')
        ++at;
    ++at;

    Planes p;
    p.width = width;
    p.height = height;
    p.depth = depth;
    const std::size_t sample_bytes = depth == 10 ? 2 : 1;
    const std::size_t luma = std::size_t(width) * std::size_t(height);
    const std::size_t chroma = std::size_t(p.chroma_width()) * std::size_t(height);
    if (bytes.size() < at + (luma + 2 * chroma) * sample_bytes)
        throw Error(q(path) + " ends inside its first frame");
    for (auto [plane, count] : {std::pair{&p.y, luma}, std::pair{&p.cb, chroma}, std::pair{&p.cr, chroma}}) {
        plane->resize(count);
        for (std::size_t i = 0; i < count; ++i, at += sample_bytes) {
            uint16_t v = bytes[at];
            if (depth == 10) {
                v = uint16_t(v | bytes[at + 1] << 8);
                if (v > 1023)
                    throw Error(q(path) + " holds a sample above 1023 in a 10-bit frame");
            }
            (*plane)[i] = v;
        }
    }
    if (info != nullptr)
        *info = found;
    return from_planes(p);
}

void write_y4m(std::ofstream &out, const Frame &f, const VideoInfo &info)
{
    const Planes p = to_planes(f);
    out << "YUV4MPEG2 W" << f.width << " H" << f.height << " F" << info.rate << " I" << info.interlace << " A"
        << info.aspect << (p.depth == 10 ? " C422p10" : " C422") << "\nFRAME\n";
    for (const auto *plane : {&p.y, &p.cb, &p.cr}) {
        std::vector<uint8_t> bytes;
        bytes.reserve(plane->size() * 2);
        for (uint16_t v : *plane) {
            bytes.push_back(uint8_t(v));
            if (p.depth == 10)
                bytes.push_back(uint8_t(v >> 8));
        }
        out.write(reinterpret_cast<const char *>(bytes.data()), std::streamsize(bytes.size()));
    }
}

// ---- Raw frames ----------------------------------------------------------

Frame read_raw(const std::string &path, int format, int width, int height)
{
    if (width < 1 || height < 1)
        throw Error("the raw frame " + q(path) + " needs its size: --raw WIDTHxHEIGHT");
    const std::vector<uint8_t> bytes = read_all(path);
    Frame f = make_frame(width, height, format);
    if (bytes.size() != f.bytes())
        throw Error("the raw frame " + q(path) + " has " + std::to_string(bytes.size()) + " bytes; " +
                    std::to_string(width) + "x" + std::to_string(height) + " " + format_name(format) + " needs " +
                    std::to_string(f.bytes()));
    std::memcpy(f.line(0), bytes.data(), bytes.size());
    if (format == FORMAT_W210)
        for (std::size_t i = 0; i < bytes.size(); i += 2)
            if ((bytes[i + 1] & 0xFC) != 0)
                throw Error("the raw frame " + q(path) + " holds a sample above 1023");
    return f;
}

} // namespace

FileKind file_kind(const std::string &path)
{
    const std::string ext = lower(std::filesystem::path(path).extension().string());
    if (ext == ".png")
        return FileKind::png;
    if (ext == ".jpg" || ext == ".jpeg")
        return FileKind::jpeg;
    if (ext == ".y4m")
        return FileKind::y4m;
    if (ext == ".yuy2")
        return FileKind::yuy2;
    if (ext == ".w210")
        return FileKind::w210;
    throw Error("cannot tell the kind of " + q(path) + " from its name (.png, .jpg, .y4m, .yuy2 or .w210)");
}

bool is_video_file(FileKind kind)
{
    return kind == FileKind::y4m || is_raw_file(kind);
}

bool is_raw_file(FileKind kind)
{
    return kind == FileKind::yuy2 || kind == FileKind::w210;
}

uint16_t alpha_from_8bit(int a)
{
    return uint16_t((a * 4096 + 127) / 255);
}

uint8_t alpha_to_8bit(int a)
{
    return uint8_t(std::min(255, (a * 255 + 2048) / 4096));
}

Frame read_picture(const std::string &path, int raw_width, int raw_height, VideoInfo *info)
{
    switch (file_kind(path)) {
    case FileKind::png: return read_png(path);
    case FileKind::jpeg: return read_jpeg(path);
    case FileKind::y4m: return read_y4m(path, info);
    case FileKind::yuy2: return read_raw(path, FORMAT_YUY2, raw_width, raw_height);
    case FileKind::w210: return read_raw(path, FORMAT_W210, raw_width, raw_height);
    }
    return {};
}

void write_picture(const std::string &path, const Frame &frame, const VideoInfo &info)
{
    const FileKind kind = file_kind(path);
    const std::string temporary = path + ".lorvex-partial";
    try {
        switch (kind) {
        case FileKind::png: write_png(temporary, frame); break;
        case FileKind::jpeg: write_jpeg(temporary, frame); break;
        case FileKind::y4m:
        case FileKind::yuy2:
        case FileKind::w210: {
            std::ofstream out(temporary, std::ios::binary);
            if (!out)
                throw Error("cannot write " + q(path) + ": " + std::strerror(errno));
            if (kind == FileKind::y4m)
                write_y4m(out, frame, info);
            else
                out.write(reinterpret_cast<const char *>(frame.line(0)), std::streamsize(frame.bytes()));
            out.close();
            if (!out)
                throw Error("cannot write " + q(path) + ": " + std::strerror(errno));
            break;
        }
        }
        std::error_code ec;
        std::filesystem::rename(temporary, path, ec);
        if (ec)
            throw Error("cannot write " + q(path) + ": " + ec.message());
    } catch (...) {
        std::error_code ignored;
        std::filesystem::remove(temporary, ignored);
        throw;
    }
}

} // namespace lorvex_cli
