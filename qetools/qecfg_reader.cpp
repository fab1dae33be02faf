// The source reader: one pass over the source in pieces of at most 254
// characters, comment removal, stanza framing, and each statement checked
// against its keyword row and handed to the open builder.
#include <array>
#include <cerrno>
#include <cstdlib>
#include <vector>

#include "qecfg.h"

namespace {

constexpr size_t PIECE_MAX = QECFG_PIECE_MAX;
constexpr size_t LINE_BUFFER = PIECE_MAX + 2;

// Hands out the pieces that fgets with a 255-byte size would return, each
// NUL-terminated and writable. A piece that ends with its newline inside the
// read buffer is handed out in place (the newline becomes its terminator,
// which the comment scan would cut there anyway); others are copied.
class piece_reader {
  public:
    explicit piece_reader(FILE *fp) : fp_(fp), buf_(BUFFER_SIZE + 1) {}

    // The next piece, or null at the end of the input; a read error is
    // reported through err.
    char *next(int &err) {
        nul_ = false;
        if (pos_ == len_ && !refill(err))
            return nullptr;
        char *start = buf_.data() + pos_;
        size_t avail = std::min(len_ - pos_, PIECE_MAX);
        if (char *nl = static_cast<char *>(std::memchr(start, '\n', avail))) {
            *nl = '\0';
            advance(size_t(nl - start) + 1);
            return start;
        }
        size_t n = 0;
        while (n < PIECE_MAX) {
            if (pos_ == len_ && !refill(err))
                break;
            const char *from = buf_.data() + pos_;
            size_t take = std::min(len_ - pos_, PIECE_MAX - n);
            const void *nl = std::memchr(from, '\n', take);
            if (nl)
                take = size_t(static_cast<const char *>(nl) - from) + 1;
            std::memcpy(line_ + n, from, take);
            n += take;
            advance(take);
            if (nl)
                break;
        }
        line_[n] = '\0';
        return n > 0 && err == 0 ? line_ : nullptr;
    }

    // The last piece held a NUL byte, which would end it early.
    bool held_nul() const { return nul_; }

  private:
    static constexpr size_t BUFFER_SIZE = 1 << 16;

    bool refill(int &err) {
        pos_ = 0;
        len_ = std::fread(buf_.data(), 1, BUFFER_SIZE, fp_);
        if (len_ == 0 && std::ferror(fp_))
            err = errno ? errno : EIO;
        const void *nul = std::memchr(buf_.data(), '\0', len_);
        nul_at_ = nul ? size_t(static_cast<const char *>(nul) - buf_.data()) : len_;
        return len_ > 0;
    }

    // Moves past n bytes of the buffer, noting the NUL among them.
    void advance(size_t n) {
        nul_ = nul_ || (nul_at_ >= pos_ && nul_at_ < pos_ + n);
        pos_ += n;
    }

    FILE *fp_;
    std::vector<char> buf_;
    size_t pos_ = 0, len_ = 0;
    size_t nul_at_ = 0; // the first NUL byte of the buffer, or len_
    bool nul_ = false;
    char line_[LINE_BUFFER];
};

// Character classes of the comment scan.
enum char_class : unsigned char { ORDINARY, BLANK, NEWLINE, QUOTE, HASH, SLASH, END };

constexpr std::array<unsigned char, 256> make_classes() {
    std::array<unsigned char, 256> t{};
    t[' '] = t['\t'] = BLANK;
    t['\n'] = NEWLINE;
    t['"'] = QUOTE;
    t['#'] = HASH;
    t['/'] = SLASH;
    t['\0'] = END;
    return t;
}
constexpr std::array<unsigned char, 256> char_classes = make_classes();

} // namespace

bool strip_comments(char *line) {
    int non_blank = 0, is_comment = 0, dbl_quote = 2;
    char *p = line;
    for (;; p++) {
        switch (char_classes[static_cast<unsigned char>(*p)]) {
        case ORDINARY:
            non_blank = 1;
            while (char_classes[static_cast<unsigned char>(p[1])] == ORDINARY)
                p++;
            continue;
        case BLANK: continue;
        case QUOTE: dbl_quote++; continue;
        case HASH:
            if (non_blank == 0) {
                is_comment = 1;
                break;
            }
            if (dbl_quote % 2 == 0) {
                *p = '\0';
                break;
            }
            continue;
        case SLASH:
            if (p[1] != '/' && p[1] != '*') {
                non_blank = 1;
                continue;
            }
            if (dbl_quote % 2 == 1)
                continue;
            if (non_blank == 0)
                is_comment = 1;
            *p = '\0';
            break;
        case NEWLINE: *p = '\0'; break;
        default: break; // the end of the piece
        }
        break;
    }
    if (is_comment || non_blank == 0)
        return false;
    while (p > line && (p[-1] == ' ' || p[-1] == '\t' || p[-1] == '#'))
        *--p = '\0';
    return true;
}

namespace {

int find_stanza_type(const char *name) {
    for (int i = 0; i < NUM_STANZA_TYPES; i++)
        if (stanza_defs[i].name[0] == name[0] && std::strcmp(stanza_defs[i].name, name) == 0)
            return i;
    return -1;
}

// The required-before-optional and duplicate rules. The given rows change
// before the value is converted; a value then refused ends the compile.
void apply_row_rules(qecfg_context &c, given_rows &given, int stanza, const keyword_row &row, const char *name) {
    if (row.optional) {
        if (given.required != stanza_defs[stanza].required_mask)
            c.statement_error(msg::optional_before_required, {name});
        if ((given.optional & row.bit) && !row.repeatable)
            c.statement_error(msg::duplicate_statement, {name});
        given.optional |= row.bit;
        return;
    }
    if ((given.required & row.bit) && !row.repeatable)
        c.statement_error(msg::duplicate_statement, {name});
    given.required |= row.bit;
    if (c.opt.debugLevel > 1)
        QECFG_TRACE(c, "Added %x to mask, which is now %x\n", row.bit, given.required);
}

} // namespace

void qecfg_compiler::read_source(const char *filename) {
    source_fp = opt.source_in_memory ? open_memory_source(opt.source_text) : std::fopen(filename, "r");
    if (!source_fp) {
        int e = errno;
        raise_fatal(msg::cannot_open, 0, {filename, std::strerror(e)}, e);
    }
    piece_reader reader(source_fp);
    int err = 0;
    while (char *line = reader.next(err)) {
        linenum++;
        if (reader.held_nul())
            statement_error(msg::nul_character);
        if (!strip_comments(line))
            continue;
        if (line[0] == ' ' || line[0] == '\t')
            read_statement(line);
        else
            read_header(line);
    }
    // A read error is not the end of the input.
    if (err)
        raise_fatal(msg::cannot_read, 0, {filename, std::strerror(err)}, err);
    std::fclose(source_fp);
    source_fp = nullptr;
}

stanza_builder &qecfg_compiler::builder_of(int t) {
    switch (t) {
    case ST_CONTROL_DEFINITION:
    case ST_RESOURCE_CLASS: return cls;
    case ST_CLASS_TO_MANAGER_MAPPING: return map;
    case ST_RESOURCE_VARIABLE_CLASS: return vclass;
    case ST_CLASS_ACTION: return actions[0];
    case ST_RESOURCE_ACTION: return actions[1];
    default: return is_sd_stanza(t) ? static_cast<stanza_builder &>(sd) : attrs[t - ST_PERSISTENT_RESOURCE_ATTRIBUTE];
    }
}

// A header completes the open structured-data run and the open actions,
// then starts its own builder, which completes the open record of its kind.
// Records of other kinds stay open until the next stanza of their kind or
// the end of the source.
void qecfg_compiler::read_header(char *line) {
    int t = find_stanza_type(line);
    if (t < 0)
        statement_error(msg::invalid_stanza, {line});
    prev_stanza = stanza;
    stanza = t;
    if (is_sd_stanza(t)) {
        sd.start_stanza(t, prev_stanza);
        sd.given = given_rows{};
        return;
    }
    if (sd.pending())
        sd.complete();
    complete_open_actions();
    start_stanza(t);
    builder_of(t).given = given_rows{};
    sd.link_attribute(nullptr);
}

void qecfg_compiler::start_stanza(int t) {
    switch (t) {
    case ST_CONTROL_DEFINITION:
        if (cls.open())
            complete_class();
        cls.start();
        break;
    case ST_RESOURCE_CLASS: break; // fills the class its ControlDefinition opened
    case ST_CLASS_TO_MANAGER_MAPPING: map.start(); break;
    case ST_RESOURCE_VARIABLE_CLASS: vclass.start(); break;
    case ST_CLASS_ACTION: actions[0].start(); break;
    case ST_RESOURCE_ACTION: actions[1].start(); break;
    default: attrs[t - ST_PERSISTENT_RESOURCE_ATTRIBUTE].start(); break;
    }
}

void qecfg_compiler::complete_open_actions() {
    for (action_builder *a : {&actions[1], &actions[0]})
        if (a->open())
            a->complete();
}

void qecfg_compiler::read_statement(char *il) {
    if (stanza < 0)
        statement_error(msg::statement_before_stanza);
    const stanza_def &def = stanza_defs[stanza];
    char *name = il;
    while (*name == ' ' || *name == '\t')
        name++;
    if (!*name)
        return;
    char *eq = std::strchr(name, '=');
    if (!eq)
        statement_error(msg::missing_equals);
    *eq = '\0';
    char *value = eq + 1;
    if (std::strcmp(value, "\"\"") == 0)
        return;
    value = strip_quotes(value);
    if (!value)
        statement_error(msg::unmatched_quotes, {name});
    if (std::strlen(value) > QECFG_MAX_VALUE_LEN)
        statement_error(msg::value_too_long, {name});
    const keyword_row *row = nullptr;
    size_t name_len = size_t(eq - name);
    for (int i = 0; i < def.num_rows && !row; i++)
        if (row_name_len[stanza][i] == name_len && std::memcmp(def.rows[i].name, name, name_len) == 0)
            row = &def.rows[i];
    if (!row)
        statement_error(msg::unknown_keyword, {name, def.name});
    if (!*value) {
        QECFG_TRACE(*this, "In file %s: ", opt.cdefsrc.c_str());
        statement_error(msg::missing_value, {name});
    }
    if (opt.debugLevel > 1)
        QECFG_TRACE(*this, "%s: found attr: \"%s\", value: \"%s\",length: %d\n", def.name, name, value,
                    int(std::strlen(value)));
    stanza_builder &b = builder_of(stanza);
    apply_row_rules(*this, b.given, stanza, *row, name);
    b.store_statement(*row, value);
    // A structured attribute owns the definition of the run that follows.
    if (row->what == statement::data_type) {
        attr_builder &a = attrs[stanza - ST_PERSISTENT_RESOURCE_ATTRIBUTE];
        if (zu_is_sd_type(a.data_type()))
            sd.link_attribute(&a);
    }
}
