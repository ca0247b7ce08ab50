#include "shared/diagnostics.h"

#include <cstdio>
#include <cstring>

namespace lorvex {

uint32_t diag_mode = 0;
char diag_text[kDiagRingSize] = {};
char* diag_write = diag_text;
char* diag_line = diag_text;
int32_t diag_y = 0;
int32_t diag_y_limit = 0;
int32_t diag_bell_count = 1;

namespace {

// The texts formatted outside the ring (standard output, message box) are
// bounded like the ring.
constexpr size_t kDiagLocalSize = kDiagRingSize;

DiagSink diag_sink = nullptr;

void diag_default_sink(DiagChannel channel, const char* text, size_t length)
{
    switch (channel) {
    case DiagChannel::standard_output:
        std::fwrite(text, 1, length, stdout);
        break;
    case DiagChannel::debugger:
        std::fwrite(text, 1, length, stderr);
        break;
    case DiagChannel::screen:
        std::fwrite(text, 1, length, stderr);
        std::fputc('\n', stderr);
        break;
    case DiagChannel::message_box:
        std::fprintf(stderr, "%s: %.*s\n", kDiagMessageCaption, static_cast<int>(length), text);
        break;
    }
}

void diag_emit(DiagChannel channel, const char* text, size_t length)
{
    if (diag_sink != nullptr)
        diag_sink(channel, text, length);
    else
        diag_default_sink(channel, text, length);
}

// vsnprintf into buf[size]; returns the characters that stand there.
__attribute__((format(printf, 3, 0)))
size_t diag_format(char* buf, size_t size, const char* format, va_list args)
{
    const int n = std::vsnprintf(buf, size, format, args);
    if (n < 0)
        return 0;
    return static_cast<size_t>(n) < size ? static_cast<size_t>(n) : size - 1;
}

__attribute__((format(printf, 1, 0)))
void diag_vprint_standard(const char* format, va_list args)
{
    char buf[kDiagLocalSize];
    const size_t length = diag_format(buf, sizeof buf, format, args);
    diag_emit(DiagChannel::standard_output, buf, length);
}

}  // namespace

void diag_gather(const char* format, va_list args, int limit, DiagLineFn line_fn)
{
    // 1. Keep the second half free for this call.
    if (diag_write - diag_text > kDiagMoveThreshold) {
        const ptrdiff_t pending = diag_write - diag_line;
        std::memmove(diag_text, diag_line, static_cast<size_t>(pending));
        diag_line = diag_text;
        diag_write = diag_text + pending;
    }

    // 2. Format at diag_write, leaving two bytes for the line feed and zero
    //    that step 4 may add behind the text.
    char* const from = diag_write;
    const size_t room = static_cast<size_t>(diag_text + kDiagRingSize - diag_write) - 1;
    diag_write += diag_format(diag_write, room, format, args);

    // 3. Hand every line ended in this call. The character behind the line
    //    feed is kept aside while the line is zero-terminated in place.
    for (char* p = from; p < diag_write; ++p) {
        if (*p != '\n')
            continue;
        const char kept = p[1];
        p[1] = '\0';
        line_fn(diag_line);
        p[1] = kept;
        diag_line = p + 1;
    }

    // 4. A pending line that has reached the limit is ended here. The line
    //    feed stands at diag_write, outside the text held, so the next call
    //    formats over it.
    if (diag_write - diag_line < limit)
        return;
    diag_write[0] = '\n';
    diag_write[1] = '\0';
    line_fn(diag_line);
    diag_line = diag_write;
}

void diag_screen_line(const char* text)
{
    const size_t length = std::strcspn(text, "\n");
    if (diag_y_limit == 0)
        diag_y_limit = kDiagScreenHeight - kDiagLinePitch;
    diag_emit(DiagChannel::screen, text, length);
    diag_y += kDiagLinePitch;
    // A screen would also draw a blank marker bar at the new diag_y here.
    if (diag_y > diag_y_limit)
        diag_y = 0;
}

void diag_debugger_line(const char* text)
{
    diag_emit(DiagChannel::debugger, text, std::strlen(text));
}

void diag_set_mode(uint32_t mode)
{
    diag_mode = mode;
}

void diag_screen_print(const char* format, ...)
{
    va_list args;
    va_start(args, format);
    diag_gather(format, args, kDiagScreenLineLimit, diag_screen_line);
    va_end(args);
}

void diag_print(const char* format, ...)
{
    if (format[0] == '\0')
        return;
    va_list args;
    va_start(args, format);
    switch (diag_mode) {
    case 0:
        diag_vprint_standard(format, args);
        break;
    case 1:
        diag_gather(format, args, kDiagDebuggerLineLimit, diag_debugger_line);
        break;
    case 2:
        diag_gather(format, args, kDiagScreenLineLimit, diag_screen_line);
        break;
    default:
        break;
    }
    va_end(args);
}

void diag_message_box(const char* format, ...)
{
    char buf[kDiagLocalSize];
    va_list args;
    va_start(args, format);
    const size_t length = diag_format(buf, sizeof buf, format, args);
    va_end(args);
    diag_emit(DiagChannel::message_box, buf, length);
}

void diag_print_once_bell(const char* format, ...)
{
    if (format[0] == '\0')
        return;
    va_list args;
    va_start(args, format);
    diag_vprint_standard(format, args);
    va_end(args);
    if (diag_bell_count > 0) {
        --diag_bell_count;
        diag_emit(DiagChannel::standard_output, &kDiagBell, 1);
    }
}

DiagSink diag_set_sink(DiagSink sink)
{
    const DiagSink previous = diag_sink;
    diag_sink = sink;
    return previous;
}

void diag_reset_for_tests()
{
    diag_mode = 0;
    std::memset(diag_text, 0, sizeof diag_text);
    diag_write = diag_text;
    diag_line = diag_text;
    diag_y = 0;
    diag_y_limit = 0;
    diag_bell_count = 1;
    diag_sink = nullptr;
}

}  // namespace lorvex
