// On every end-to-end source, example and generated source: the server
// reports exactly what qecfg-check prints, and formatting is idempotent and
// leaves the compiled image, message and status as they were.
#include <gtest/gtest.h>

#include "check_support.h"
#include "format.h"
#include "generated_sources.h"

namespace {

constexpr size_t GENERATED = 400;

// The compiler line of a document position: the source is read in pieces of
// at most 254 characters, each ending at a line end.
int compiler_line(const std::string &text, int line, int character) {
    size_t target = 0;
    for (int l = 0; l < line; l++)
        target = text.find('\n', target) + 1;
    target += size_t(character);
    int piece = 0;
    for (size_t pos = 0; pos <= target && pos < text.size(); piece++) {
        size_t nl = text.find('\n', pos);
        size_t end = std::min({nl == std::string::npos ? text.size() : nl + 1, pos + 254, text.size()});
        if (target < end)
            return piece + 1;
        pos = end;
    }
    return std::max(piece, 1);
}

// Where a range starts, as the checker prints a place: the file, and the
// compiler line unless the finding is of the whole file.
std::string place_of(const std::string &text, const json &range, bool whole_file) {
    const json &start = range["start"];
    return "input.src" +
           (whole_file ? "" : ":" + std::to_string(compiler_line(text, start["line"], start["character"])));
}

// The server's diagnostics in the checker's form, each followed by its
// related places as notes.
std::string as_checker_prints(const std::string &text, const json &diagnostics) {
    std::string out;
    for (const json &d : diagnostics) {
        out += place_of(text, d["range"], d.value(json::json_pointer("/data/wholeFile"), false)) +
               (d["severity"] == 1 ? ": error: " : ": warning: ") + d["message"].get<std::string>() +
               (d.contains("code") ? " [" + d["code"].get<std::string>() + "]" : "") + "\n";
        for (const json &note : d.value("relatedInformation", json::array()))
            out += place_of(text, note["location"]["range"], false) + ": note: " + note["message"].get<std::string>() +
                   "\n";
    }
    return out;
}

bool ascii(const std::string &text) {
    for (char c : text)
        if (static_cast<unsigned char>(c) >= 0x80)
            return false;
    return true;
}

TEST(LspAgreement, ServerAndCheckerNeverDisagree) {
    session s;
    size_t n = 0;
    for (const std::string &text : test_sources(GENERATED)) {
        if (!ascii(text)) // the test's own position mapping counts bytes
            continue;
        json diagnostics = s.open("file:///tmp/case/input.src", text);
        check_run expected = check_text(text);
        ASSERT_EQ(as_checker_prints(text, diagnostics), expected.err) << "source #" << n << ":\n" << text;
        n++;
    }
    EXPECT_GT(n, GENERATED);
}

TEST(LspAgreement, FormattingIsIdempotentAndKeepsTheImage) {
    size_t changed = 0;
    for (const std::string &text : test_sources(GENERATED)) {
        std::string formatted = lsp::format_source(text);
        EXPECT_EQ(lsp::format_source(formatted), formatted) << text;
        compile_result before = compile_text(text), after = compile_text(formatted);
        ASSERT_EQ(before.code, after.code) << text;
        ASSERT_EQ(before.message, after.message) << text;
        ASSERT_EQ(before.cdb, after.cdb) << text;
        changed += formatted != text;
    }
    EXPECT_GT(changed, GENERATED / 2); // the generated layouts do get formatted
}

} // namespace
