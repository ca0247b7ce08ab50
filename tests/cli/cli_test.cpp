// The lorvex command-line tool, run as a user runs it: exit status, standard
// output and error, and the files it writes. Inputs are made here (PNG
// through libpng, Y4M and raw frames by hand) in a fresh directory per test.
#include <gtest/gtest.h>
#include <png.h>

#include <sys/wait.h>

#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <initializer_list>
#include <iterator>
#include <random>
#include <set>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;

struct Result {
    int status;
    std::string out, err;
};

class Cli : public ::testing::Test {
protected:
    void SetUp() override
    {
        std::string pattern = (fs::temp_directory_path() / "lorvex-cli-XXXXXX").string();
        ASSERT_NE(mkdtemp(pattern.data()), nullptr);
        dir_ = pattern;
    }
    void TearDown() override { fs::remove_all(dir_); }

    std::string path(const std::string &name) const { return (dir_ / name).string(); }

    // Runs the tool in the test's directory; arguments are quoted for sh.
    Result run(const std::vector<std::string> &args) const
    {
        std::string command = "cd '" + dir_.string() + "' && '" LORVEX_CLI "'";
        for (const std::string &a : args)
            command += " '" + a + "'";
        command += " >'" + path(".stdout") + "' 2>'" + path(".stderr") + "'";
        const int raw = std::system(command.c_str());
        Result r{WIFEXITED(raw) ? WEXITSTATUS(raw) : -1, read_text(".stdout"), read_text(".stderr")};
        fs::remove(path(".stdout"));
        fs::remove(path(".stderr"));
        return r;
    }

    std::string read_text(const std::string &name) const
    {
        std::ifstream in(path(name), std::ios::binary);
        return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
    }
    std::vector<uint8_t> read_bytes(const std::string &name) const
    {
        std::ifstream in(path(name), std::ios::binary);
        return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
    }
    void write_bytes(const std::string &name, const std::string &bytes) const
    {
        std::ofstream(path(name), std::ios::binary) << bytes;
    }

    std::set<std::string> files() const
    {
        std::set<std::string> names;
        for (const auto &entry : fs::directory_iterator(dir_))
            names.insert(entry.path().filename().string());
        return names;
    }

    fs::path dir_;
};

// ---- Pictures --------------------------------------------------------------

struct Image {
    int width = 0, height = 0, channels = 3; // 3 RGB, 4 RGBA
    std::vector<uint8_t> pixels;
    uint8_t *at(int x, int y) { return &pixels[(std::size_t(y) * width + x) * channels]; }
};

Image make_image(int width, int height, int channels)
{
    return {width, height, channels, std::vector<uint8_t>(std::size_t(width) * height * channels)};
}

void write_png(const std::string &file, const Image &image)
{
    png_image png;
    std::memset(&png, 0, sizeof png);
    png.version = PNG_IMAGE_VERSION;
    png.width = png_uint_32(image.width);
    png.height = png_uint_32(image.height);
    png.format = image.channels == 4 ? PNG_FORMAT_RGBA : PNG_FORMAT_RGB;
    ASSERT_TRUE(png_image_write_to_file(&png, file.c_str(), 0, image.pixels.data(), 0, nullptr)) << png.message;
}

Image read_png(const std::string &file)
{
    png_image png;
    std::memset(&png, 0, sizeof png);
    png.version = PNG_IMAGE_VERSION;
    Image image;
    if (!png_image_begin_read_from_file(&png, file.c_str())) {
        ADD_FAILURE() << file << ": " << png.message;
        return image;
    }
    image = make_image(int(png.width), int(png.height), (png.format & PNG_FORMAT_FLAG_ALPHA) ? 4 : 3);
    png.format = image.channels == 4 ? PNG_FORMAT_RGBA : PNG_FORMAT_RGB;
    EXPECT_TRUE(png_image_finish_read(&png, nullptr, image.pixels.data(), 0, nullptr)) << png.message;
    return image;
}

// 4:2:2 planes as a Y4M file holds them.
struct Planes {
    int width = 0, height = 0, depth = 8;
    std::vector<int> y, cb, cr;
    int cw() const { return (width + 1) / 2; }
    int Y(int x, int row) const { return y[std::size_t(row) * width + x]; }
    int Cb(int x, int row) const { return cb[std::size_t(row) * cw() + x / 2]; }
    int Cr(int x, int row) const { return cr[std::size_t(row) * cw() + x / 2]; }
};

std::string y4m_bytes(const Planes &p)
{
    std::string s = "YUV4MPEG2 W" + std::to_string(p.width) + " H" + std::to_string(p.height) + " F25:1 Ip A1:1 C" +
                    (p.depth == 10 ? "422p10" : "422") + "\nFRAME\n";
    for (const auto *plane : {&p.y, &p.cb, &p.cr})
        for (int v : *plane) {
            s += char(v & 0xFF);
            if (p.depth == 10)
                s += char(v >> 8);
        }
    return s;
}

Planes parse_y4m(const std::vector<uint8_t> &bytes)
{
    Planes p;
    const std::string text(bytes.begin(), bytes.end());
    const std::size_t header_end = text.find('\n');
    const std::string header = text.substr(0, header_end);
    p.width = std::atoi(header.c_str() + header.find(" W") + 2);
    p.height = std::atoi(header.c_str() + header.find(" H") + 2);
    p.depth = header.find("C422p10") != std::string::npos ? 10 : 8;
    std::size_t at = text.find('\n', header_end + 1) + 1;
    for (auto [plane, count] : {std::pair{&p.y, std::size_t(p.width) * p.height},
                                std::pair{&p.cb, std::size_t(p.cw()) * p.height},
                                std::pair{&p.cr, std::size_t(p.cw()) * p.height}})
        for (std::size_t i = 0; i < count; ++i) {
            int v = bytes.at(at++);
            if (p.depth == 10)
                v |= bytes.at(at++) << 8;
            plane->push_back(v);
        }
    return p;
}

Planes random_planes(int width, int height, int depth, unsigned seed)
{
    std::mt19937 rng(seed);
    std::uniform_int_distribution<int> luma(depth == 10 ? 64 : 16, depth == 10 ? 940 : 235);
    std::uniform_int_distribution<int> chroma(depth == 10 ? 64 : 16, depth == 10 ? 960 : 240);
    Planes p{width, height, depth, {}, {}, {}};
    for (int i = 0; i < width * height; ++i)
        p.y.push_back(luma(rng));
    for (int i = 0; i < p.cw() * height; ++i) {
        p.cb.push_back(chroma(rng));
        p.cr.push_back(chroma(rng));
    }
    return p;
}

// ---- Help and errors ---------------------------------------------------------

TEST_F(Cli, EveryCommandHasHelp)
{
    for (const char *command : {"demo", "map", "flags"}) {
        const Result r = run({command, "--help"});
        EXPECT_EQ(r.status, 0) << command;
        EXPECT_EQ(r.out.rfind(std::string("usage: lorvex ") + command, 0), 0u) << r.out;
        EXPECT_EQ(r.err, "");
    }
    const Result r = run({"--help"});
    EXPECT_EQ(r.status, 0);
    EXPECT_NE(r.out.find("demo"), std::string::npos);
    EXPECT_TRUE(files().empty());
}

// Every error is one line on standard error, exit status 2, and no file.
TEST_F(Cli, ErrorsAreOneLineWithStatusTwoAndWriteNothing)
{
    write_png(path("in.png"), make_image(8, 4, 3));
    write_bytes("text.png", "this is not a picture\n");
    write_bytes("in420.y4m", "YUV4MPEG2 W8 H4 F25:1 C420jpeg\nFRAME\n" + std::string(48, '\x80'));
    write_bytes("short.y4m", y4m_bytes(random_planes(8, 4, 8, 1)).substr(0, 60));
    write_bytes("in10.y4m", y4m_bytes(random_planes(8, 4, 10, 2)));
    write_bytes("frame.yuy2", std::string(64, '\x80'));

    const struct {
        std::vector<std::string> args;
        const char *message;
    } cases[] = {
        {{}, "no command given"},
        {{"frobnicate"}, "unknown command 'frobnicate'"},
        {{"map", "in.png"}, "needs an INPUT and an OUTPUT"},
        {{"map", "in.png", "out.png", "extra.png"}, "too many files ('extra.png')"},
        {{"map", "in.png", "out.png", "--bogus"}, "unknown option '--bogus'"},
        {{"map", "in.png", "out.png", "--hfilter", "sharp"}, "--hfilter: unknown filter 'sharp'"},
        {{"map", "in.png", "out.png", "--opacity", "2.5"}, "--opacity: '2.5' is out of range"},
        {{"map", "in.png", "out.png", "--threads", "0"}, "--threads: '0' is out of range (1 to 64)"},
        {{"map", "in.png", "out.png", "--src", "1,2,3"}, "--src: '1,2,3' is not a rectangle x0,y0,x1,y1"},
        {{"map", "in.png", "out.png", "--dst", "0,0,a,4"}, "--dst: 'a' is not a number"},
        {{"map", "in.png", "out.png", "--size", "64"}, "--size: '64' is not a size WIDTHxHEIGHT"},
        {{"map", "in.png", "out.png", "--vsoften"}, "--vsoften needs a value"},
        {{"map", "in.png", "out.png", "--dest-field", "top"}, "'top' is not a field (even or odd)"},
        {{"map", "in.png", "out.png", "--format", "nv12"}, "unknown format 'nv12'"},
        {{"map", "in.png", "out.png", "--onto", "in.png", "--size", "4x4"}, "--size and --onto both"},
        {{"map", "missing.png", "out.png"}, "cannot read 'missing.png': No such file"},
        {{"map", "text.png", "out.png"}, "cannot read 'text.png' as PNG"},
        {{"map", "in420.y4m", "out.y4m"}, "colour space C420jpeg; lorvex reads 4:2:2 only"},
        {{"map", "short.y4m", "out.y4m"}, "ends inside its first frame"},
        {{"map", "frame.yuy2", "out.png"}, "needs its size: --raw WIDTHxHEIGHT"},
        {{"map", "frame.yuy2", "out.png", "--raw", "8x8"}, "has 64 bytes; 8x8 yuy2 needs 128"},
        {{"map", "in.png", "out.png", "--raw", "8x4"}, "no file here is one"},
        {{"map", "in.png", "out.bmp"}, "cannot tell the kind of 'out.bmp'"},
        {{"map", "in.png", "out.png", "--alpha", "straight"}, "'in.png' has no alpha channel"},
        {{"map", "in10.y4m", "out.y4m", "--vfilter", "edge", "--size", "16x8"}, "--vfilter edge does not draw"},
        {{"map", "in10.y4m", "out.y4m", "--hfilter", "edge", "--size", "16x8"}, "--hfilter edge does not draw"},
        {{"flags", "0x1z"}, "'0x1z' is not a flags word"},
        {{"flags", "0x100000000"}, "does not fit in 32 bits"},
        {{"flags", "--level", "9000"}, "--level: '9000' is out of range (0 to 8188)"},
        {{"flags", "12", "--tile"}, "a word cannot be combined"},
        {{"demo", "--outdir", "x"}, "unknown argument '--outdir'"},
    };
    const std::set<std::string> before = files();
    for (const auto &c : cases) {
        const Result r = run(c.args);
        std::string shown;
        for (const std::string &a : c.args)
            shown += a + " ";
        EXPECT_EQ(r.status, 2) << shown;
        EXPECT_EQ(r.out, "") << shown;
        EXPECT_EQ(r.err.rfind("lorvex: ", 0), 0u) << shown << "-> " << r.err;
        EXPECT_NE(r.err.find(c.message), std::string::npos) << shown << "-> " << r.err;
        EXPECT_EQ(r.err.find('\n'), r.err.size() - 1) << shown << "-> " << r.err;
        EXPECT_EQ(files(), before) << shown;
    }
}

// ---- File formats ----------------------------------------------------------

TEST_F(Cli, PngRoundTripIsExact)
{
    std::mt19937 rng(7);
    Image rgb = make_image(13, 7, 3); // odd width
    for (uint8_t &v : rgb.pixels)
        v = uint8_t(rng());
    write_png(path("in.png"), rgb);
    ASSERT_EQ(run({"map", "in.png", "out.png", "--filter", "area", "--quiet"}).status, 0);
    const Image out = read_png(path("out.png"));
    EXPECT_EQ(out.channels, 3);
    EXPECT_EQ(out.pixels, rgb.pixels);

    // Alpha survives exactly. Straight colour is weighted by alpha on the way
    // in and divided by it on the way out: inside, it comes back within
    // about 128 / alpha code values (alpha in 8 bits), in the first and last
    // columns within about twice that.
    Image rgba = make_image(13, 7, 4);
    for (uint8_t &v : rgba.pixels)
        v = uint8_t(rng());
    write_png(path("alpha.png"), rgba);
    ASSERT_EQ(run({"map", "alpha.png", "alpha-out.png", "--filter", "area", "--quiet"}).status, 0);
    Image back = read_png(path("alpha-out.png"));
    ASSERT_EQ(back.channels, 4);
    for (int y = 0; y < 7; ++y)
        for (int x = 0; x < 13; ++x) {
            const int a = rgba.at(x, y)[3];
            EXPECT_EQ(back.at(x, y)[3], a) << x << "," << y;
            for (int c = 0; a > 0 && c < 3; ++c)
                EXPECT_NEAR(back.at(x, y)[c], rgba.at(x, y)[c], 1 + 256 / a) << x << "," << y << " alpha " << a;
        }
}

TEST_F(Cli, Y4mAndRawRoundTripsAreExact)
{
    for (int depth : {8, 10}) {
        SCOPED_TRACE(depth);
        const std::string original = y4m_bytes(random_planes(14, 6, depth, unsigned(depth)));
        const std::string raw = depth == 10 ? "frame.w210" : "frame.yuy2";
        write_bytes("in.y4m", original);
        ASSERT_EQ(run({"map", "in.y4m", "copy.y4m", "--filter", "area", "--quiet"}).status, 0);
        EXPECT_EQ(read_text("copy.y4m"), original);
        ASSERT_EQ(run({"map", "in.y4m", raw, "--filter", "area", "--quiet"}).status, 0);
        EXPECT_EQ(read_bytes(raw).size(), std::size_t(14 * 6 * (depth == 10 ? 4 : 2)));
        ASSERT_EQ(run({"map", raw, "back.y4m", "--raw", "14x6", "--filter", "area", "--quiet"}).status, 0);
        EXPECT_EQ(read_text("back.y4m"), original);
    }
    // 8 bits into 10 and back: v becomes 4v and returns.
    const std::string eight = y4m_bytes(random_planes(14, 6, 8, 3));
    write_bytes("eight.y4m", eight);
    ASSERT_EQ(run({"map", "eight.y4m", "ten.y4m", "--format", "w210", "--filter", "area", "--quiet"}).status, 0);
    const Planes ten = parse_y4m(read_bytes("ten.y4m"));
    const Planes source = parse_y4m(std::vector<uint8_t>(eight.begin(), eight.end()));
    EXPECT_EQ(ten.depth, 10);
    EXPECT_EQ(ten.Y(5, 3), 4 * source.Y(5, 3));
    ASSERT_EQ(run({"map", "ten.y4m", "again.y4m", "--format", "yuy2", "--filter", "area", "--quiet"}).status, 0);
    EXPECT_EQ(read_text("again.y4m"), eight);
}

TEST_F(Cli, JpegCarriesAPictureWithinItsLoss)
{
    Image rgb = make_image(32, 16, 3);
    for (int y = 0; y < 16; ++y)
        for (int x = 0; x < 32; ++x) {
            uint8_t *p = rgb.at(x, y);
            p[0] = uint8_t(40 + 4 * x), p[1] = uint8_t(60 + 6 * y), p[2] = 150;
        }
    write_png(path("in.png"), rgb);
    ASSERT_EQ(run({"map", "in.png", "mid.jpg", "--filter", "area", "--quiet"}).status, 0);
    ASSERT_EQ(run({"map", "mid.jpg", "out.png", "--filter", "area", "--quiet"}).status, 0);
    Image out = read_png(path("out.png"));
    ASSERT_EQ(out.pixels.size(), rgb.pixels.size());
    for (std::size_t i = 0; i < out.pixels.size(); ++i)
        EXPECT_NEAR(out.pixels[i], rgb.pixels[i], 4) << i;
}

// ---- Colour conversion -------------------------------------------------------

// 75% bars (191 of 255) into video range: BT.601 below HD, BT.709 from
// 1280 wide. Each bar's middle lands within one code value of its level.
TEST_F(Cli, BarsLandOnTheirNominalLevels)
{
    static const int bars[8][3] = {{1, 1, 1}, {1, 1, 0}, {0, 1, 1}, {0, 1, 0},
                                   {1, 0, 1}, {1, 0, 0}, {0, 0, 1}, {0, 0, 0}};
    for (int width : {640, 1280})
        for (int depth : {8, 10}) {
            SCOPED_TRACE(std::to_string(width) + " wide, " + std::to_string(depth) + " bits");
            Image rgb = make_image(width, 2, 3);
            for (int y = 0; y < 2; ++y)
                for (int x = 0; x < width; ++x)
                    for (int c = 0; c < 3; ++c)
                        rgb.at(x, y)[c] = uint8_t(bars[x * 8 / width][c] * 191);
            write_png(path("bars.png"), rgb);
            ASSERT_EQ(run({"map", "bars.png", "bars.y4m", "--format", depth == 10 ? "w210" : "yuy2", "--quiet"})
                          .status,
                      0);
            const Planes p = parse_y4m(read_bytes("bars.y4m"));
            const double kr = width >= 1280 ? 0.2126 : 0.299, kb = width >= 1280 ? 0.0722 : 0.114;
            const double scale = depth == 10 ? 4.0 : 1.0;
            for (int b = 0; b < 8; ++b) {
                const int x = b * width / 8 + width / 16;
                const double r = bars[b][0] * 191 / 255.0, g = bars[b][1] * 191 / 255.0, bl = bars[b][2] * 191 / 255.0;
                const double luma = kr * r + (1 - kr - kb) * g + kb * bl;
                EXPECT_NEAR(p.Y(x, 1), scale * (16 + 219 * luma), 1.0) << "bar " << b;
                EXPECT_NEAR(p.Cb(x, 1), scale * (128 + 112 * (bl - luma) / (1 - kb)), 1.0) << "bar " << b;
                EXPECT_NEAR(p.Cr(x, 1), scale * (128 + 112 * (r - luma) / (1 - kr)), 1.0) << "bar " << b;
            }
            // And back to RGB.
            ASSERT_EQ(run({"map", "bars.y4m", "back.png", "--quiet"}).status, 0);
            Image back = read_png(path("back.png"));
            for (int b = 0; b < 8; ++b)
                for (int c = 0; c < 3; ++c)
                    EXPECT_NEAR(back.at(b * width / 8 + width / 16, 1)[c], bars[b][c] * 191, 1) << "bar " << b;
        }
}

// A one-pixel red line: on an even pixel its chroma goes to that pixel's
// pair alone; on an odd pixel it splits evenly between the pairs on either
// side, since the pairs' chroma stands on their even pixels.
TEST_F(Cli, ChromaIsCositedWithTheEvenPixel)
{
    for (int column : {6, 7}) {
        SCOPED_TRACE(column);
        Image rgb = make_image(16, 2, 3);
        for (int y = 0; y < 2; ++y)
            rgb.at(column, y)[0] = 200;
        write_png(path("line.png"), rgb);
        ASSERT_EQ(run({"map", "line.png", "line.y4m", "--quiet"}).status, 0);
        const Planes p = parse_y4m(read_bytes("line.y4m"));
        std::vector<int> cr;
        for (int k = 0; k < 8; ++k)
            cr.push_back(p.Cr(2 * k, 0));
        if (column == 6) {
            EXPECT_GT(cr[3], 140);
            EXPECT_EQ(cr[2], 128);
            EXPECT_EQ(cr[4], 128);
        } else {
            EXPECT_GT(cr[3], 130);
            EXPECT_EQ(cr[3], cr[4]);
            EXPECT_EQ(cr[2], 128);
            EXPECT_EQ(cr[5], 128);
        }
    }
}

// ---- Threads -----------------------------------------------------------------

TEST_F(Cli, FourThreadsDrawTheSameBytesAsOne)
{
    std::mt19937 rng(11);
    Image rgb = make_image(37, 23, 3);
    for (uint8_t &v : rgb.pixels)
        v = uint8_t(rng());
    write_png(path("in.png"), rgb);
    write_bytes("back.y4m", y4m_bytes(random_planes(101, 61, 8, 5)));
    const std::initializer_list<std::initializer_list<std::string>> calls = {
        {"--size", "101x61", "--filter", "lanczos3"},
        {"--onto", "back.y4m", "--dst", "3.25,2.5,90.75,58.5", "--hfilter", "cubic", "--vfilter", "soft",
         "--opacity", "0.5", "--dest-field", "odd"},
    };
    for (const auto &options : calls) {
        std::vector<std::string> one = {"map", "in.png", "one.y4m", "--quiet", "--threads", "1"};
        std::vector<std::string> four = {"map", "in.png", "four.y4m", "--quiet", "--threads", "4"};
        one.insert(one.end(), options);
        four.insert(four.end(), options);
        ASSERT_EQ(run(one).status, 0);
        ASSERT_EQ(run(four).status, 0);
        const std::vector<uint8_t> a = read_bytes("one.y4m"), b = read_bytes("four.y4m");
        EXPECT_GT(a.size(), 101u * 61u * 2u);
        EXPECT_TRUE(a == b);
    }
}

// ---- Flags and demo ------------------------------------------------------------

TEST_F(Cli, FlagsComposeAndDecodeTheSameWord)
{
    const Result composed = run({"flags", "--hfilter", "cubic", "--vfilter", "lanczos3", "--opacity", "0.5", "--tile",
                              "--dest-field", "odd", "--vsoften", "-2"});
    ASSERT_EQ(composed.status, 0) << composed.err;
    // cubic 2 << 8, lanczos3 5 << 11, level 2048 as 0x1800 << 16, tile 0x10,
    // odd destination field 0x80, vsoften -2 as 6 << 29.
    EXPECT_EQ(composed.out.rfind("flags 0xD8002A90", 0), 0u) << composed.out;
    EXPECT_NE(composed.out.find("level          2048 = opacity 0.5"), std::string::npos) << composed.out;
    EXPECT_EQ(run({"flags", "0xD8002A90"}).out, composed.out);
    EXPECT_EQ(run({"flags", std::to_string(int32_t(0xD8002A90u))}).out, composed.out);

    const Result zero = run({"flags"});
    EXPECT_EQ(zero.out.rfind("flags 0x00000000", 0), 0u);
    EXPECT_NE(zero.out.find("hfilter        0 area"), std::string::npos);
    EXPECT_NE(zero.out.find("4096 = opacity 1 (opaque)"), std::string::npos);
}

TEST_F(Cli, DemoWritesTheIndexAndEveryPictureItShows)
{
    const Result r = run({"demo", "--out", "show"});
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(r.out, (fs::canonical(dir_) / "show" / "index.html").string() + "\n");
    const std::string html = read_text("show/index.html");
    int pictures = 0;
    for (std::size_t at = html.find("src=\""); at != std::string::npos; at = html.find("src=\"", at + 1)) {
        const std::string file = html.substr(at + 5, html.find('"', at + 5) - at - 5);
        const Image image = read_png(path("show/" + file));
        EXPECT_GT(image.width, 0) << file;
        ++pictures;
    }
    EXPECT_GE(pictures, 8);
}

} // namespace
