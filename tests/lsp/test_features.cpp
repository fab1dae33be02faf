// The requests on documents, in-process: what each answers on a small
// source whose every line is known.
#include <gtest/gtest.h>

#include "compile_support.h"
#include "lsp_support.h"

namespace {

const std::string URI = "file:///home/author/defs/demo.src";

// Line numbers (0-based) are noted where tests use them.
const std::string SOURCE = "ControlDefinition\n"           // 0
                           "\tFileVersion=1.0.0.0\n"       // 1
                           "ResourceClass\n"               // 2
                           "\tDescription=1\n"             // 3
                           "\tDisplayName=2\n"             // 4
                           "\tProperties=HasResources\n"   // 5
                           "\tClassPermTemplate=t\n"       // 6
                           "\tResourcePermTemplate=t\n"    // 7
                           "\tLocator=Size\n"              // 8
                           "\tName=Demo.Thing\n"           // 9
                           "PersistentResourceAttribute\n" // 10
                           "\tName=Size\n"                 // 11
                           "\tDescription=3\n"             // 12
                           "\tDisplayName=4\n"             // 13
                           "\tId=1\n"                      // 14
                           "\tDataType=UInt32\n"           // 15
                           "\tVarietyRange=1,1\n"          // 16
                           "\tDefaultValue=10\n"           // 17
                           "DynamicResourceAttribute\n"    // 18
                           "\tName=Load\n"                 // 19
                           "\tDescription=5\n"             // 20
                           "\tDisplayName=6\n"             // 21
                           "\tId=2\n"                      // 22
                           "\tDataType=Float64\n"          // 23
                           "\tVariableType=Quantity\n"     // 24
                           "\tVarietyRange=1,1\n"          // 25
                           "\tVariableClass=VC1\n"         // 26
                           "\tRange=0,100\n"               // 27
                           "ClassToManagerMapping\n"       // 28
                           "\tResourceManager=Demo.RM\n"   // 29
                           "\tFirstKey=1\n"                // 30
                           "\tLastKey=10\n"                // 31
                           "\tMessageCatalog=demo.cat\n"   // 32
                           "\tDescriptiveMessageSet=1\n"   // 33
                           "ResourceVariableClass\n"       // 34
                           "\tObservationInterval=60\n"    // 35
                           "\tReportingInterval=60\n"      // 36
                           "\tVariableClass=VC1\n";        // 37

std::string replace_line(const std::string &text, int line, const std::string &with) {
    size_t from = 0;
    for (int l = 0; l < line; l++)
        from = text.find('\n', from) + 1;
    return text.substr(0, from) + with + text.substr(text.find('\n', from));
}

std::vector<std::string> labels(const json &completion) {
    std::vector<std::string> v;
    for (const json &i : completion["result"]["items"])
        v.push_back(i["label"]);
    return v;
}

std::string hover_text(session &s, int line, int character) {
    json r = s.at("textDocument/hover", URI, line, character);
    return r["result"].is_null() ? "" : r["result"]["contents"]["value"].get<std::string>();
}

TEST(LspFeatures, DiagnosticsPointAtTheValueOrKeywordAndFollowEdits) {
    session s;
    EXPECT_TRUE(s.open(URI, SOURCE).empty());
    // The checker quotes the unknown VariableClass: the value is underlined.
    json d = s.change(
        URI, {{{"range", {{"start", {{"line", 26}, {"character", 15}}}, {"end", {{"line", 26}, {"character", 18}}}}},
               {"text", "Nope"}}});
    ASSERT_EQ(d.size(), 1u);
    EXPECT_EQ(d[0]["code"], "variable-class");
    EXPECT_EQ(d[0]["severity"], 2);
    EXPECT_EQ(d[0]["range"]["start"], json({{"line", 26}, {"character", 15}}));
    EXPECT_EQ(d[0]["range"]["end"], json({{"line", 26}, {"character", 19}}));
    // A misspelt keyword is an error on the keyword.
    d = s.change(URI, {{{"text", replace_line(SOURCE, 14, "\tIdd=1")}}});
    ASSERT_EQ(d.size(), 1u);
    EXPECT_EQ(d[0]["severity"], 1);
    EXPECT_EQ(d[0]["range"]["start"], json({{"line", 14}, {"character", 1}}));
    EXPECT_EQ(d[0]["range"]["end"], json({{"line", 14}, {"character", 4}}));
    EXPECT_FALSE(d[0].contains("code"));
    // A source without a map: the whole file, shown on its first line.
    d = s.change(URI, {{{"text", SOURCE.substr(0, SOURCE.find("ClassToManagerMapping"))}}});
    ASSERT_EQ(d.size(), 1u);
    EXPECT_EQ(d[0]["range"]["start"], json({{"line", 0}, {"character", 0}}));
    EXPECT_EQ(d[0]["range"]["end"], json({{"line", 0}, {"character", 17}}));
    EXPECT_EQ(d[0]["data"]["wholeFile"], true);
    s.notify("textDocument/didClose", {{"textDocument", {{"uri", URI}}}});
    EXPECT_TRUE(s.last_diagnostics(URI).empty());
}

TEST(LspFeatures, SettingsSwitchWarningsAndTheUnnamedClassRule) {
    std::string unnamed = replace_line(SOURCE, 9, "");
    session s(json{{"warnings", {{"unnamed-class", false}}}});
    EXPECT_TRUE(s.open(URI, unnamed).empty());
    // An empty list is taken for an empty object.
    s.notify("workspace/didChangeConfiguration", {{"settings", {{"warnings", json::array()}}}});
    EXPECT_EQ(s.last_diagnostics(URI).size(), 1u);
    // Each message is the whole of the settings: what it leaves out is back
    // in its default state.
    s.notify("workspace/didChangeConfiguration", {{"settings", {{"warnings", {{"unnamed-class", false}}}}}});
    EXPECT_TRUE(s.last_diagnostics(URI).empty());
    s.notify("workspace/didChangeConfiguration", {{"settings", json::object()}});
    EXPECT_EQ(s.last_diagnostics(URI).size(), 1u);
    s.notify("workspace/didChangeConfiguration", {{"settings", json::array()}});
    EXPECT_EQ(s.last_diagnostics(URI).size(), 1u);
    s.notify("workspace/didChangeConfiguration", {{"settings", {{"warnings", {{"unnamed-class", false}}}}}});
    s.notify("workspace/didChangeConfiguration",
             {{"settings", {{"qecfg", {{"warnings", {{"unnamed-class", true}}}}}}}});
    json d = s.last_diagnostics(URI);
    ASSERT_EQ(d.size(), 1u);
    EXPECT_EQ(d[0]["code"], "unnamed-class");
    // Named after the document's file name, like the checker names it.
    EXPECT_NE(d[0]["message"].get<std::string>().find("'demo' for output 'demo.cdef'"), std::string::npos);
    s.notify("workspace/didChangeConfiguration", {{"settings", {{"outputName", "x/other.cdef"}}}});
    ASSERT_EQ(s.last_diagnostics(URI).size(), 1u);
    EXPECT_NE(s.last_diagnostics(URI)[0]["message"].get<std::string>().find("'x/other'"), std::string::npos);
}

TEST(LspFeatures, HoverShowsTheReferenceAndHowAValueIsRead) {
    session s;
    s.open(URI, SOURCE);
    EXPECT_NE(hover_text(s, 10, 3).find("| `VarietyRange` | required | yes |"), std::string::npos);
    std::string kw = hover_text(s, 15, 2);
    EXPECT_NE(kw.find("| `DataType` | required | no | data type name |"), std::string::npos);
    EXPECT_EQ(kw.find("VarietyRange"), std::string::npos); // only its own row
    EXPECT_NE(hover_text(s, 15, 11).find("`UInt32` is a data type"), std::string::npos);
    EXPECT_NE(hover_text(s, 5, 14).find("`HasResources` is a property word of ResourceClass"), std::string::npos);
    EXPECT_NE(hover_text(s, 5, 14).find("`CanLiveUpdate`"), std::string::npos);
    EXPECT_NE(hover_text(s, 17, 14).find("read as UInt32 10 (the type holds 0 to 4294967295)"), std::string::npos);
    EXPECT_NE(hover_text(s, 27, 8).find("read as Float64 100"), std::string::npos);
    s.change(URI, {{{"text", replace_line(replace_line(SOURCE, 1, "\tFileVersion=1.x"), 17, "\tDefaultValue=12abc")}}});
    EXPECT_NE(hover_text(s, 1, 14).find("read as the version 1.0.0.0"), std::string::npos);
    EXPECT_NE(hover_text(s, 17, 14).find("`12abc` is not a value of type UInt32"), std::string::npos);
    EXPECT_EQ(hover_text(s, 30, 0), ""); // the indentation
}

TEST(LspFeatures, CompletionByPlace) {
    session s;
    s.open(URI, SOURCE + "\n");
    auto stanzas = labels(s.at("textDocument/completion", URI, 38, 0));
    EXPECT_EQ(stanzas.front(), "ControlDefinition");
    EXPECT_EQ(stanzas.size(), 19u);
    // A new statement line of the dynamic attribute: what is left, required first.
    std::string text = replace_line(SOURCE, 27, "\tRange=0,100\n\t");
    s.change(URI, {{{"text", text}}});
    auto left = labels(s.at("textDocument/completion", URI, 28, 1));
    ASSERT_FALSE(left.empty());
    EXPECT_EQ(left.front(), "VarietyRange"); // repeatable
    EXPECT_EQ(std::count(left.begin(), left.end(), "Name"), 0);
    EXPECT_EQ(std::count(left.begin(), left.end(), "Range"), 0);
    EXPECT_EQ(std::count(left.begin(), left.end(), "InitialValue"), 1);
    EXPECT_EQ(labels(s.at("textDocument/completion", URI, 15, 10)).size(), 22u); // DataType=
    auto vc = labels(s.at("textDocument/completion", URI, 26, 15));
    EXPECT_EQ(vc, std::vector<std::string>{"VC1"});
    EXPECT_EQ(labels(s.at("textDocument/completion", URI, 8, 9)), std::vector<std::string>{"Size"});
    auto props = labels(s.at("textDocument/completion", URI, 5, 24));
    EXPECT_EQ(std::count(props.begin(), props.end(), "CanDefine"), 1);
    EXPECT_EQ(props.size(), 17u); // the word being written is offered too
}

TEST(LspFeatures, SymbolsDefinitionsAndReferences) {
    session s;
    s.open(URI, SOURCE);
    json symbols = s.request("textDocument/documentSymbol", {{"textDocument", {{"uri", URI}}}})["result"];
    ASSERT_EQ(symbols.size(), 3u);
    EXPECT_EQ(symbols[0]["name"], "Demo.Thing");
    ASSERT_EQ(symbols[0]["children"].size(), 2u);
    EXPECT_EQ(symbols[0]["children"][1]["name"], "Load");
    EXPECT_EQ(symbols[1]["name"], "Demo.RM");
    EXPECT_EQ(symbols[2]["name"], "VC1");
    json def = s.at("textDocument/definition", URI, 26, 16)["result"];
    ASSERT_EQ(def.size(), 1u);
    EXPECT_EQ(def[0]["range"]["start"]["line"], 37);
    def = s.at("textDocument/definition", URI, 8, 10)["result"];
    ASSERT_EQ(def.size(), 1u);
    EXPECT_EQ(def[0]["range"]["start"]["line"], 11);
    json refs = s.at("textDocument/references", URI, 37, 16, {{"context", {{"includeDeclaration", true}}}})["result"];
    EXPECT_EQ(refs.size(), 2u);
    refs = s.at("textDocument/references", URI, 11, 7, {{"context", {{"includeDeclaration", false}}}})["result"];
    ASSERT_EQ(refs.size(), 1u);
    EXPECT_EQ(refs[0]["range"]["start"]["line"], 8);
    s.open("file:///home/author/defs/other.src", SOURCE);
    json ws = s.request("workspace/symbol", {{"query", "load"}})["result"];
    EXPECT_EQ(ws.size(), 2u);
}

TEST(LspFeatures, StructuredDataNestsUnderItsOwner) {
    session s;
    s.open(URI, slurp(QECFG_SOURCE_DIR "/examples/disk.src"));
    json symbols = s.request("textDocument/documentSymbol", {{"textDocument", {{"uri", URI}}}})["result"];
    const json *layout = nullptr;
    for (const json &cls : symbols)
        for (const json &c : cls["children"])
            if (c["name"] == "Layout")
                layout = &c;
    ASSERT_TRUE(layout);
    ASSERT_EQ((*layout)["children"].size(), 1u);
    EXPECT_EQ((*layout)["children"][0]["name"], "PAttrSDDefinition");
    EXPECT_EQ((*layout)["children"][0]["children"][0]["name"], "Partitions");
}

// Applies the first code action whose title starts with `title` on a line.
std::string fix(session &s, const std::string &text, int line, const std::string &title) {
    s.change(URI, {{{"text", text}}});
    json r = s.request(
        "textDocument/codeAction",
        {{"textDocument", {{"uri", URI}}},
         {"range", {{"start", {{"line", line}, {"character", 0}}}, {"end", {{"line", line}, {"character", 0}}}}},
         {"context", {{"diagnostics", s.last_diagnostics(URI)}}}});
    for (const json &a : r["result"])
        if (a["title"].get<std::string>().rfind(title, 0) == 0)
            return apply_edits(text, a["edit"]["changes"][URI]);
    ADD_FAILURE() << "no action '" << title << "' in " << r;
    return text;
}

TEST(LspFeatures, QuickFixesMendTheSource) {
    session s;
    s.open(URI, SOURCE);
    EXPECT_EQ(fix(s, replace_line(SOURCE, 15, "\tDataType=Uint32"), 15, "Replace"), SOURCE);
    EXPECT_EQ(fix(s, replace_line(SOURCE, 14, "\tID=1"), 14, "Replace"), SOURCE);
    EXPECT_EQ(fix(s, replace_line(SOURCE, 10, "PersistentResourceAtribute"), 10, "Replace"), SOURCE);
    EXPECT_EQ(fix(s, replace_line(SOURCE, 5, "\tProperties=HasResorces"), 5, "Replace"), SOURCE);
    std::string missing = replace_line(replace_line(SOURCE, 14, ""), 12, "");
    std::string inserted = fix(s, missing, 11, "Insert the missing");
    // Values that compile where one is knowable: a message id, the next free Id.
    EXPECT_NE(inserted.find("PersistentResourceAttribute\n\tDescription=0\n\tId=1\n\tName=Size"), std::string::npos);
    EXPECT_EQ(compile_text(inserted).code, 0) << inserted;
    // No data type is knowable: a placeholder the compiler refuses until it is replaced.
    std::string untyped = replace_line(SOURCE, 15, "");
    EXPECT_NE(fix(s, untyped, 10, "Insert the missing").find("PersistentResourceAttribute\n\tDataType=TODO\n"),
              std::string::npos);
    std::string binary = replace_line(replace_line(SOURCE, 15, "\tDataType=Binary"), 17, "\tDefaultValue=00ff");
    EXPECT_NE(fix(s, binary, 17, "Write").find("\tDefaultValue=0x00ff\n"), std::string::npos);
    std::string twice = replace_line(SOURCE, 17, "\tDefaultValue=9\n\tDefaultValue=10");
    EXPECT_EQ(fix(s, twice, 17, "Remove"), SOURCE);
    EXPECT_EQ(compile_text(SOURCE).code, 0);
}

TEST(LspFeatures, FormattingGivesTheCanonicalLayout) {
    session s;
    std::string messy = "ControlDefinition  \n    FileVersion=1.0   # why\n  \n \t// note\nResourceClass";
    s.open(URI, messy);
    json edits =
        s.request("textDocument/formatting", {{"textDocument", {{"uri", URI}}}, {"options", json::object()}})["result"];
    std::string formatted = apply_edits(messy, edits);
    EXPECT_EQ(formatted, "ControlDefinition\n\tFileVersion=1.0   # why\n\n\t// note\nResourceClass\n");
    s.change(URI, {{{"text", formatted}}});
    EXPECT_TRUE(
        s.request("textDocument/formatting", {{"textDocument", {{"uri", URI}}}, {"options", json::object()}})["result"]
            .empty());
}

} // namespace
