// The scanner on its own: token kinds, texts, values and line counting.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "recorder.h"
#include "vrx_scan.h"

namespace {

std::string render(VX_TOKEN t) {
    static const char* const kNames[] = {
        "END",        "DESIGN",    "BLOCK",   "PHYSBLOCK", "PRIM", "PHYSPRIM", "PIN", "SIGNAL",
        "PHYSSIGNAL", "MAPSIGNAL", "MAPCONN", "=",         "(",    ")",        "{",   "}"};
    if (t == VX_TOK_NUMBER) return "#" + std::to_string(token_value.number);
    if (t == VX_TOK_STRING) return "'" + std::string(token_value.text, token_value.length) + "'";
    return kNames[t];
}

struct Scanned {
    std::vector<std::string> tokens;  // then "@line" of the end of input
    std::vector<std::string> events;  // messages
};

Scanned scan(const std::string& text) {
    ParseLog log;
    TextInput input(text);
    vrx_parse_init();
    Scanned out;
    for (VX_TOKEN t; (t = vrx_next_token()) != VX_TOK_END;)
        out.tokens.push_back(render(t));
    out.tokens.push_back("@" + std::to_string(line_number));
    out.events = log.events;
    return out;
}

using Tokens = std::vector<std::string>;

template <std::size_t N>
std::string bytes(const char (&s)[N]) {
    return std::string(s, N - 1);
}

TEST(Scanner, KeywordsAreCaseSensitiveWholeWords) {
    EXPECT_EQ(
        scan("DESIGN BLOCK PHYSBLOCK PRIM PHYSPRIM PIN SIGNAL PHYSSIGNAL MAPSIGNAL MAPCONN").tokens,
        (Tokens{"DESIGN", "BLOCK", "PHYSBLOCK", "PRIM", "PHYSPRIM", "PIN", "SIGNAL", "PHYSSIGNAL",
                "MAPSIGNAL", "MAPCONN", "@1"}));
    EXPECT_EQ(
        scan("GLOBAL block BLOCKS PINS Block PIN1 XPIN").tokens,
        (Tokens{"'GLOBAL'", "'block'", "'BLOCKS'", "'PINS'", "'Block'", "'PIN1'", "'XPIN'", "@1"}));
    EXPECT_EQ(scan("PIN(A) A=B P=@x{BLOCK}\"PIN\"").tokens,
              (Tokens{"PIN", "(", "'A'", ")", "'A'", "=", "'B'", "'P'", "=", "'@x'", "{", "BLOCK",
                      "}", "'PIN'", "@1"}));
}

TEST(Scanner, KeywordsAgainstWordsThatDifferInOneByte) {
    // The last byte, a byte past the eighth, one byte more or less.
    EXPECT_EQ(scan("PIX PRIN BLOCX DESIGM SIGNAM MAPCONM PHYSPRIN PHYSBLOCX MAPSIGNAM "
                   "PHYSSIGNAM PHYSBLXCK MAPSIXNAL PHYSSIXNAL")
                  .tokens,
              (Tokens{"'PIX'", "'PRIN'", "'BLOCX'", "'DESIGM'", "'SIGNAM'", "'MAPCONM'",
                      "'PHYSPRIN'", "'PHYSBLOCX'", "'MAPSIGNAM'", "'PHYSSIGNAM'", "'PHYSBLXCK'",
                      "'MAPSIXNAL'", "'PHYSSIXNAL'", "@1"}));
    EXPECT_EQ(scan("PI PHYSSIGNA PHYSSIGNALS MAPSIGNALS DESIGNS	PHYS P").tokens,
              (Tokens{"'PI'", "'PHYSSIGNA'", "'PHYSSIGNALS'", "'MAPSIGNALS'", "'DESIGNS'", "'PHYS'",
                      "'P'", "@1"}));
}

TEST(Scanner, TokensAndLineEndsAcrossTheEndOfARead) {
    // Each token ends at every offset around the end of the first read of the
    // stream (8192 bytes), in LF and in CRLF text.
    const Tokens expected = {"PHYSSIGNAL", "'PHYSSIGNA'", "#12", "(", "'n4'", ")", "'x'", "@4"};
    for (const std::string eol : {"\n", "\r\n"}) {
        for (std::size_t before = 8150; before <= 8192; ++before) {
            const std::string text = std::string(before, ' ') + "PHYSSIGNAL PHYSSIGNA" + eol +
                                     "12" + eol + "(n4)" + eol + "x";
            EXPECT_EQ(scan(text).tokens, expected) << before;
        }
    }
}

TEST(Scanner, WordsEndOnlyAtBlanksLineEndsQuotesAndSeparators) {
    EXPECT_EQ(scan("a//b -5 1.5 12ab @x /tmp a.b/c x//y $a:b[0];<>!#,").tokens,
              (Tokens{"'a//b'", "'-5'", "'1.5'", "'12ab'", "'@x'", "'/tmp'", "'a.b/c'", "'x//y'",
                      "'$a:b[0];<>!#,'", "@1"}));
    EXPECT_EQ(scan("a\"b c\"d").tokens, (Tokens{"'a'", "'b c'", "'d'", "@1"}));
    EXPECT_EQ(scan("\xc3\xa9t\xc3\xa9 \x01\x7f").tokens,
              (Tokens{"'\xc3\xa9t\xc3\xa9'", "'\x01\x7f'", "@1"}));
}

TEST(Scanner, NumbersAndDigitRunsAboveTheIntRange) {
    EXPECT_EQ(scan("007 0 2147483647 2147483648 00000000000000000000042 99999999999 12(").tokens,
              (Tokens{"#7", "#0", "#2147483647", "'2147483648'", "#42", "'99999999999'", "#12", "(",
                      "@1"}));
    // Ended by a line end, a lone CR, a quote; nine and ten digits.
    EXPECT_EQ(scan("5\r\n6\n7\rx 8\"q\" 999999999=1000000000").tokens,
              (Tokens{"#5", "#6", "'7\rx'", "#8", "'q'", "#999999999", "=", "#1000000000", "@3"}));
}

TEST(Scanner, CommentsStartOnlyWhereATokenStarts) {
    EXPECT_EQ(scan("x //y\nz").tokens, (Tokens{"'x'", "'z'", "@2"}));
    EXPECT_EQ(scan("(//c ) \" x\n)//").tokens, (Tokens{"(", ")", "@2"}));
    EXPECT_EQ(scan("// VRX netlist\n// top design: t\nDESIGN").tokens, (Tokens{"DESIGN", "@3"}));
    EXPECT_EQ(scan("  // only\n\t// comments").tokens, (Tokens{"@2"}));
    EXPECT_EQ(scan("").tokens, (Tokens{"@1"}));
    EXPECT_EQ(scan("/").tokens, (Tokens{"'/'", "@1"}));
}

TEST(Scanner, QuotedStringsKeepEverythingButTheirQuotes) {
    EXPECT_EQ(scan("\"a (b) = {c} //d\" \"\" \"BLOCK\" \"12\"").tokens,
              (Tokens{"'a (b) = {c} //d'", "''", "'BLOCK'", "'12'", "@1"}));
    // Line feeds inside count, and the token after shows the new line.
    const Scanned s = scan("\"x\ny\n\" z");
    EXPECT_EQ(s.tokens, (Tokens{"'x\ny\n'", "'z'", "@3"}));
}

TEST(Scanner, UnclosedQuoteIsAWarningOnItsLineAndTheRestIsScanned) {
    testing::internal::CaptureStdout();
    const Scanned s = scan("A\n \"B (\nC");
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
    EXPECT_EQ(s.tokens, (Tokens{"'A'", "'B'", "(", "'C'", "@3"}));
    EXPECT_EQ(s.events, Tokens{"WARNING: Line number 2: unclosed quote skipped\n"});
}

TEST(Scanner, CarriageReturnBeforeLineFeedIsDropped) {
    EXPECT_EQ(scan("BLOCK x\r\n\"a\r\nb\"\r\n").tokens, (Tokens{"BLOCK", "'x'", "'a\nb'", "@4"}));
    // A lone carriage return is a word byte, also at the very end of input.
    EXPECT_EQ(scan("a\rb \r\r\n x\r").tokens, (Tokens{"'a\rb'", "'\r'", "'x\r'", "@2"}));
    // A pair split across two reads of the stream.
    std::string text(8191, ' ');
    text += "\r\nw";
    EXPECT_EQ(scan(text).tokens, (Tokens{"'w'", "@2"}));
    text = std::string(8191, ' ') + "\rw";
    EXPECT_EQ(scan(text).tokens, (Tokens{"'\rw'", "@1"}));
}

TEST(Scanner, LengthLimits) {
    const std::string w1024(1024, 'w');
    const std::string q1022(1022, 'q');
    EXPECT_EQ(scan(w1024 + " \"" + q1022 + "\"").tokens,
              (Tokens{"'" + w1024 + "'", "'" + q1022 + "'", "@1"}));

    const char* const kTooLong = "ERROR: Line number 1: maximum string length exceeded\n";
    Scanned s = scan(w1024 + "w x");
    EXPECT_EQ(s.tokens, (Tokens{"''", "'x'", "@1"}));
    EXPECT_EQ(s.events, (Tokens{kTooLong}));

    s = scan(std::string(1025, '7') + " 8");
    EXPECT_EQ(s.tokens, (Tokens{"''", "#8", "@1"}));
    EXPECT_EQ(s.events, (Tokens{kTooLong}));

    // The over-long quoted string's line feeds still count, before the report.
    s = scan("\"" + q1022 + "\n\" y");
    EXPECT_EQ(s.tokens, (Tokens{"''", "'y'", "@2"}));
    EXPECT_EQ(s.events, (Tokens{"ERROR: Line number 2: maximum string length exceeded\n"}));

    // Much longer than the buffer: consumed whole and never split.
    s = scan("a " + std::string(100000, 'w') + " \"" + std::string(100000, 'q') + "\" b");
    EXPECT_EQ(s.tokens, (Tokens{"'a'", "''", "''", "'b'", "@1"}));
    EXPECT_EQ(s.events, (Tokens{kTooLong, kTooLong}));
}

TEST(Scanner, TokensAcrossManyBufferRefills) {
    std::string text;
    Tokens expected;
    for (int i = 0; text.size() < 200000; ++i) {
        const std::string word = std::string(1 + i % 700, 'a' + i % 26) + std::to_string(i);
        switch (i % 4) {
            case 0:
                text += word + " ";
                expected.push_back("'" + word + "'");
                break;
            case 1:
                text += "\"" + word + "\n\"";
                expected.push_back("'" + word + "\n'");
                break;
            case 2:
                text += std::to_string(i) + "(";
                expected.push_back("#" + std::to_string(i));
                expected.push_back("(");
                break;
            default:
                text += "//" + word + "\r\n";
                break;
        }
    }
    const auto lines = std::count(text.begin(), text.end(), '\n');
    expected.push_back("@" + std::to_string(1 + lines));
    EXPECT_EQ(scan(text).tokens, expected);
}

TEST(Scanner, NulBytesAreReportedAndSkipped) {
    const Scanned s = scan(bytes("a\0b //\0c\n\0"));
    EXPECT_EQ(s.tokens, (Tokens{"'a'", "'b'", "@2"}));
    EXPECT_EQ(s.events, (Tokens{"ERROR: Line number 1: invalid NUL byte in input\n",
                                "ERROR: Line number 2: invalid NUL byte in input\n"}));
    // A quoted string cannot hold one: the quote counts as unclosed.
    const Scanned q = scan(bytes("\"x\0y\""));
    EXPECT_EQ(q.tokens, (Tokens{"'x'", "'y'", "@1"}));
    EXPECT_EQ(q.events, (Tokens{"WARNING: Line number 1: unclosed quote skipped\n",
                                "ERROR: Line number 1: invalid NUL byte in input\n",
                                "WARNING: Line number 1: unclosed quote skipped\n"}));
}

}  // namespace
