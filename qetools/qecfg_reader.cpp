// The source reader: one pass over the source in pieces of at most 254
// characters, comment removal, stanza framing and dispatch of statements.
#include <cerrno>
#include <vector>

#include "qecfg.h"

namespace {

constexpr size_t LINE_BUFFER = 256;
constexpr size_t PIECE_MAX = 254; // what one read of LINE_BUFFER - 1 takes

// Reads the pieces that fgets with a 255-byte size would return.
class piece_reader {
  public:
    explicit piece_reader(FILE *fp) : fp_(fp), buf_(1 << 16) {}

    // Fills out (LINE_BUFFER bytes) with the next piece; false at the end of
    // the input. A read error is reported through err.
    bool next(char *out, int &err) {
        size_t n = 0;
        while (n < PIECE_MAX) {
            if (pos_ == len_ && !refill(err))
                break;
            const char *start = buf_.data() + pos_;
            size_t avail = std::min(len_ - pos_, PIECE_MAX - n);
            const void *nl = std::memchr(start, '\n', avail);
            size_t take = nl ? size_t(static_cast<const char *>(nl) - start) + 1 : avail;
            std::memcpy(out + n, start, take);
            n += take;
            pos_ += take;
            if (nl)
                break;
        }
        out[n] = '\0';
        return n > 0 && err == 0;
    }

  private:
    bool refill(int &err) {
        pos_ = 0;
        len_ = std::fread(buf_.data(), 1, buf_.size(), fp_);
        if (len_ == 0 && std::ferror(fp_))
            err = errno ? errno : EIO;
        return len_ > 0;
    }

    FILE *fp_;
    std::vector<char> buf_;
    size_t pos_ = 0, len_ = 0;
};

// Cuts comments and the newline off a piece; false when nothing is left to
// process (a comment line or a line of blanks, tabs and quotes).
bool strip_comments(char *line) {
    int non_blank = 0, is_comment = 0, dbl_quote = 2;
    for (char *p = line; *p; p++) {
        char c = *p;
        if (c == ' ' || c == '\t')
            continue;
        if (c == '\n') {
            *p = '\0';
            break;
        }
        if (c == '"') {
            dbl_quote++;
            continue;
        }
        bool in_quotes = dbl_quote % 2 == 1;
        if (c == '#') {
            if (non_blank == 0) {
                is_comment++;
                break;
            }
            if (!in_quotes) {
                *p = '\0';
                break;
            }
            non_blank++;
            continue;
        }
        if (c == '/' && (p[1] == '/' || p[1] == '*')) {
            if (in_quotes)
                continue;
            if (non_blank == 0)
                is_comment++;
            *p = '\0';
            break;
        }
        non_blank++;
    }
    if (is_comment || non_blank == 0)
        return false;
    size_t n = std::strlen(line);
    while (n > 0 && (line[n - 1] == ' ' || line[n - 1] == '\t' || line[n - 1] == '#'))
        line[--n] = '\0';
    return true;
}

} // namespace

int qecfg_compiler::set_table_id(const char *name) const {
    for (int i = 0; sc_tables[i].sc_name; i++)
        if (std::strcmp(sc_tables[i].sc_name, name) == 0)
            return i;
    return -1;
}

bool qecfg_compiler::is_SD_stanza(int table_id) {
    return table_id >= 0 && table_id < NUM_STANZA_TYPES && std::strstr(stanza_defs[table_id].name, "SDDefinition");
}

bool qecfg_compiler::is_attr_SD(int table_id) {
    return table_id >= 0 && table_id < NUM_STANZA_TYPES &&
           std::strstr(stanza_defs[table_id].name, "AttrSDDefinition");
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
    cdb_fp = std::fopen(filename, "r");
    if (!cdb_fp) {
        int e = errno;
        qecfg_error_exit_rtn(filename, ": cannot open because: ", std::strerror(e), 0, e);
    }
    piece_reader reader(cdb_fp);
    char line[LINE_BUFFER];
    int table_id = -1;
    int err = 0;
    while (reader.next(line, err)) {
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
    scp->dflt = dflt_tbl{};
    attr_dflt_val = max_sd_idx = nullptr;
    curr_sd_tbl = nullptr;
}

void qecfg_compiler::complete_open_actions() {
    if (cb_rsrc_action.ac_cb_ID)
        cmplt_action_tbl();
    if (cb_rsrc_actionC.ac_cb_ID)
        cmplt_actionC_tbl();
}
