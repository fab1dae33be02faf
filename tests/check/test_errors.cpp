// The checker's errors: qecfg's message, located at the line the author must
// change, with the detail the message leaves out.
#include <gtest/gtest.h>

#include "check_support.h"

namespace {

const std::string CLASS =
    "ControlDefinition\n    FileVersion=1.0\nResourceClass\n    Description=1\n    DisplayName=2\n"
    "    Properties=HasResources\n    ClassPermTemplate=t\n    ResourcePermTemplate=t\n"
    "    Name=Test.Class\n";
const std::string MAP = "ClassToManagerMapping\n    ResourceManager=Test.RM\n    FirstKey=1\n    LastKey=5\n"
                        "    MessageCatalog=test.cat\n    DescriptiveMessageSet=1\n";
const std::string PATTR_HEAD = "PersistentResourceAttribute\n    Name=n\n    Description=1\n    DisplayName=2\n";
const std::string PATTR = PATTR_HEAD + "    Id=1\n    DataType=Int32\n    VarietyRange=1,1\n";

struct error_case {
    const char *what;
    std::string source; // the line to report carries "# here"
    std::string detail; // the whole text after "error: "
};

const error_case cases[] = {
    {"missing required statements are named", CLASS + MAP + PATTR_HEAD + "    GroupID=1 # here\n",
     "Optional attribute discovered before all required attributes have been defined: 'GroupID' comes before "
     "the required Id, DataType, VarietyRange"},
    {"the value and the type of a conversion failure", CLASS + MAP + PATTR + "    DefaultValue=12 apples # here\n",
     "str_to_zu: Invalid data: '12 apples' (DefaultValue) is not a value of type Int32"},
    {"the failing end of a pair",
     CLASS + MAP + PATTR.substr(0, PATTR.find("Int32")) +
         "Float32Array\n    VarietyRange=1,1\n    ValidValue=0,1e39 # here\n",
     "str_to_zu: Invalid data: '1e39' (ValidValue) is not an element of type Float32Array"},
    {"the line and words of a bad property", CLASS + MAP + PATTR + "    Properties=Public,Publc # here\n",
     "Publc: invalid property: 'Publc' is no property word of PersistentResourceAttribute; did you mean 'Public'? "
     "(the words: Public, Select, ReqdForDefine, OptForDefine, InvalForDefine, ReadOnly)"},
    {"a missing ControlDefinition",
     "ResourceClass\n    Description=1\n    DisplayName=2\n    Properties=HasResources\n    ClassPermTemplate=t\n"
     "    ResourcePermTemplate=t\n    Name=X # here\n",
     "No tbl for strings table: a ControlDefinition stanza must come first"},
    {"a misspelt statement", CLASS + MAP + PATTR + "    GroupNmae=1 # here\n",
     "Attribute name not defined in table (name/table): 'GroupNmae' is no statement of PersistentResourceAttribute; "
     "did you mean 'GroupName'?"},
    {"a misspelt stanza type", CLASS + MAP + "PersistentResourceAtribute # here\n",
     "Invalid table name: PersistentResourceAtribute; did you mean 'PersistentResourceAttribute'?"},
    {"the second map", CLASS + MAP + "ClassToManagerMapping # here\n" + MAP.substr(MAP.find('\n') + 1),
     "Only one ClassToManagerMapping stanza allowed"},
    {"reversed keys",
     CLASS + "ClassToManagerMapping\n    ResourceManager=R\n    FirstKey=9\n    LastKey=5\n"
             "    MessageCatalog=c\n    DescriptiveMessageSet=1 # here: the map is completed at the end\n",
     "Error: FirstKey is greater than LastKey. (FirstKey=9, LastKey=5 on line 13)\n"
     "input.src:12: note: FirstKey is given here"},
    {"an attribute element of no data type",
     CLASS + MAP + PATTR.substr(0, PATTR.find("Int32")) + "SD\n    VarietyRange=1,1\n" +
         "PAttrSDDefinition\n    ElementName=e\n    Description=1\n    DisplayName=2\n    ElementIndex=0\n"
         "    DataType=Int23\nResourceAction # here: the element run ends\n",
     "dump_dflt: copy_this_sd_type default error: the element 'e' of the PAttrSDDefinition definition on line 23 has "
     "a DataType that names no data type, so the attribute's structured value cannot be built\n"
     "input.src:28: note: DataType=Int23 names no data type; did you mean 'Int32'?"},
    {"the expected element index",
     CLASS + MAP +
         "DefineSDDefinition\n    ElementName=a\n    Description=1\n    DisplayName=2\n    ElementIndex=0\n"
         "    DataType=Int32\nDefineSDDefinition\n    ElementName=b\n    Description=1\n    DisplayName=2\n"
         "    ElementIndex=2 # here\n",
     "ElementIndeces must be consecutive: the element 1 of this DefineSDDefinition definition needs ElementIndex=1"},
    {"the first of a repeated statement", CLASS + MAP + PATTR + "    GroupID=1\n    GroupID=2 # here\n",
     "Already defined. Duplicated definitions not allowed for GroupID (first given on line 23)"},
    {"a NUL byte on its line", CLASS + MAP + "ResourceAction\n    Name=a" + std::string(1, '\0') + "b # here\n",
     "NUL character in source"},
    {"a stanza header ending like another message", CLASS + MAP + "Bogus: invalid property # here\n",
     "Invalid table name: Bogus: invalid property: no such stanza type (statements must be indented)"},
    {"lines counted in pieces of 254 characters",
     "#" + std::string(253, 'x') + "  // read as a line of its own\n" + CLASS + MAP + PATTR +
         "    Properties=Nope # here\n",
     ""},
};

void PrintTo(const error_case &c, std::ostream *os) { *os << c.what; }

class Error : public ::testing::TestWithParam<error_case> {};

TEST_P(Error, IsLocatedAndExplained) {
    const error_case &c = GetParam();
    int line = line_of(c.source, "# here") + (c.source[0] == '#' ? 1 : 0);
    check_run r = check_text(c.source);
    EXPECT_EQ(r.status, 1);
    std::string prefix = "input.src:" + std::to_string(line) + ": error: ";
    EXPECT_EQ(r.err.rfind(prefix, 0), 0u) << r.err;
    if (!c.detail.empty()) {
        EXPECT_EQ(r.err, prefix + c.detail + "\n");
    }
}

INSTANTIATE_TEST_SUITE_P(Cases, Error, ::testing::ValuesIn(cases));

TEST(Error, IncompleteStanzaNamesItsMissingStatements) {
    // The resource attribute at line 16 lacks Id and stays open across the
    // class attribute; the next resource attribute completes it, on line 29,
    // where qecfg reports it.
    check_run r = check_text(CLASS + MAP + PATTR_HEAD + "    DataType=Int32\n    VarietyRange=1,1\n" +
                             "PersistentClassAttribute\n" + PATTR.substr(PATTR.find('\n') + 1) + PATTR);
    EXPECT_EQ(r.err,
              "input.src:29: error: Previous stanza incomplete: the PersistentResourceAttribute stanza on line 16 "
              "lacks Id\ninput.src:16: note: the incomplete PersistentResourceAttribute stanza starts here\n");
    // An action ends at the next stanza; at the end of the source the
    // structured-data element is completed first.
    r = check_text(
        CLASS + MAP + "ResourceAction\n    Name=a\n    Description=1\n    DisplayName=2\n    VarietyRange=1,1\n" +
        "ActionInSDDefinition\n    ElementName=e\n    Description=1\n    DisplayName=2\n    ElementIndex=0\n" +
        "    DataType=Int32\n");
    EXPECT_EQ(r.err, "input.src:26: error: Previous stanza incomplete: the ResourceAction stanza on line 16 lacks Id\n"
                     "input.src:16: note: the incomplete ResourceAction stanza starts here\n");
}

} // namespace
