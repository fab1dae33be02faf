// The source reader: one pass over the source in pieces of at most 254
// characters, comment removal, stanza framing and dispatch of statements.
#include <array>
#include <cerrno>
#include <cstdlib>
#include <vector>

#include "qecfg.h"

namespace {

constexpr size_t LINE_BUFFER = 256;
constexpr size_t PIECE_MAX = 254; // what one read of LINE_BUFFER - 1 takes

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
        if (pos_ == len_ && !refill(err))
            return nullptr;
        char *start = buf_.data() + pos_;
        size_t avail = std::min(len_ - pos_, PIECE_MAX);
        if (char *nl = static_cast<char *>(std::memchr(start, '\n', avail))) {
            *nl = '\0';
            pos_ += size_t(nl - start) + 1;
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
            pos_ += take;
            if (nl)
                break;
        }
        line_[n] = '\0';
        return n > 0 && err == 0 ? line_ : nullptr;
    }

  private:
    static constexpr size_t BUFFER_SIZE = 1 << 16;

    bool refill(int &err) {
        pos_ = 0;
        len_ = std::fread(buf_.data(), 1, BUFFER_SIZE, fp_);
        if (len_ == 0 && std::ferror(fp_))
            err = errno ? errno : EIO;
        return len_ > 0;
    }

    FILE *fp_;
    std::vector<char> buf_;
    size_t pos_ = 0, len_ = 0;
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

int qecfg_compiler::set_table_id(const char *name) const {
    for (int i = 0; sc_tables[i].sc_name; i++)
        if (sc_tables[i].sc_name[0] == name[0] && std::strcmp(sc_tables[i].sc_name, name) == 0)
            return i;
    return -1;
}

namespace {

// Which stanza types are structured-data ones, and of those which belong to
// attributes, by the names of the types.
struct stanza_kinds {
    bool sd[NUM_STANZA_TYPES] = {}, attr_sd[NUM_STANZA_TYPES] = {};
    stanza_kinds() {
        for (int i = 0; i < NUM_STANZA_TYPES; i++) {
            sd[i] = std::strstr(stanza_defs[i].name, "SDDefinition") != nullptr;
            attr_sd[i] = std::strstr(stanza_defs[i].name, "AttrSDDefinition") != nullptr;
        }
    }
};
const stanza_kinds kinds_of_stanzas;

} // namespace

bool qecfg_compiler::is_SD_stanza(int table_id) {
    return table_id >= 0 && table_id < NUM_STANZA_TYPES && kinds_of_stanzas.sd[table_id];
}

bool qecfg_compiler::is_attr_SD(int table_id) {
    return table_id >= 0 && table_id < NUM_STANZA_TYPES && kinds_of_stanzas.attr_sd[table_id];
}

sd_type_t qecfg_compiler::SD_stanza_type(int table_id) {
    switch (table_id) {
    case ST_ONLINE_SD: return SD_TYPE_ONLINE;
    case ST_OFFLINE_SD: return SD_TYPE_OFFLINE;
    case ST_DEFINE_SD: return SD_TYPE_DEFINE;
    case ST_UNDEFINE_SD: return SD_TYPE_UNDEFINE;
    case ST_RESET_SD: return SD_TYPE_RESET;
    case ST_ACTION_IN_SD: return SD_TYPE_ACT_IN;
    case ST_ACTION_OUT_SD: return SD_TYPE_ACT_RESP;
    case ST_PATTR_SD: return SD_TYPE_PATTR;
    case ST_DATTR_SD: return SD_TYPE_DATTR;
    default: return SD_TYPE_UNKNOWN;
    }
}

void qecfg_compiler::cache_input_data(const char *filename) {
    cdb_fp = opt.source_in_memory ? open_memory_source(opt.source_text) : std::fopen(filename, "r");
    if (!cdb_fp) {
        int e = errno;
        qecfg_error_exit_rtn(filename, ": cannot open because: ", std::strerror(e), 0, e);
    }
    piece_reader reader(cdb_fp);
    int table_id = -1;
    int err = 0;
    while (char *line = reader.next(err)) {
        linenum++;
        if (!strip_comments(line))
            continue;
        if (line[0] == ' ' || line[0] == '\t') {
            if (table_id < 0)
                statement_error("Attribute found but no table defined yet");
            save_attr(line, table_id);
            continue;
        }
        handle_header(line, table_id);
    }
    // A read error is not the end of the input.
    if (err)
        qecfg_error_exit_rtn(filename, ": cannot read because: ", std::strerror(err), 0, err);
    std::fclose(cdb_fp);
    cdb_fp = nullptr;
}

void qecfg_compiler::handle_header(char *line, int &table_id) {
    table_id = set_table_id(line);
    if (table_id < 0)
        statement_error("Invalid table name: ", line);
    prev_scp = scp;
    scp = &sc_tables[table_id];
    curr_sd_scp = scp;
    if (is_SD_stanza(table_id)) {
        start_sd_header(table_id);
        return;
    }
    if (cb_sd_def.sd_cb_ID)
        cmplt_sd_tbl(prev_scp);
    complete_open_actions();
    (this->*scp->sc_init_tbl)();
    scp->req_mask = scp->opt_mask = 0;
    drop_dflt(scp->dflt);
    attr_dflt_val = max_sd_idx = nullptr;
    curr_sd_tbl = nullptr;
}

// Empties a stanza's default list. A list of default values belongs to its
// stanza alone and is spent once the record is completed, so its table is
// kept for reuse; the element type lists of structured attributes are shared
// with the structured-data stanzas and are left alone.
void qecfg_compiler::drop_dflt(dflt_tbl &d) {
    if (d.tbl && d.tbl->tbl_name == DEFAULT_VALUES_TBL) {
        std::free(d.tbl->tbl_base);
        *d.tbl = tbl{};
        free_tbls.push_back(d.tbl);
    }
    d = dflt_tbl{};
}

void qecfg_compiler::complete_open_actions() {
    if (cb_rsrc_action.ac_cb_ID)
        cmplt_action_tbl();
    if (cb_rsrc_actionC.ac_cb_ID)
        cmplt_actionC_tbl();
}
