#include "shared/diagnostics.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

// diag_print("") is the case under test; the warning is about exactly that.
#pragma GCC diagnostic ignored "-Wformat-zero-length"

namespace lorvex {
namespace {

struct Emitted {
    DiagChannel channel;
    std::string text;
    int32_t y;  // diag_y while the text was emitted
    bool operator==(const Emitted&) const = default;
};

std::vector<Emitted> emitted;

void capture(DiagChannel channel, const char* text, size_t length)
{
    emitted.push_back({channel, std::string(text, length), diag_y});
}

std::vector<std::string> texts(DiagChannel channel)
{
    std::vector<std::string> out;
    for (const Emitted& e : emitted)
        if (e.channel == channel)
            out.push_back(e.text);
    return out;
}

using Lines = std::vector<std::string>;

class DiagnosticsTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        diag_reset_for_tests();
        diag_set_sink(capture);
        emitted.clear();
    }
    void TearDown() override { diag_reset_for_tests(); }
};

TEST_F(DiagnosticsTest, PartialLineWaitsInTheRingUntilEnded)
{
    diag_screen_print("roll: %d", 7);
    diag_screen_print(" refused");
    EXPECT_TRUE(emitted.empty());
    EXPECT_EQ(std::string(diag_line, diag_write), "roll: 7 refused");

    diag_screen_print("\n");
    EXPECT_EQ(texts(DiagChannel::screen), Lines{"roll: 7 refused"});
    EXPECT_EQ(diag_line, diag_write);

    // The debugger receives its lines line feed and all.
    diag_set_mode(1);
    diag_print("a");
    EXPECT_TRUE(texts(DiagChannel::debugger).empty());
    diag_print("b\n");
    EXPECT_EQ(texts(DiagChannel::debugger), Lines{"ab\n"});
}

TEST_F(DiagnosticsTest, SeveralLinesOfOneCallAreHandedOneByOne)
{
    diag_screen_print("one\ntwo\n\nthree");
    EXPECT_EQ(texts(DiagChannel::screen), (Lines{"one", "two", ""}));
    diag_screen_print("!\n");
    EXPECT_EQ(texts(DiagChannel::screen), (Lines{"one", "two", "", "three!"}));

    // The character behind each line feed is put back: the next line is whole.
    diag_set_mode(1);
    diag_print("x\ny\nz\n");
    EXPECT_EQ(texts(DiagChannel::debugger), (Lines{"x\n", "y\n", "z\n"}));
}

TEST_F(DiagnosticsTest, PendingLineIsEndedAtTheLimit)
{
    struct Case {
        uint32_t mode;
        int limit;
        DiagChannel channel;
        const char* line_end;  // what the channel shows of the added line feed
    };
    for (const Case& c : {Case{2, kDiagScreenLineLimit, DiagChannel::screen, ""},
                          Case{1, kDiagDebuggerLineLimit, DiagChannel::debugger, "\n"}}) {
        SCOPED_TRACE(c.limit);
        SetUp();
        diag_set_mode(c.mode);
        const std::string just_short(c.limit - 1, 'a');
        diag_print("%s", just_short.c_str());
        EXPECT_TRUE(emitted.empty());
        diag_print("b");
        EXPECT_EQ(texts(c.channel), Lines{just_short + "b" + c.line_end});
        EXPECT_EQ(diag_line, diag_write);

        // A long text of one call is ended as a whole, not cut into pieces.
        const std::string lengthy(c.limit * 2 + 5, 'd');
        diag_print("%s", lengthy.c_str());
        EXPECT_EQ(texts(c.channel).back(), lengthy + c.line_end);
    }
}

TEST_F(DiagnosticsTest, MoveToTheStartKeepsThePendingLine)
{
    diag_set_mode(1);
    // Sixteen lines of 64 bytes leave the write position at exactly 1024.
    const std::string line = std::string(63, 'L') + "\n";
    std::string block;
    for (int i = 0; i < 16; ++i)
        block += line;
    diag_print("%s", block.c_str());
    ASSERT_EQ(diag_write - diag_text, kDiagMoveThreshold);
    ASSERT_EQ(texts(DiagChannel::debugger).size(), 16u);

    // 1024 is not past the threshold: no move yet.
    diag_print("pen");
    EXPECT_EQ(diag_line - diag_text, kDiagMoveThreshold);
    EXPECT_EQ(diag_write - diag_text, kDiagMoveThreshold + 3);

    // Now past it: "pen" goes to the start and the line is completed there.
    diag_print("ding\n");
    EXPECT_EQ(texts(DiagChannel::debugger).back(), "pending\n");
    EXPECT_EQ(diag_write - diag_text, 8);
    EXPECT_EQ(diag_line, diag_write);

    // A pending line left behind the threshold by the call itself also moves.
    diag_print("%s", (block + "tail").c_str());
    EXPECT_EQ(diag_write - diag_line, 4);
    diag_print("ed\n");
    EXPECT_EQ(texts(DiagChannel::debugger).back(), "tailed\n");
    EXPECT_EQ(diag_write - diag_text, 7);
}

TEST_F(DiagnosticsTest, ScreenPositionFillsThePageAndStartsOver)
{
    const int lines_per_page = (kDiagScreenHeight - kDiagLinePitch) / kDiagLinePitch + 1;  // 54
    EXPECT_EQ(diag_y_limit, 0);
    for (int i = 0; i < lines_per_page - 1; ++i)
        diag_screen_print("%d\n", i);
    EXPECT_EQ(diag_y_limit, kDiagScreenHeight - kDiagLinePitch);
    EXPECT_EQ(diag_y, diag_y_limit);  // the last line of the page still fits
    EXPECT_EQ(emitted.front().y, 0);
    EXPECT_EQ(emitted[1].y, kDiagLinePitch);

    diag_screen_print("last\n");
    EXPECT_EQ(emitted.back().y, diag_y_limit);
    EXPECT_EQ(diag_y, 0);
    diag_screen_print("top\n");
    EXPECT_EQ(emitted.back(), (Emitted{DiagChannel::screen, "top", 0}));
    EXPECT_EQ(diag_y, kDiagLinePitch);
}

TEST_F(DiagnosticsTest, ModesAndEmptyFormats)
{
    // Mode 0 prints at once, without gathering.
    diag_print("n=%d", 3);
    EXPECT_EQ(emitted, (std::vector<Emitted>{{DiagChannel::standard_output, "n=3", 0}}));
    EXPECT_EQ(diag_write, diag_text);

    // Empty formats print nothing in any mode, and keep the bell for later.
    emitted.clear();
    for (uint32_t mode : {0u, 1u, 2u}) {
        diag_set_mode(mode);
        diag_print("");
    }
    diag_print_once_bell("");
    EXPECT_TRUE(emitted.empty());
    EXPECT_EQ(diag_bell_count, 1);

    // Modes beyond 2 do nothing at all.
    for (uint32_t mode : {3u, 0xFFFFFFFFu}) {
        diag_set_mode(mode);
        diag_print("lost\n");
    }
    EXPECT_TRUE(emitted.empty());
    EXPECT_EQ(diag_write, diag_text);

    diag_message_box("code %d", 42);
    EXPECT_EQ(emitted, (std::vector<Emitted>{{DiagChannel::message_box, "code 42", 0}}));
}

TEST_F(DiagnosticsTest, BellRingsOnTheFirstCallOnly)
{
    diag_print_once_bell("a%c", 'b');
    diag_print_once_bell("c");
    diag_print_once_bell("d");
    EXPECT_EQ(texts(DiagChannel::standard_output), (Lines{"ab", "\a", "c", "d"}));
}

TEST_F(DiagnosticsTest, DefaultSinkWritesTheStandardStreams)
{
    diag_set_sink(nullptr);
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    diag_print("out");
    diag_print_once_bell("!");
    diag_set_mode(1);
    diag_print("debug\n");
    diag_set_mode(2);
    diag_print("screen\n");
    diag_message_box("box");
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "debug\nscreen\nMessage: box\n");
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "out!\a");
}

}  // namespace
}  // namespace lorvex
