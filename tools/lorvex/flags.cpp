// `lorvex flags`: the flags word of map_rectangle read field by field, or
// composed from named options, with the C expression that builds it.
#include "cli.h"

#include <cerrno>
#include <cinttypes>
#include <cstdio>
#include <cstdlib>

namespace lorvex_cli {

namespace {

const char usage[] =
    "usage: lorvex flags WORD\n"
    "       lorvex flags [OPTIONS]\n"
    "\n"
    "Decodes a flags word of map_rectangle (decimal, negative allowed, or 0x hex)\n"
    "into its fields, or composes one from the options below and decodes it.\n"
    "With no options the word is 0: area filters, opaque, no fields.\n"
    "\n"
    "Options:\n";

const char *const filter_macros[8] = {
    "LORVEX_FILTER_AREA",     "LORVEX_FILTER_LINEAR",   "LORVEX_FILTER_CUBIC",    "LORVEX_FILTER_SOFT",
    "LORVEX_FILTER_LANCZOS2", "LORVEX_FILTER_LANCZOS3", "LORVEX_FILTER_LANCZOS4", "LORVEX_FILTER_EDGE"};

std::string format(const char *fmt, auto... args)
{
    char text[256];
    std::snprintf(text, sizeof text, fmt, args...);
    return text;
}

std::string field_text(uint32_t word, uint32_t even_bit, uint32_t odd_bit)
{
    if (word & even_bit)
        return word & odd_bit ? "even (the odd bit is set too; even wins)" : "even";
    return word & odd_bit ? "odd" : "none (whole frame)";
}

uint32_t parse_word(const std::string &text)
{
    errno = 0;
    char *end = nullptr;
    const long long value = std::strtoll(text.c_str(), &end, 0);
    if (text.empty() || *end != '\0' || errno != 0)
        throw Error("'" + text + "' is not a flags word (decimal or 0x hex)");
    if (value < INT32_MIN || value > int64_t(UINT32_MAX))
        throw Error("'" + text + "' does not fit in 32 bits");
    return uint32_t(value);
}

} // namespace

const char flag_options_help[] =
    "  --filter NAME            both filters: area, linear, cubic, soft, lanczos2,\n"
    "                           lanczos3, lanczos4, edge (kinds 0 to 7)\n"
    "  --hfilter NAME           horizontal filter only\n"
    "  --vfilter NAME           vertical filter only\n"
    "  --opacity F              opacity from 0 to 2 (above 1 is a gain)\n"
    "  --level N                the same in 4096ths, 0 to 8188\n"
    "  --tile                   add partly covered edge pixels instead of mixing\n"
    "  --source-field even|odd  read one field of the source\n"
    "  --dest-field even|odd    write one field of the destination\n"
    "  --chroma-soften N        widen the chroma filters by (8 + N) / 8, N 0 to 3\n"
    "  --vsoften N              widen the vertical filters by (8 + N) / 8, N -4 to 3\n";

uint32_t FlagOptions::word() const
{
    uint32_t w = lorvex_flag_filters(hfilter, vfilter) | lorvex_flag_level(level) |
                 lorvex_flag_chroma_soften(chroma_soften) | lorvex_flag_vsoften(vsoften);
    if (tile)
        w |= LORVEX_TILE;
    if (source_field >= 0)
        w |= source_field == 0 ? LORVEX_SOURCE_EVEN_FIELD : LORVEX_SOURCE_ODD_FIELD;
    if (dest_field >= 0)
        w |= dest_field == 0 ? LORVEX_DEST_EVEN_FIELD : LORVEX_DEST_ODD_FIELD;
    return w;
}

bool parse_flag_option(const std::string &option, Args &args, FlagOptions &flags)
{
    if (option == "--filter") {
        flags.hfilter = flags.vfilter = parse_filter(args.value(option), option);
    } else if (option == "--hfilter") {
        flags.hfilter = parse_filter(args.value(option), option);
    } else if (option == "--vfilter") {
        flags.vfilter = parse_filter(args.value(option), option);
    } else if (option == "--opacity") {
        // Nearest 4096th, as lorvex_flag_opacity rounds.
        flags.level = int(parse_double(args.value(option), option, 0.0, 8188.0 / 4096.0) * 4096.0 + 0.5);
    } else if (option == "--level") {
        flags.level = parse_int(args.value(option), option, 0, 8188);
    } else if (option == "--tile") {
        flags.tile = true;
    } else if (option == "--source-field") {
        flags.source_field = parse_field(args.value(option), option);
    } else if (option == "--dest-field") {
        flags.dest_field = parse_field(args.value(option), option);
    } else if (option == "--chroma-soften") {
        flags.chroma_soften = parse_int(args.value(option), option, 0, 3);
    } else if (option == "--vsoften") {
        flags.vsoften = parse_int(args.value(option), option, -4, 3);
    } else {
        return false;
    }
    return true;
}

std::string describe_flags(uint32_t word)
{
    const int hkind = int(word >> 8) & 7;
    const int vkind = int(word >> 11) & 7;
    const int soften = int(word >> 14) & 3;
    const int level_field = int(word >> 16) & 0x1FFF;
    // The operations drop the two lowest bits of the level.
    const int level = (level_field - 4096) & 0x1FFC;
    const int vsoften_bits = int(word >> 29) & 7;
    const int vsoften = vsoften_bits >= 4 ? vsoften_bits - 8 : vsoften_bits;

    std::string s = format("flags 0x%08" PRIX32 " (%" PRId32 " as int32_t)\n", word, int32_t(word));
    s += "  bits 2-3    source field   " + field_text(word, LORVEX_SOURCE_EVEN_FIELD, LORVEX_SOURCE_ODD_FIELD) + "\n";
    s += std::string("  bit 4       tile           ") +
         (word & LORVEX_TILE ? "on (partly covered pixels add)" : "off (overlay)") + "\n";
    s += "  bits 6-7    dest field     " + field_text(word, LORVEX_DEST_EVEN_FIELD, LORVEX_DEST_ODD_FIELD) + "\n";
    s += format("  bits 8-10   hfilter        %d %s\n", hkind, filter_name(hkind));
    s += format("  bits 11-13  vfilter        %d %s\n", vkind, filter_name(vkind));
    s += format("  bits 14-15  chroma soften  %d (chroma filters widened by %d/8)\n", soften, 8 + soften);
    std::string level_note = level == 0      ? "draws nothing"
                             : level > 4096  ? "a gain"
                             : level == 4096 ? "opaque"
                                             : "partly transparent";
    if ((level_field & 3) != 0)
        level_note += "; the field's two lowest bits are dropped";
    s += format("  bits 16-28  level          %d = opacity %.4g (%s)\n", level, level / 4096.0, level_note.c_str());
    s += format("  bits 29-31  vsoften        %d (vertical filters widened by %d/8)\n", vsoften, 8 + vsoften);
    const uint32_t ignored = word & 0x23u;
    if (ignored != 0)
        s += format("  bits 0-1, 5 ignored        0x%02" PRIX32 " set, not read\n", ignored);

    // The expression a host writes for the same word.
    std::string c = format("lorvex_flag_filters(%s, %s) | lorvex_flag_level(%d)", filter_macros[hkind],
                           filter_macros[vkind], level);
    if (soften != 0)
        c += format(" | lorvex_flag_chroma_soften(%d)", soften);
    if (vsoften != 0)
        c += format(" | lorvex_flag_vsoften(%d)", vsoften);
    if (word & LORVEX_TILE)
        c += " | LORVEX_TILE";
    if (word & LORVEX_SOURCE_EVEN_FIELD)
        c += " | LORVEX_SOURCE_EVEN_FIELD";
    else if (word & LORVEX_SOURCE_ODD_FIELD)
        c += " | LORVEX_SOURCE_ODD_FIELD";
    if (word & LORVEX_DEST_EVEN_FIELD)
        c += " | LORVEX_DEST_EVEN_FIELD";
    else if (word & LORVEX_DEST_ODD_FIELD)
        c += " | LORVEX_DEST_ODD_FIELD";
    s += "  in C: (int32_t)(" + c + ")\n";
    return s;
}

int run_flags(Args args)
{
    if (args.wants_help()) {
        std::printf("%s%s", usage, flag_options_help);
        return 0;
    }
    if (!args.done() && !is_option(args.peek())) {
        const std::string text = args.take();
        if (!args.done())
            throw Error("flags: a word cannot be combined with other arguments ('" + args.peek() + "')");
        std::fputs(describe_flags(parse_word(text)).c_str(), stdout);
        return 0;
    }
    FlagOptions flags;
    while (!args.done()) {
        const std::string option = args.take();
        if (!parse_flag_option(option, args, flags))
            throw Error("flags: unknown option '" + option + "' (--help lists them)");
    }
    std::fputs(describe_flags(flags.word()).c_str(), stdout);
    return 0;
}

} // namespace lorvex_cli
