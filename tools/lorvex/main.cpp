// lorvex: the command-line face of the library. `demo` renders a showcase
// from built-in pictures, `map` makes one map_rectangle call on files, and
// `flags` reads and composes the flags word.
#include "cli.h"

#include <cstdio>
#include <cstring>
#include <exception>
#include <new>

namespace {

const char usage[] =
    "usage: lorvex COMMAND [ARGUMENTS]\n"
    "\n"
    "Commands:\n"
    "  demo [--out DIR]         render the showcase pictures and their index.html\n"
    "  map INPUT OUTPUT [...]   scale and composite one picture file into another\n"
    "  flags WORD | [OPTIONS]   decode a flags word, or compose one from options\n"
    "\n"
    "'lorvex COMMAND --help' describes each command.\n";

} // namespace

int main(int argc, char **argv)
{
    using namespace lorvex_cli;
    try {
        if (argc < 2)
            throw Error("no command given (demo, map or flags; --help for more)");
        const std::string command = argv[1];
        if (is_help(command)) {
            std::fputs(usage, stdout);
            return 0;
        }
        Args args(argc, argv, 2);
        if (command == "demo")
            return run_demo(args);
        if (command == "map")
            return run_map(args);
        if (command == "flags")
            return run_flags(args);
        throw Error("unknown command '" + command + "' (demo, map or flags; --help for more)");
    } catch (const Error &e) {
        std::fprintf(stderr, "lorvex: %s\n", e.what());
        return 2;
    } catch (const std::bad_alloc &) {
        std::fprintf(stderr, "lorvex: out of memory\n");
        return 2;
    }
}
