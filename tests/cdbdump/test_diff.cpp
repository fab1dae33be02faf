// --diff and --compat through the command, on CDBs compiled from a base source
// and from copies changed in one way each, the new side in both byte orders.
#include <sys/wait.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>

#include <gtest/gtest.h>

#include "test_dirs.h"

namespace fs = std::filesystem;

namespace {
struct run_result {
    int status;
    std::string out;
};

using cdbtest::read_text;

struct diff_dir : cdbtest::work_dir {
    std::string base = read_text(fs::path(QECFG_SOURCE_DIR) / "tests/cdbdump/diff/base.src");
    diff_dir() : work_dir("cdbdump_diff") {}

    // Compiles the source text into NAME (with -s when swapped); the path.
    std::string compile(const std::string &source, const std::string &name, bool swapped = false) {
        std::ofstream(path / (name + ".src")) << source;
        std::string cmd = std::string(QECFG_BIN) + (swapped ? " -s " : " ") + (path / (name + ".src")).string() + " " +
                          (path / name).string() + " >/dev/null 2>&1";
        int st = std::system(cmd.c_str());
        EXPECT_TRUE(WIFEXITED(st) && WEXITSTATUS(st) == 0) << source;
        return (path / name).string();
    }

    run_result cdbdump(const std::string &args) {
        fs::path out = path / "out.txt";
        int st = std::system((std::string(CDBDUMP_BIN) + " " + args + " >" + out.string() + " 2>&1").c_str());
        return run_result{WIFEXITED(st) ? WEXITSTATUS(st) : -1, read_text(out)};
    }
};

// The base with every `from` replaced by `to`; the test fails when `from` is absent.
std::string edited(std::string s, const std::vector<std::pair<std::string, std::string>> &edits) {
    for (const auto &[from, to] : edits) {
        size_t at = s.find(from);
        EXPECT_NE(at, std::string::npos) << from;
        for (; at != std::string::npos; at = s.find(from, at + to.size()))
            s.replace(at, from.size(), to);
    }
    return s;
}

struct variant {
    const char *what;
    std::vector<std::pair<std::string, std::string>> edits;
    bool breaking;
    const char *line; // a line of the --compat output, without its reason
    const char *reason;
};

const std::string errors_stanza = "    Id=4\n    DataType=Int32\n    VariableType=Counter\n    VarietyRange=1,1\n"
                                  "    VariableClass=Fast\n";

const variant variants[] = {
    {"description",
     {{"Description=13", "Description=99"}},
     false,
     "compatible: changed class \"Diff.Disk\" / persistent_resource_attributes / \"Blocks\" / description: 13 -> 99",
     "a description or display name changed"},
    {"default",
     {{"DefaultValue=none", "DefaultValue=other"}},
     false,
     "compatible: changed class \"Diff.Disk\" / persistent_resource_attributes / \"Label\" / default_value: \"none\" "
     "-> \"other\"",
     "a default or range changed"},
    {"range",
     {{"Range=0,100", "Range=0,50"}},
     false,
     "compatible: changed class \"Diff.Disk\" / dynamic_resource_attributes / \"Load\" / range / high: 100 -> 50",
     "a default or range changed"},
    {"attribute added",
     {{"ResourceAction\n", "PersistentResourceAttribute\n    Name=Extra\n    Description=1\n    DisplayName=2\n"
                           "    Id=9\n    DataType=Int64\n    VarietyRange=1,1\nResourceAction\n"}},
     false,
     "compatible: added class \"Diff.Disk\" / persistent_resource_attributes / \"Extra\"",
     "an addition"},
    {"variable id appended",
     {{"ResourceAction\n", "DynamicResourceAttribute\n    Name=Temp\n    Description=1\n    DisplayName=2\n    Id=9\n"
                           "    DataType=Int32\n    VariableType=Counter\n    VarietyRange=1,1\n"
                           "    VariableClass=Fast\nResourceAction\n"}},
     false,
     "compatible: changed variable_class \"Fast\" / variable_ids: [3,4] -> [3,4,9]",
     "variable IDs were added"},
    {"attribute removed",
     {{"    Name=Blocks\n", "    Name=Blocks2\n"}},
     true,
     "breaking: removed class \"Diff.Disk\" / persistent_resource_attributes / \"Blocks\"",
     "an attribute was removed"},
    {"class removed",
     {{"    Name=Diff.Tape\n", "    Name=Diff.Tape2\n"}},
     true,
     "breaking: removed class \"Diff.Tape\"",
     "a class was removed"},
    {"action removed",
     {{"    Name=Reset\n", "    Name=Restart\n"}},
     true,
     "breaking: removed class \"Diff.Disk\" / resource_actions / \"Reset\"",
     "an action was removed"},
    {"attribute id",
     {{"    Id=2\n", "    Id=7\n"}},
     true,
     "breaking: changed class \"Diff.Disk\" / persistent_resource_attributes / \"Blocks\" / id: 2 -> 7",
     "an attribute id changed"},
    {"data type",
     {{"DataType=UInt32", "DataType=UInt64"}},
     true,
     "breaking: changed class \"Diff.Disk\" / persistent_resource_attributes / \"Blocks\" / data_type: \"UInt32\" -> "
     "\"UInt64\"",
     "a data type changed"},
    {"variable type",
     {{"VariableType=Counter", "VariableType=Quantity"}},
     true,
     "breaking: changed class \"Diff.Disk\" / dynamic_resource_attributes / \"Errors\" / variable_type: \"Counter\" -> "
     "\"Quantity\"",
     "a variable type changed"},
    {"scope",
     {{"ResourceAction", "ClassAction"}},
     true,
     "breaking: moved class \"Diff.Disk\" / resource_actions / \"Reset\": \"resource_actions\" -> \"class_actions\"",
     "class/resource scope changed"},
    {"persistence",
     {{"PersistentResourceAttribute\n    Name=Blocks", "DynamicResourceAttribute\n    Name=Blocks"},
      {"    DisplayName=14\n", "    DisplayName=14\n    VariableType=Counter\n"}},
     true,
     "breaking: moved class \"Diff.Disk\" / persistent_resource_attributes / \"Blocks\": "
     "\"persistent_resource_attributes\" -> \"dynamic_resource_attributes\"",
     "persistence changed"},
    {"sd element retyped",
     {{"ElementIndex=1\n    DataType=UInt64", "ElementIndex=1\n    DataType=Int32"}},
     true,
     "breaking: changed class \"Diff.Disk\" / define_sd / \"Size\" / data_type: \"UInt64\" -> \"Int32\"",
     "a structured-data element was retyped"},
    {"sd element removed",
     {{"ElementName=Size", "ElementName=Bytes"}},
     true,
     "breaking: removed class \"Diff.Disk\" / define_sd / \"Size\"",
     "a structured-data element was removed"},
    {"sd elements reordered",
     {{"ElementName=Device", "ElementName=@"},
      {"ElementName=Size", "ElementName=Device"},
      {"ElementName=@", "ElementName=Size"}},
     true,
     "breaking: reordered class \"Diff.Disk\" / define_sd: [\"Device\",\"Size\"] -> [\"Size\",\"Device\"]",
     "structured-data elements were reordered"},
    {"variable id moved",
     {{errors_stanza, edited(errors_stanza, {{"Fast", "Slow"}})}},
     true,
     "breaking: changed variable_class \"Fast\" / variable_ids: [3,4] -> [3]",
     "a variable ID moved"},
};
} // namespace

TEST(Diff, EachCompatibleAndBreakingChangeInBothByteOrders) {
    diff_dir d;
    std::string old_cdb = d.compile(d.base, "old.cdef");
    for (const variant &v : variants) {
        SCOPED_TRACE(v.what);
        std::string source = edited(d.base, v.edits);
        for (bool swapped : {false, true}) {
            std::string new_cdb = d.compile(source, "new.cdef", swapped);
            run_result diff = d.cdbdump("--diff " + old_cdb + " " + new_cdb);
            EXPECT_EQ(diff.status, 1) << diff.out;
            run_result compat = d.cdbdump("--compat " + old_cdb + " " + new_cdb);
            EXPECT_EQ(compat.status, v.breaking ? 1 : 0) << compat.out;
            size_t at = compat.out.find(std::string(v.line));
            ASSERT_NE(at, std::string::npos) << compat.out;
            std::string line = compat.out.substr(at, compat.out.find('\n', at) - at);
            EXPECT_EQ(line.substr(line.rfind(" (")), std::string(" (") + v.reason + ")") << line;
            // Without its verdict the line is one of --diff, which shows a move as a removal and an addition.
            std::string plain = line.substr(line.find(' ') + 1, line.rfind(" (") - line.find(' ') - 1);
            if (plain.rfind("moved ", 0) != 0) {
                EXPECT_NE(diff.out.find(plain + "\n"), std::string::npos) << plain;
            }
        }
    }
}

TEST(Diff, SameContentReportsNoDifference) {
    diff_dir d;
    std::string old_cdb = d.compile(d.base, "old.cdef");
    // Blocks and Label swapped: the attribute table is in another order.
    size_t label = d.base.find("PersistentResourceAttribute\n    Name=Label");
    size_t blocks = d.base.find("PersistentResourceAttribute\n    Name=Blocks");
    size_t load = d.base.find("DynamicResourceAttribute\n    Name=Load");
    std::string reordered = d.base.substr(0, label) + d.base.substr(blocks, load - blocks) +
                            d.base.substr(label, blocks - label) + d.base.substr(load);
    const std::pair<const char *, std::string> cases[] = {
        {"compiled again, at another time", d.compile(d.base, "again.cdef")},
        {"other byte order", d.compile(d.base, "swapped.cdef", true)},
        {"stanzas reordered", d.compile(reordered, "reordered.cdef")},
    };
    for (const auto &[what, other] : cases) {
        SCOPED_TRACE(what);
        for (const char *mode : {"--diff", "--compat"}) {
            run_result r = d.cdbdump(std::string(mode) + " " + old_cdb + " " + other);
            EXPECT_EQ(r.status, 0) << r.out;
            EXPECT_EQ(r.out, "");
        }
        run_result json = d.cdbdump("--diff --json " + old_cdb + " " + other);
        EXPECT_EQ(json.out, "{\n  \"equal\": true,\n  \"changes\": []\n}\n");
    }
}

TEST(Diff, JsonDocumentAndErrors) {
    diff_dir d;
    std::string old_cdb = d.compile(d.base, "old.cdef");
    std::string new_cdb = d.compile(edited(d.base, {{"DataType=UInt32", "DataType=UInt64"}}), "new.cdef", true);
    run_result json = d.cdbdump("--json --compat " + old_cdb + " " + new_cdb);
    EXPECT_EQ(json.status, 1);
    for (const char *part :
         {"\"compatible\": false", "\"old\": \"UInt32\"", "\"new\": \"UInt64\"", "\"breaking\": true"})
        EXPECT_NE(json.out.find(part), std::string::npos) << part << "\n" << json.out;
    // The path's dsect and item names are structured, not quoted inside strings.
    std::string compact;
    for (char ch : json.out)
        if (ch != ' ' && ch != '\n')
            compact += ch;
    EXPECT_NE(compact.find("\"path\":[{\"dsect\":\"class\",\"name\":\"Diff.Disk\"},\"persistent_resource_attributes\","
                           "{\"name\":\"Blocks\"},\"data_type\"]"),
              std::string::npos)
        << json.out;
    EXPECT_NE(d.cdbdump("--compat --json " + old_cdb + " " + new_cdb).out, "");

    std::ofstream(d.path / "broken.cdef") << "not a CDB";
    const std::string bad[] = {"--diff " + old_cdb, "--diff " + old_cdb + " " + (d.path / "broken.cdef").string(),
                               "--compat " + old_cdb + " /nonexistent", "--diff --check " + old_cdb + " " + old_cdb};
    for (const std::string &args : bad)
        EXPECT_EQ(d.cdbdump(args).status, 2) << args;
}

namespace {
// The JSON without the blanks and line ends outside strings.
std::string compact(const std::string &json) {
    std::string out;
    bool in_string = false;
    for (size_t i = 0; i < json.size(); i++) {
        char ch = json[i];
        if (in_string && ch == '\\') {
            out += json.substr(i++, 2);
            continue;
        }
        if (ch == '"')
            in_string = !in_string;
        if (in_string || (ch != ' ' && ch != '\n'))
            out += ch;
    }
    return out;
}

// The compact object or array that follows `key` in a compact document.
std::string value_after(const std::string &doc, const std::string &key) {
    size_t at = doc.find(key);
    if (at == std::string::npos)
        return "";
    size_t start = at + key.size(), depth = 0;
    bool in_string = false;
    for (size_t i = start; i < doc.size(); i++) {
        char ch = doc[i];
        if (in_string && ch == '\\')
            i++;
        else if (ch == '"')
            in_string = !in_string;
        else if (!in_string && (ch == '{' || ch == '['))
            depth++;
        else if (!in_string && (ch == '}' || ch == ']') && --depth == 0)
            return doc.substr(start, i + 1 - start);
    }
    return "";
}
} // namespace

// What --diff --json shows of a class or an attribute removed or added whole
// is what --json shows of it in its file.
TEST(Diff, JsonShowsWhatWasRemovedOrAddedAsTheFileHoldsIt) {
    diff_dir d;
    std::string old_cdb = d.compile(d.base, "old.cdef");
    std::string new_cdb = d.compile(
        edited(d.base, {{"    Name=Diff.Tape\n", "    Name=Diff.Reel\n"}, {"    Name=Blocks\n", "    Name=Sectors\n"}}),
        "new.cdef", true);
    run_result diff = d.cdbdump("--diff --json " + old_cdb + " " + new_cdb);
    ASSERT_EQ(diff.status, 1) << diff.out;
    std::string changes = compact(diff.out), old_doc = compact(d.cdbdump("--json " + old_cdb).out),
                new_doc = compact(d.cdbdump("--json " + new_cdb).out);
    const std::pair<const char *, const std::string &> cases[] = {
        {"{\"dsect\":\"class\",\"name\":\"Diff.Tape\"}],\"old\":", old_doc},
        {"{\"dsect\":\"class\",\"name\":\"Diff.Reel\"}],\"old\":null,\"new\":", new_doc},
        {"{\"name\":\"Blocks\"}],\"old\":", old_doc},
        {"{\"name\":\"Sectors\"}],\"old\":null,\"new\":", new_doc},
    };
    for (const auto &[key, doc] : cases) {
        std::string content = value_after(changes, key);
        ASSERT_GT(content.size(), 20u) << key << "\n" << diff.out;
        // In the file's document a dsect also carries its kind.
        std::string shown = content.find("\"revision\"") == 1 ? "{\"dsect\":\"class\"," + content.substr(1) : content;
        EXPECT_NE(doc.find(shown), std::string::npos) << key << ": " << content;
    }
    // A record that moved to another list is one change naming the two lists.
    std::string moved = d.compile(edited(d.base, {{"ResourceAction", "ClassAction"}}), "moved.cdef");
    EXPECT_NE(compact(d.cdbdump("--compat --json " + old_cdb + " " + moved).out)
                  .find("{\"name\":\"Reset\"}],\"old\":\"resource_actions\",\"new\":\"class_actions\""),
              std::string::npos);
}
