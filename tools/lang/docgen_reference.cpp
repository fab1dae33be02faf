// The generated tables of the language reference and their insertion into
// the hand-written text around them.
#include <sstream>
#include <vector>

#include "docgen.h"
#include "lang.h"
#include "qecfg/messages.h"

namespace docgen {

namespace {

const char *value_text(const lang::statement_row &r) {
    using lang::value_kind;
    switch (r.kind) {
    case value_kind::integer: return "number (message id, key or count), at most 65535";
    case value_kind::identifier: return "number, 32 bits";
    case value_kind::text: return "text";
    case value_kind::properties: return "comma list of property words (below)";
    case value_kind::version: return "version `a.b.c.d`, each part 0 to 255";
    case value_kind::perm_template: return "any text (the compiler stores a fixed template)";
    case value_kind::manager: return "resource manager name";
    case value_kind::locator: return "name of a PersistentResourceAttribute of the class";
    case value_kind::variety: return "`low,high` numbers";
    case value_kind::valid_value: return "value, or `low,high`, of the data type";
    case value_kind::default_value: return "value of the data type (one element per statement for an array)";
    case value_kind::initial_value: return "value of the data type (one element for an array)";
    case value_kind::display_name: return "message id of the valid value given last";
    case value_kind::data_type: return "data type name";
    case value_kind::element_type: return "data type name, not `SD` or `SDArray`";
    case value_kind::variable_type: return "variable type name";
    case value_kind::range: return "`low,high` of the data type";
    case value_kind::element_index: return "0 for the first element, then 1, 2, ...";
    case value_kind::element_name: return "text";
    case value_kind::refused: return "refused: not supported";
    case value_kind::ignored: return "any text, ignored";
    case value_kind::permission: return "one permission letter (below)";
    }
    return "";
}

std::string stanza_table(const lang::stanza_type &s) {
    std::ostringstream o;
    o << "| Statement | Required | Repeatable | Value |\n|---|---|---|---|\n";
    for (bool optional : {false, true})
        for (const lang::statement_row &r : s.rows)
            if (r.optional == optional)
                o << "| `" << r.name << "` | " << (optional ? "optional" : "required") << " | "
                  << (r.repeatable ? "yes" : "no") << " | " << value_text(r) << " |\n";
    if (!s.optional_accepted)
        o << "\nThe compiler accepts none of the optional statements in this stanza: each is refused as "
             "coming before all required ones.\n";
    return o.str();
}

std::string property_words() {
    std::ostringstream o;
    o << "| Stanza | Property words |\n|---|---|\n";
    for (const lang::property_table &t : lang::property_tables()) {
        o << "| " << t.owner << " |";
        for (int i = 0; i < t.count; i++)
            o << (i ? ", " : " ") << '`' << t.words[i].s << '`';
        o << " |\n";
    }
    return o.str();
}

std::string word_list(const std::vector<std::string> &words) {
    std::string s;
    for (const std::string &w : words)
        s += (s.empty() ? "`" : ", `") + w + "`";
    return s + "\n";
}

// A message text as the reference writes it: its fixed parts quoted, each
// subject as NAME.
std::string message_pattern(const std::string &text) {
    std::string out;
    for (size_t from = 0;;) {
        size_t to = text.find("%s", from);
        std::string part = text.substr(from, to == std::string::npos ? std::string::npos : to - from);
        if (!part.empty())
            out += (out.empty() ? "`" : " `") + part + "`";
        if (to == std::string::npos)
            return out;
        out += " NAME";
        from = to + 2;
    }
}

// The messages that the language has and this build never raises, one row
// per reason, from the table of messages: the reference cannot give them a
// cause.
std::string unraised_messages() {
    std::vector<std::pair<std::string, std::string>> rows; // reason, messages
    for (const qecfg::message_row &m : qecfg::messages()) {
        if (!m.unraised)
            continue;
        if (rows.empty() || rows.back().first != m.unraised)
            rows.emplace_back(m.unraised, "");
        std::string &messages = rows.back().second;
        messages += (messages.empty() ? "" : ", ") + message_pattern(m.text);
    }
    std::ostringstream o;
    o << "| Message | Why this build never raises it |\n|---|---|\n";
    for (const auto &[reason, messages] : rows)
        o << "| " << messages << " | " << reason << " |\n";
    return o.str();
}

} // namespace

std::map<std::string, std::string> reference_blocks() {
    std::map<std::string, std::string> b;
    for (const lang::stanza_type &s : lang::stanza_types())
        b["stanza " + s.name] = stanza_table(s);
    b["properties"] = property_words();
    std::vector<std::string> letters;
    for (char c : lang::permission_letters())
        letters.emplace_back(1, c);
    b["permissions"] = word_list(letters);
    b["variable-types"] = word_list(lang::variable_type_names());
    b["data-types"] = word_list(lang::data_type_names());
    b["unraised-messages"] = unraised_messages();
    return b;
}

const block_markers markdown_markers = {"<!-- generated: ", " -->", "<!-- end generated -->"};
const block_markers roff_markers = {".\\\" generated: ", "", ".\\\" end generated"};

std::string fill_blocks(const std::string &text, const std::map<std::string, std::string> &blocks, std::string &missing,
                        const block_markers &markers) {
    std::istringstream in(text);
    std::ostringstream out;
    std::map<std::string, bool> seen;
    bool skipping = false;
    for (std::string line; std::getline(in, line);) {
        if (skipping) {
            // The old body and its end line give way to the new ones.
            skipping = line != markers.end;
            continue;
        }
        out << line << '\n';
        if (line.rfind(markers.start, 0) != 0 || line.size() < markers.start.size() + markers.start_end.size())
            continue;
        std::string name =
            line.substr(markers.start.size(), line.size() - markers.start.size() - markers.start_end.size());
        auto it = blocks.find(name);
        if (it == blocks.end()) {
            missing += (missing.empty() ? "" : ", ") + ("unknown block " + name);
            continue;
        }
        out << it->second << markers.end << '\n';
        seen[name] = skipping = true;
    }
    for (const auto &[name, body] : blocks)
        if (!seen[name])
            missing += (missing.empty() ? "" : ", ") + name;
    return out.str();
}

} // namespace docgen
