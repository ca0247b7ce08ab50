// The lorvex command-line tool: what its parts share. Every failure the user
// can cause (bad arguments, unreadable or malformed files, combinations the
// library does not draw) is thrown as Error, printed by main() as one line
// on standard error, and ends the program with status 2 before any output
// file is written.
#pragma once

#include <lorvex.h>

#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace lorvex_cli {

struct Error : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// The command's arguments after its name, read front to back.
class Args {
public:
    Args(int argc, char **argv, int first);

    bool wants_help() const; // --help or -h anywhere
    bool done() const { return next_ >= args_.size(); }
    const std::string &peek() const { return args_[next_]; }
    std::string take() { return args_[next_++]; }
    // The value of option `name` (the argument after it).
    std::string value(std::string_view name);

private:
    std::vector<std::string> args_;
    std::size_t next_ = 0;
};

bool is_help(std::string_view arg);
bool is_option(std::string_view arg); // starts with '-' and is not a number

// Parsers; `what` names the option in the error message.
int parse_int(std::string_view text, std::string_view what, int low, int high);
double parse_double(std::string_view text, std::string_view what, double low, double high);
void parse_size(std::string_view text, std::string_view what, int &width, int &height);
// x0,y0,x1,y1 with fractional values.
void parse_rect(std::string_view text, std::string_view what, float rect[4]);

// Filter kinds by name: area, linear, cubic, soft, lanczos2, lanczos3,
// lanczos4, edge (kinds 0 to 7).
int parse_filter(std::string_view text, std::string_view what);
const char *filter_name(int kind);
extern const char *const filter_names[8];

// even | odd, as a field number 0 or 1.
int parse_field(std::string_view text, std::string_view what);

// The fields of the rectangle operations' flags word, as options of `map`
// and `flags`. The defaults give the word 0: area both ways, opaque.
struct FlagOptions {
    int hfilter = LORVEX_FILTER_AREA;
    int vfilter = LORVEX_FILTER_AREA;
    int level = 4096; // opacity in 4096ths
    bool tile = false;
    int source_field = -1; // -1 frame, 0 even, 1 odd
    int dest_field = -1;
    int chroma_soften = 0;
    int vsoften = 0;

    uint32_t word() const;
};

// Consumes `option` (and its value from `args`) if it is one of the flag
// options; false if it is not.
bool parse_flag_option(const std::string &option, Args &args, FlagOptions &flags);

// The help lines of the flag options.
extern const char flag_options_help[];

// Every field of a word, one a line, and the C expression that builds it.
std::string describe_flags(uint32_t word);

int run_demo(Args args);
int run_map(Args args);
int run_flags(Args args);

} // namespace lorvex_cli
