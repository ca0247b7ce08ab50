#include "cli.h"

#include <charconv>
#include <cmath>
#include <cstdio>

namespace lorvex_cli {

namespace {

std::string quoted(std::string_view text)
{
    return "'" + std::string(text) + "'";
}

} // namespace

const char *const filter_names[8] = {"area",     "linear",   "cubic",    "soft",
                                     "lanczos2", "lanczos3", "lanczos4", "edge"};

Args::Args(int argc, char **argv, int first)
{
    for (int i = first; i < argc; ++i)
        args_.emplace_back(argv[i]);
}

std::string Args::value(std::string_view name)
{
    if (done())
        throw Error(std::string(name) + " needs a value");
    return take();
}

bool Args::wants_help() const
{
    for (const std::string &arg : args_)
        if (is_help(arg))
            return true;
    return false;
}

bool is_help(std::string_view arg)
{
    return arg == "--help" || arg == "-h";
}

bool is_option(std::string_view arg)
{
    return arg.size() > 1 && arg[0] == '-' && !(arg[1] >= '0' && arg[1] <= '9') && arg[1] != '.';
}

int parse_int(std::string_view text, std::string_view what, int low, int high)
{
    int value = 0;
    auto [end, ec] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (ec != std::errc() || end != text.data() + text.size() || text.empty())
        throw Error(std::string(what) + ": " + quoted(text) + " is not a whole number");
    if (value < low || value > high)
        throw Error(std::string(what) + ": " + quoted(text) + " is out of range (" + std::to_string(low) +
                    " to " + std::to_string(high) + ")");
    return value;
}

double parse_double(std::string_view text, std::string_view what, double low, double high)
{
    double value = 0;
    auto [end, ec] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (ec != std::errc() || end != text.data() + text.size() || text.empty() || !std::isfinite(value))
        throw Error(std::string(what) + ": " + quoted(text) + " is not a number");
    if (value < low || value > high) {
        char range[64];
        std::snprintf(range, sizeof range, " is out of range (%g to %g)", low, high);
        throw Error(std::string(what) + ": " + quoted(text) + range);
    }
    return value;
}

void parse_size(std::string_view text, std::string_view what, int &width, int &height)
{
    auto x = text.find('x');
    if (x == std::string_view::npos)
        throw Error(std::string(what) + ": " + quoted(text) + " is not a size WIDTHxHEIGHT");
    width = parse_int(text.substr(0, x), what, 1, 16384);
    height = parse_int(text.substr(x + 1), what, 1, 16384);
}

void parse_rect(std::string_view text, std::string_view what, float rect[4])
{
    std::string_view rest = text;
    for (int i = 0; i < 4; ++i) {
        auto comma = rest.find(',');
        if ((comma == std::string_view::npos) != (i == 3))
            throw Error(std::string(what) + ": " + quoted(text) + " is not a rectangle x0,y0,x1,y1");
        rect[i] = float(parse_double(rest.substr(0, comma), what, -1e6, 1e6));
        rest = comma == std::string_view::npos ? std::string_view() : rest.substr(comma + 1);
    }
}

int parse_filter(std::string_view text, std::string_view what)
{
    for (int kind = 0; kind < 8; ++kind)
        if (text == filter_names[kind])
            return kind;
    throw Error(std::string(what) + ": unknown filter " + quoted(text) +
                " (area, linear, cubic, soft, lanczos2, lanczos3, lanczos4 or edge)");
}

const char *filter_name(int kind)
{
    return filter_names[kind & 7];
}

int parse_field(std::string_view text, std::string_view what)
{
    if (text == "even")
        return 0;
    if (text == "odd")
        return 1;
    throw Error(std::string(what) + ": " + quoted(text) + " is not a field (even or odd)");
}

} // namespace lorvex_cli
