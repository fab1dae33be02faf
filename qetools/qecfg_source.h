// The source as a positioned model: its headers and statements with their
// lines and columns, the stanza type and keyword row each one matched, and
// the value text. The reader yields one line at a time, so the compiler
// holds nothing of the source but the line it is at; read_source_model
// collects the lines of a whole source into stanzas for the tools. What is
// wrong with a line is data of the line, raised by whoever reaches it.
//
// Lines are pieces of at most 254 characters (a longer physical line is read
// as several, each counted); columns are 0-based byte positions in a piece.
#ifndef QECFG_SOURCE_H
#define QECFG_SOURCE_H

#include <cstdint>
#include <cstdio>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "qecfg/messages.h"
#include "qecfg_keywords.h"

// A header or a statement. Its texts are NUL-terminated in the reader's
// buffer, valid until the next line is read; a value may be changed in
// place by whoever converts it.
struct source_line {
    bool header = false;
    uint64_t line = 0;
    int stanza = -1; // the header's stanza type, or the type of the statement's stanza; -1 for none
    // A header: its text. A statement: its keyword, or the whole text when
    // it has no '='.
    char *name = nullptr;
    char *value = nullptr; // a statement's value, without its quotes
    uint32_t name_column = 0, name_length = 0;
    uint32_t value_column = 0, value_length = 0;
    uint32_t end_column = 0;          // where the text of the header or statement ends, its comment cut off
    uint64_t offset = 0;              // where the piece starts in the source, in bytes
    bool skipped = false;             // the value is exactly "": nothing is stored
    const keyword_row *row = nullptr; // null when the stanza type has no such keyword
    // What is wrong with a statement as read: statement_before_stanza,
    // missing_equals, unmatched_quotes, or none.
    qecfg::message_id problem = qecfg::message_id::none;
};

// Why reading ended before the end of the source: a NUL byte (nul_character
// on its line) or a read error (cannot_read with the error number).
struct source_stop {
    qecfg::message_id id = qecfg::message_id::none;
    uint64_t line = 0;
    int err = 0;
};

class piece_reader;

class source_reader {
  public:
    // lines_before: the count of lines to start from.
    explicit source_reader(FILE *fp, uint64_t lines_before = 0);
    ~source_reader();
    source_reader(const source_reader &) = delete;
    source_reader &operator=(const source_reader &) = delete;

    // The next header or statement; false at the end of the source or where
    // reading stopped (see stop()).
    bool next(source_line &out);
    uint64_t last_line() const { return line_; } // lines read so far, comments included
    const source_stop &stop() const { return stop_; }

  private:
    void read_statement(char *piece, source_line &out) const;
    std::unique_ptr<piece_reader> pieces_;
    uint64_t line_;
    int stanza_ = -1;
    bool headed_ = false; // a header has been read
    source_stop stop_;
};

// A whole source, collected for the tools that look at it at once.
struct model_statement {
    uint64_t line = 0;
    std::string name, value;
    uint32_t name_column = 0, value_column = 0;
    bool skipped = false;
    const keyword_row *row = nullptr;
    qecfg::message_id problem = qecfg::message_id::none;
};

struct model_stanza {
    uint64_t line = 0; // of the header; 0 for statements before the first header
    int type = -1;
    std::string header;
    std::vector<model_statement> statements;
};

struct source_model {
    std::vector<model_stanza> stanzas;
    uint64_t last_line = 0;
    source_stop stop;
};

source_model read_source_model(std::string_view text);

// Reads a source held in memory line by line for a tool that keeps its own
// model: each header and statement goes to `each`. Returns what
// read_source_model returns beside the stanzas.
struct source_end {
    uint64_t last_line = 0;
    source_stop stop;
};
source_end read_source_lines(std::string_view text, const std::function<void(const source_line &)> &each);

// Cuts comments and the newline off a piece of a source line; false when
// nothing is left to process (a comment line or a line of blanks, tabs and
// quotes).
bool strip_comments(char *line);

// The stanza type a header names; -1 for none.
int find_stanza_type(const char *name);

#endif
