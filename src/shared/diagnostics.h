// The developers' text channel. Formatted text is gathered in a ring of
// characters, cut into lines and handed to one of three places: the standard
// output, the debugger output or the screen. The library itself writes only
// through diag_screen_print, with the fixed refusal messages of roll_rectangle
// and map_polygon (each ends in a line feed, so it is shown at once). The rest
// is for hosts and developers working inside the library. Nothing here is
// exported, and the host can neither silence nor redirect the channel.
//
// This build has no window system and no debugger channel of its own:
//  - screen: each line goes to the standard error, followed by a line feed.
//    The position is still kept as on a screen kDiagScreenHeight (1080) pixels
//    high with a kDiagLinePitch (20) pixel pitch: lines fill the page from the
//    top and start over at 0 once the position passes the last line.
//  - debugger: each line goes to the standard error as handed, line feed and
//    all.
//  - message box: the text goes to the standard error as "Message: <text>".
//  - standard output (mode 0 and diag_print_once_bell): the text unchanged.
//
// No path allocates: text is formatted into the ring or into a local buffer.
//
// The state has no lock: the channel is meant for one thread at a time.
// Operations that run in parallel and refuse at once can interleave their text.
#pragma once

#include <cstdarg>
#include <cstddef>
#include <cstdint>

namespace lorvex {

constexpr int kDiagRingSize = 2048;
// Past this point a call first moves the pending line to the start of the
// ring, so the second half is the room for what one call formats.
constexpr int kDiagMoveThreshold = 1024;
// A pending line that reaches this many characters is ended without a line feed.
constexpr int kDiagScreenLineLimit = 70;
constexpr int kDiagDebuggerLineLimit = 130;
// The nominal screen: line pitch and height in pixels.
constexpr int kDiagLinePitch = 20;
constexpr int kDiagScreenHeight = 1080;
constexpr char kDiagMessageCaption[] = "Message";
constexpr char kDiagBell = 7;

// Process-wide state, as at load: mode 0, an empty ring, position 0, limit 0,
// bell count 1. Nothing in the library resets it.
extern uint32_t diag_mode;             // 0 standard output, 1 debugger, 2 screen
extern char diag_text[kDiagRingSize];  // the ring
extern char* diag_write;               // end of the text held
extern char* diag_line;                // start of the line not yet handed over
extern int32_t diag_y;                 // y of the next screen line
extern int32_t diag_y_limit;           // lowest screen line; 0 until the first
extern int32_t diag_bell_count;        // 1 until the first bell, then 0

// Takes one finished line, zero-terminated; it ends in a line feed.
using DiagLineFn = void (*)(const char* line);

void diag_set_mode(uint32_t mode);

// Formats into the ring and shows each finished line on the screen; a pending
// line of kDiagScreenLineLimit characters or more is ended.
void diag_screen_print(const char* format, ...) __attribute__((format(printf, 1, 2)));

// Empty format: nothing. Mode 0: printed to the standard output as it is.
// Mode 1: gathered, lines to the debugger, limit kDiagDebuggerLineLimit.
// Mode 2: as diag_screen_print. Any other mode: nothing.
void diag_print(const char* format, ...) __attribute__((format(printf, 1, 2)));

// Formats into a local buffer and shows it captioned "Message".
void diag_message_box(const char* format, ...) __attribute__((format(printf, 1, 2)));

// Empty format: nothing. Otherwise printed to the standard output; the first
// such call in the life of the process also prints one BEL.
void diag_print_once_bell(const char* format, ...) __attribute__((format(printf, 1, 2)));

// Gathering: formats at diag_write and hands each line ended in this call to
// line_fn; what is left without a line feed waits for the next call, unless it
// holds `limit` characters or more, when it is ended and handed at once. The
// text of one call is cut to the room left in the ring: at least 1022
// characters, since the move leaves the write position in the first half.
void diag_gather(const char* format, va_list args, int limit, DiagLineFn line_fn)
    __attribute__((format(printf, 1, 0)));

// The screen's line function: shows the text up to its first line feed at
// diag_y, then moves diag_y one pitch down, back to 0 past diag_y_limit.
void diag_screen_line(const char* text);

// The debugger's line function: hands the line as it is.
void diag_debugger_line(const char* text);

// ---- Seam for tests ---------------------------------------------------------
// Every text leaves the channel through one sink. The default writes to the
// standard streams as described at the top; a test may put its own in place.
// What a sink receives (not zero-terminated, `length` bytes):
//   standard_output  the formatted text; the bell as its own one-byte text
//   debugger         the line as handed, line feed included
//   screen           the line up to its first line feed; diag_y is its position
//   message_box      the formatted text, without caption
enum class DiagChannel { standard_output, debugger, screen, message_box };
using DiagSink = void (*)(DiagChannel channel, const char* text, size_t length);

// Puts `sink` in place (nullptr: the default) and returns the one it replaces.
DiagSink diag_set_sink(DiagSink sink);

// Puts the state back as at load, the default sink included.
void diag_reset_for_tests();

}  // namespace lorvex
