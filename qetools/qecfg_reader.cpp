// The source reader: one pass over the source in pieces of at most 254
// characters, comment removal, and each header and statement matched with
// its stanza type and keyword row, with its position.
#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <vector>

#include "qecfg_context.h"
#include "qecfg_fatal.h"
#include "qecfg_source.h"
#include "qecfg_value.h"

namespace {
constexpr size_t PIECE_MAX = QECFG_PIECE_MAX;
constexpr size_t LINE_BUFFER = PIECE_MAX + 2;
// No value can be too long (value_too_long is never raised) while a piece is
// shorter than the longest value.
static_assert(PIECE_MAX < QECFG_MAX_VALUE_LEN);
} // namespace

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
        start_ = taken_;
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
    // Where the last piece starts in the input.
    uint64_t start() const { return start_; }

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
        taken_ += n;
    }

    FILE *fp_;
    std::vector<char> buf_;
    size_t pos_ = 0, len_ = 0;
    size_t nul_at_ = 0; // the first NUL byte of the buffer, or len_
    bool nul_ = false;
    uint64_t taken_ = 0, start_ = 0; // bytes of the input handed out; where the last piece starts
    char line_[LINE_BUFFER];
};

namespace {

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

int find_stanza_type(const char *name) {
    for (int i = 0; i < NUM_STANZA_TYPES; i++)
        if (stanza_defs[i].name[0] == name[0] && std::strcmp(stanza_defs[i].name, name) == 0)
            return i;
    return -1;
}

namespace {

// The keyword row of a stanza type, compared by length first.
const keyword_row *find_row(int stanza, const char *name, size_t len) {
    static const auto lengths = [] {
        std::array<std::array<size_t, MAX_ROWS_PER_STANZA>, NUM_STANZA_TYPES> l{};
        for (int i = 0; i < NUM_STANZA_TYPES; i++)
            for (int r = 0; r < stanza_defs[i].num_rows; r++)
                l[i][r] = std::strlen(stanza_defs[i].rows[r].name);
        return l;
    }();
    const stanza_def &def = stanza_defs[stanza];
    for (int i = 0; i < def.num_rows; i++)
        if (lengths[stanza][i] == len && std::memcmp(def.rows[i].name, name, len) == 0)
            return &def.rows[i];
    return nullptr;
}

uint32_t column(const char *piece, const char *at) { return uint32_t(at - piece); }

} // namespace

source_reader::source_reader(FILE *fp, uint64_t lines_before)
    : pieces_(std::make_unique<piece_reader>(fp)), line_(lines_before) {}

source_reader::~source_reader() = default;

bool source_reader::next(source_line &out) {
    if (stop_.id != msg::none)
        return false;
    int err = 0;
    while (char *piece = pieces_->next(err)) {
        line_++;
        if (pieces_->held_nul()) {
            stop_ = source_stop{msg::nul_character, line_, 0};
            return false;
        }
        if (!strip_comments(piece))
            continue;
        if (piece[0] == ' ' || piece[0] == '\t') {
            read_statement(piece, out);
            out.offset = pieces_->start();
            return true;
        }
        out = source_line{};
        out.header = true;
        out.line = line_;
        out.name = piece;
        out.name_length = out.end_column = uint32_t(std::strlen(piece));
        out.offset = pieces_->start();
        out.stanza = stanza_ = find_stanza_type(piece);
        headed_ = true;
        return true;
    }
    // A read error is not the end of the input.
    if (err)
        stop_ = source_stop{msg::cannot_read, 0, err};
    return false;
}

// The checks are made in the order in which the compiler reports them.
void source_reader::read_statement(char *piece, source_line &out) const {
    out = source_line{};
    out.line = line_;
    out.stanza = stanza_;
    char *name = piece + std::strspn(piece, " \t");
    out.name = name;
    out.name_column = column(piece, name);
    out.end_column = out.name_column + uint32_t(std::strlen(name));
    char *eq = std::strchr(name, '=');
    out.name_length = uint32_t(eq ? eq - name : std::strlen(name));
    if (!headed_) {
        out.problem = msg::statement_before_stanza;
        return;
    }
    if (!eq) {
        out.problem = msg::missing_equals;
        return;
    }
    *eq = '\0';
    char *value = eq + 1;
    out.value = value;
    out.value_column = column(piece, value);
    if (std::strcmp(value, "\"\"") == 0) {
        out.skipped = true;
        out.row = stanza_ >= 0 ? find_row(stanza_, name, out.name_length) : nullptr;
        return;
    }
    value = strip_quotes(value);
    if (!value) {
        out.value_length = uint32_t(std::strlen(out.value)); // kept as written
        out.problem = msg::unmatched_quotes;
        return;
    }
    out.value = value;
    out.value_column = column(piece, value);
    out.value_length = uint32_t(std::strlen(value));
    if (stanza_ >= 0)
        out.row = find_row(stanza_, name, out.name_length);
}

source_model read_source_model(std::string_view text) {
    source_model m;
    FILE *fp = open_memory_source(text);
    if (!fp) {
        m.stop = source_stop{msg::cannot_read, 0, errno};
        return m;
    }
    source_reader reader(fp);
    source_line l;
    while (reader.next(l)) {
        if (l.header || m.stanzas.empty())
            m.stanzas.push_back(model_stanza{});
        model_stanza &st = m.stanzas.back();
        if (l.header) {
            st = model_stanza{l.line, l.stanza, l.name, {}};
            continue;
        }
        st.statements.push_back(model_statement{l.line, std::string(l.name, l.name_length),
                                                l.value ? std::string(l.value, l.value_length) : std::string(),
                                                l.name_column, l.value_column, l.skipped, l.row, l.problem});
    }
    std::fclose(fp);
    m.last_line = reader.last_line();
    m.stop = reader.stop();
    return m;
}

source_end read_source_lines(std::string_view text, const std::function<void(const source_line &)> &each) {
    FILE *fp = open_memory_source(text);
    if (!fp)
        return {0, source_stop{msg::cannot_read, 0, errno}};
    source_reader reader(fp);
    source_line l;
    while (reader.next(l))
        each(l);
    std::fclose(fp);
    return {reader.last_line(), reader.stop()};
}
