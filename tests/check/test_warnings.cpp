// Each warning fires on its mistake, at the line of the mistake, and is
// silent on the corrected source.
#include <gtest/gtest.h>

#include "check_support.h"

namespace {

// A class and its map; `class_lines` are added to the ResourceClass stanza,
// `stanzas` after the map.
std::string source(const std::string &stanzas, const std::string &class_lines = "    Name=Test.Class\n",
                   const std::string &version = "1.0") {
    return "ControlDefinition\n    FileVersion=" + version +
           "\nResourceClass\n    Description=1\n    DisplayName=2\n    Properties=HasResources\n"
           "    ClassPermTemplate=t\n    ResourcePermTemplate=t\n" +
           class_lines +
           "ClassToManagerMapping\n    ResourceManager=Test.RM\n    FirstKey=1\n    LastKey=5\n"
           "    MessageCatalog=test.cat\n    DescriptiveMessageSet=1\n" +
           stanzas;
}

std::string attr(const char *kind, const std::string &name, int id, const std::string &type,
                 const std::string &more = "", const std::string &required_more = "") {
    return std::string(kind) + "\n    Name=" + name +
           "\n    Description=1\n    DisplayName=2\n    Id=" + std::to_string(id) + "\n    DataType=" + type +
           "\n    VarietyRange=1,1\n" + required_more + more;
}
std::string pattr(const std::string &name, int id, const std::string &type, const std::string &more = "") {
    return attr("PersistentResourceAttribute", name, id, type, more);
}
std::string dattr(const std::string &name, int id, const std::string &type, const std::string &more = "") {
    return attr("DynamicResourceAttribute", name, id, type, more, "    VariableType=Quantity\n");
}
std::string action(const std::string &name, int id, const std::string &more = "") {
    return "ResourceAction\n    Name=" + name + "\n    Description=1\n    DisplayName=2\n    Id=" + std::to_string(id) +
           "\n    VarietyRange=1,1\n" + more;
}
std::string element(const std::string &type) {
    return "DefineSDDefinition\n    ElementName=e\n    Description=1\n    DisplayName=2\n    ElementIndex=0\n"
           "    DataType=" +
           type + "\n";
}
const std::string USAGE = "ResourceVariableClass\n    VariableClass=Usage\n    ObservationInterval=1\n"
                          "    ReportingInterval=1\n";
const std::string OTHER = "ResourceVariableClass\n    VariableClass=Other\n    ObservationInterval=1\n"
                          "    ReportingInterval=1\n";
// A second class, which a source may hold after the first.
std::string second_class(const std::string &stanzas) {
    return "ControlDefinition\n    FileVersion=1.0\nResourceClass\n    Description=1\n    DisplayName=2\n"
           "    Properties=HasResources\n    ClassPermTemplate=t\n    ResourcePermTemplate=t\n    Name=Other.Class\n" +
           stanzas;
}
// A further ResourceClass stanza of the same class.
std::string more_class(const std::string &lines) {
    return "ResourceClass\n    Description=1\n    DisplayName=2\n    Properties=HasResources\n"
           "    ClassPermTemplate=t\n    ResourcePermTemplate=t\n" +
           lines;
}
std::string sd_attribute(const std::string &element_lines) {
    return pattr("s", 1, "SD") +
           "PAttrSDDefinition # here\n    ElementName=e\n    Description=1\n    DisplayName=2\n    ElementIndex=0\n"
           "    DataType=Int32\n" +
           element_lines;
}

// Marks the line that holds `text` (its first occurrence) as the mistake.
std::string here(std::string s, const std::string &text) { return s.insert(s.find('\n', s.find(text)), " # here"); }

struct warning_case {
    const char *name;
    std::string mistake, corrected; // the mistake's line carries "# here"
};

const warning_case cases[] = {
    {"locator", source(attr("PersistentClassAttribute", "Size", 1, "Int32"), "    Locator=Size # here\n    Name=T\n"),
     source(pattr("Size", 1, "Int32"), "    Locator=Size\n    Name=T\n")},
    {"duplicate-id", source(pattr("a", 1, "Int32") + here(pattr("b", 1, "Int32"), "Id=")),
     source(pattr("a", 1, "Int32") + pattr("b", 2, "Int32") + attr("PersistentClassAttribute", "c", 1, "Int32"))},
    {"duplicate-name", source(pattr("Size", 1, "Int32") + here(dattr("Size", 1, "Int32"), "Name=")),
     source(pattr("Size", 1, "Int32") + dattr("Used", 1, "Int32"))},
    {"variable-class", source(dattr("u", 1, "Int32", "    VariableClass=Usage # here\n")),
     source(dattr("u", 1, "Int32", "    VariableClass=Usage\n") + USAGE)},
    {"default-range", source(pattr("n", 1, "UInt32", "    ValidValue=1,9\n    DefaultValue=10 # here\n")),
     source(pattr("n", 1, "UInt32", "    ValidValue=1,9\n    DefaultValue=9\n"))},
    {"default-range", source(dattr("n", 1, "Float64", "    Range=1,9\n    InitialValue=-0.5 # here\n")),
     source(dattr("n", 1, "Float64", "    Range=1,9\n    InitialValue=nan\n"))},
    {"file-version", source("", "    Name=T\n", "1.x # here"), source("", "    Name=T\n", "1.255.0.7")},
    {"unnamed-class", here(source("", ""), "ControlDefinition"), source("")},
    {"number-text", source(pattr("n", 1, "Int32", "    GroupName=12abc # here\n")),
     source(pattr("n", 1, "Int32", "    GroupName=0x12\n"))},
    {"number-text", source(pattr("n", 1, "Int32", "    GroupName=70000 # here\n")),
     source(pattr("n", 1, "Int32", "    GroupName=65535\n"))},
    {"permission", source(action("a", 1, "    Permission=rw # here\n")), source(action("a", 1, "    Permission=x\n"))},
    {"element-type", source(element("Float # here")), source(element("Float32"))},
    {"ignored-range", source(dattr("s", 1, "String", "    Range=1,2 # here\n")),
     source(dattr("s", 1, "Int32", "    Range=0,2\n"))},
    {"reversed-range", source(pattr("n", 1, "Int64", "    ValidValue=5,-5 # here\n    DefaultValue=0\n")),
     source(pattr("n", 1, "Int64", "    ValidValue=-5,5\n    DefaultValue=0\n"))},
    {"repeated-default", source(pattr("s", 1, "String", "    DefaultValue=a\n    DefaultValue=b # here\n")),
     source(pattr("s", 1, "StringArray", "    DefaultValue=a\n    DefaultValue=b\n"))},
    // The Locator resolved is the class's last one.
    {"locator",
     source(pattr("Size", 1, "Int32") + more_class("    Locator=Sise # here\n"), "    Locator=Size\n    Name=T\n"),
     source(pattr("Size", 1, "Int32") + more_class("    Locator=Size\n"), "    Locator=Bogus\n    Name=T\n")},
    // A range with a NaN end holds no value.
    {"default-range", source(pattr("n", 1, "Float64", "    ValidValue=nan,9\n    DefaultValue=1 # here\n")),
     source(pattr("n", 1, "Float64", "    ValidValue=0,9\n    DefaultValue=1\n"))},
    {"default-range", source(dattr("n", 1, "Float32", "    InitialValue=1 # here\n    Range=0,nan\n")),
     source(dattr("n", 1, "Float32", "    InitialValue=1\n    Range=0,9\n"))},
    // Each element of an attribute's structured value starts as 0.
    {"default-range", source(sd_attribute("    ValidValue=1,9\n")), source(sd_attribute("    ValidValue=0,9\n"))},
    {"binary-text", source(pattr("b", 1, "Binary", "    DefaultValue=5000c500a1b2c3d4 # here\n")),
     source(pattr("b", 1, "Binary", "    DefaultValue=0x5000c500a1b2c3d4\n"))},
    {"binary-text", source(dattr("b", 1, "BinaryArray", "    ValidStateValue=0x00,7fff0000 # here\n")),
     source(dattr("b", 1, "BinaryArray", "    ValidStateValue=0x00,text\n"))},
    // A reader gives attribute 1 of the first class the ID that came from the second.
    {"variable-class-shared",
     source(here(dattr("u", 1, "Int32"), "DynamicResourceAttribute") + USAGE +
            second_class(dattr("v", 1, "Int32", "    VariableClass=Usage\n"))),
     source(dattr("u", 2, "Int32") + USAGE + second_class(dattr("v", 1, "Int32", "    VariableClass=Usage\n")))},
};

void PrintTo(const warning_case &c, std::ostream *os) { *os << c.name; }

class Warning : public ::testing::TestWithParam<warning_case> {};

TEST_P(Warning, FiresOnTheMistakeOnly) {
    const warning_case &c = GetParam();
    int line = line_of(c.mistake, "# here");
    ASSERT_GT(line, 0);
    check_run bad = check_text(c.mistake);
    EXPECT_EQ(bad.status, 0) << bad.err;
    std::string expected = "input.src:" + std::to_string(line) + ": warning: ";
    EXPECT_EQ(bad.err.rfind(expected, 0), 0u) << bad.err;
    EXPECT_NE(bad.err.find(std::string(" [") + c.name + "]\n"), std::string::npos) << bad.err;

    check_run good = check_text(c.corrected);
    EXPECT_EQ(good.status, 0);
    EXPECT_EQ(good.err, "");

    // -Werror turns it into an error; -W no-NAME silences it.
    check_run strict = check_text(c.mistake, {"-Werror"});
    EXPECT_EQ(strict.status, 1);
    EXPECT_NE(strict.err.find(": error: "), std::string::npos);
    check_run off = check_text(c.mistake, {"-W", std::string("no-") + c.name});
    EXPECT_EQ(off.err.find(std::string("[") + c.name + "]"), std::string::npos) << off.err;
}

TEST(Warning, ClaimsOnlyWhatIsStored) {
    // An ignored letter leaves the action with no permission, not with the
    // default of an action without Permission.
    check_run r = check_text(source(action("a", 1, "    Permission=rw\n")));
    EXPECT_NE(r.err.find("is stored with no permission letter at all [permission]"), std::string::npos) << r.err;
    EXPECT_EQ(r.err.find("default"), std::string::npos) << r.err;

    // Values that are not stored or never apply are not checked.
    const std::string silent[] = {
        source(pattr("n", 1, "UInt32", "    ValidValue=1,9\n    DefaultValue=10\n    DefaultValue=9\n")),
        source(
            pattr("n", 1, "UInt32", "    Properties=Public,ReqdForDefine\n    ValidValue=1,9\n    DefaultValue=10\n")),
        source(pattr("n", 1, "UInt32", "    Properties=ReqdForDefine\n    ValidValue=1,9\n")),
        source(attr("PersistentResourceAttribute", "s", 1, "SD", "    Properties=ReqdForDefine\n") +
               "PAttrSDDefinition\n    ElementName=e\n    Description=1\n    DisplayName=2\n    ElementIndex=0\n"
               "    DataType=Int32\n    ValidValue=1,9\n"),
        source(element("Int32") + "    ValidValue=1,9\n"), // an operation's input has no stored value
        source(
            pattr("b", 1, "Binary",
                  "    DefaultValue=cafebabe\n    ValidValue=1234567\n    ValidValue=2024\n    ValidValue=0x1234\n")),
        // Both classes' attribute 1 in one variable class, in the order a reader meets them.
        source(dattr("u", 1, "Int32", "    VariableClass=Usage\n") + USAGE +
               second_class(dattr("v", 1, "Int32", "    VariableClass=Usage\n"))),
        // A class attribute's variable ID carries the class bit.
        source(dattr("u", 1, "Int32") + USAGE +
               second_class(attr("DynamicClassAttribute", "c", 1, "Int32", "    VariableClass=Usage\n",
                                 "    VariableType=Quantity\n"))),
    };
    for (const std::string &text : silent) {
        check_run quiet = check_text(text, {"-W", "no-repeated-default"});
        EXPECT_EQ(quiet.status, 0) << text;
        EXPECT_EQ(quiet.err, "") << text;
    }
}

TEST(Warning, NamesTheVariableClassAReaderWouldChoose) {
    // Usage comes first and holds v's ID 1, which u meets first; then v
    // meets Other, which holds u's.
    std::string text = source(dattr("u", 1, "Int32", "    VariableClass=Other\n") + USAGE + OTHER +
                              second_class(dattr("v", 1, "Int32", "    VariableClass=Usage\n")));
    check_run r = check_text(text);
    auto line = [&](const std::string &marker, int skip = 0) { return std::to_string(line_of(text, marker) + skip); };
    std::string expected =
        "input.src:" + line("VariableClass=Other") +
        ": warning: the variable ID 1 of 'u' (class 'Test.Class') is also that of 'v' (class 'Other.Class') in the "
        "variable class 'Usage': the stored IDs cannot say which class they came from, and a reader of the CDB gives "
        "'u' to 'Usage', not to 'Other' [variable-class-shared]\n"
        "input.src:" +
        line("    Name=v", -1) + ": note: the other DynamicResourceAttribute with variable ID 1\n";
    EXPECT_EQ(r.err.substr(0, expected.size()), expected) << r.err;
}

INSTANTIATE_TEST_SUITE_P(Cases, Warning, ::testing::ValuesIn(cases),
                         [](const ::testing::TestParamInfo<warning_case> &i) {
                             std::string n = i.param.name + std::to_string(i.index);
                             for (char &ch : n)
                                 if (ch == '-')
                                     ch = '_';
                             return n;
                         });

} // namespace
