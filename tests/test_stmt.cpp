// Attribute statements: value syntax, integer conversion, properties,
// permissions, varieties and valid values, as they land in the records.
#include <gtest/gtest.h>

#include "compile_support.h"

namespace {

constexpr size_t FIRST = CLASS + sizeof(rsrc_class_t); // the first record behind the class record

std::string pattr(const std::string &extra_required, const std::string &optional = "") {
    return BASE_SOURCE +
           "PersistentResourceAttribute\n    Name=a\n    Description=1\n    DisplayName=2\n    Id=1\n"
           "    DataType=Int32\n    VarietyRange=1,1\n" +
           extra_required + optional;
}

// The attribute name that a Name statement with this text stores.
std::string stored_name(const std::string &statement) {
    std::string src = pattr("");
    src.replace(src.find("Name=a"), 6, statement);
    compile_result r = compile_text(src);
    EXPECT_EQ(r.message, "");
    return r.has_output ? class_string_at(r.cdb, u32_at(r.cdb, FIRST + 8)) : "";
}

TEST(Statement, ValueSyntax) {
    EXPECT_EQ(stored_name("Name= a b"), " a b");               // blanks after '=' are kept
    EXPECT_EQ(stored_name("Name=\"a \"b\" c\""), "a \"b\" c"); // inner quotes stay
    EXPECT_EQ(stored_name("Name=  \"x y\""), "x y");           // quotes after blanks
    EXPECT_EQ(stored_name("Name=a=b"), "a=b");                 // the first '=' ends the name
}

TEST(Statement, IntegersAreConvertedLikeStrtolInBaseZero) {
    auto with = [](const char *id, const char *descr) {
        std::string src = pattr("");
        src.replace(src.find("Id=1"), 4, id);
        src.replace(src.find("Description=1\n    DisplayName=2\n    Id"), 13, descr);
        return compile_text(src);
    };
    compile_result r = with("Id=0x10", "Description=abc");
    ASSERT_EQ(r.message, "");
    EXPECT_EQ(u32_at(r.cdb, FIRST + 32), 16u);
    EXPECT_EQ(u16_at(r.cdb, FIRST + 16), 0u);
    r = with("Id=12abc", "Description=070000");
    ASSERT_EQ(r.message, "");
    EXPECT_EQ(u32_at(r.cdb, FIRST + 32), 12u);
    EXPECT_EQ(u16_at(r.cdb, FIRST + 16), 070000 & 0xFFFF);
}

TEST(Statement, EmptyQuotedValueIsIgnored) {
    std::string src = pattr("");
    src.replace(src.find("Description=1\n    DisplayName=2\n    Id"), 13, "Description=\"\"");
    EXPECT_EQ(compile_text(src).message, "22: Previous stanza incomplete\n");
}

TEST(Statement, RequiredStatementsInAnyOrder) {
    std::string src = BASE_SOURCE + "PersistentResourceAttribute\n    Id=1\n    VarietyRange=1,1\n    DataType=Int32\n"
                                    "    DisplayName=2\n    Description=1\n    Name=a\n    GroupID=3\n";
    compile_result r = compile_text(src);
    ASSERT_EQ(r.message, "");
    EXPECT_EQ(u16_at(r.cdb, FIRST + 22), 3);
}

TEST(Statement, PropertiesAreCombined) {
    compile_result r = compile_text(pattr("", "    Properties=Public,,ReadOnly\n"));
    ASSERT_EQ(r.message, "");
    EXPECT_EQ(u32_at(r.cdb, FIRST + 4), 0x21u | 0x4u); // and InvalForDefine
}

TEST(Statement, VarietiesInStatementOrder) {
    compile_result r = compile_text(pattr("    VarietyRange=7,3\n"));
    ASSERT_EQ(r.message, "");
    size_t vl = CLASS + u32_at(r.cdb, CLASS + 128) + u32_at(r.cdb, FIRST + 40);
    EXPECT_EQ(u32_at(r.cdb, vl), 0x43444267u);
    EXPECT_EQ(u32_at(r.cdb, vl + 4), 2u);
    EXPECT_EQ(u32_at(r.cdb, vl + 8), 1u);
    EXPECT_EQ(u32_at(r.cdb, vl + 12), 1u);
    EXPECT_EQ(u32_at(r.cdb, vl + 16), 7u);
    EXPECT_EQ(u32_at(r.cdb, vl + 20), 3u);
}

TEST(Statement, ValidValuesAndDisplayNames) {
    compile_result r = compile_text(
        pattr("", "    ValidValue=5\n    ValidValue=1,9\n    ValueDisplayName=6\n    ValueDisplayName=7\n"));
    ASSERT_EQ(r.message, "");
    size_t vv = CLASS + u32_at(r.cdb, CLASS + 152) + u32_at(r.cdb, FIRST + 48);
    EXPECT_EQ(u32_at(r.cdb, vv), 0x43444235u);
    EXPECT_EQ(u32_at(r.cdb, vv + 4), 2u);
    EXPECT_EQ(u32_at(r.cdb, vv + 8), 5u);
    EXPECT_EQ(u32_at(r.cdb, vv + 16), 5u);
    EXPECT_EQ(u16_at(r.cdb, vv + 24), 0);
    EXPECT_EQ(u32_at(r.cdb, vv + 32), 1u);
    EXPECT_EQ(u32_at(r.cdb, vv + 40), 9u);
    EXPECT_EQ(u16_at(r.cdb, vv + 48), 7); // the second display name wins
}

std::string action(const std::string &optional) {
    return BASE_SOURCE +
           "ResourceAction\n    Name=a\n    Description=1\n    DisplayName=2\n    Id=4\n"
           "    VarietyRange=1,1\n" +
           optional;
}

TEST(Statement, PermissionLooksAtTheFirstLetterOnly) {
    compile_result r = compile_text(action("    Permission=xq\n"));
    ASSERT_EQ(r.message, "");
    EXPECT_EQ(u32_at(r.cdb, FIRST + 20), 0x200u);
    r = compile_text(action("    Permission=rw\n"));
    ASSERT_EQ(r.message, "");
    EXPECT_EQ(u32_at(r.cdb, FIRST + 20), 0u);
    r = compile_text(action("    TimeOut=30\n"));
    ASSERT_EQ(r.message, "");
    EXPECT_EQ(u32_at(r.cdb, FIRST + 20), 0x40u);
    EXPECT_EQ(u16_at(r.cdb, FIRST + 18), 30);
}

TEST(Statement, ListActionsStoreNothing) {
    compile_result r = compile_text(pattr("", "    ListActionRsrc=x\n    ListActionClass=y\n"));
    ASSERT_EQ(r.message, "");
    EXPECT_EQ(u32_at(r.cdb, FIRST + 24), 0u);
}

TEST(Statement, StatementAfterItsStanzaWasReplacedGoesToTheNewRecord) {
    // A dynamic class attribute's Range while a resource one is still open.
    std::string src = BASE_SOURCE +
                      "DynamicResourceAttribute\n    Name=r\n    Description=1\n    DisplayName=2\n    Id=1\n"
                      "    DataType=Int32\n    VariableType=Counter\n    VarietyRange=1,1\n"
                      "DynamicClassAttribute\n    Name=c\n    Description=1\n    DisplayName=2\n    Id=2\n"
                      "    DataType=Int32\n    VariableType=Counter\n    VarietyRange=1,1\n    Range=3,4\n";
    compile_result r = compile_text(src);
    ASSERT_EQ(r.message, "");
    size_t dattrC = CLASS + u32_at(r.cdb, CLASS + 32), dattr = CLASS + u32_at(r.cdb, CLASS + 48);
    EXPECT_EQ(u32_at(r.cdb, dattrC + 40), 3u);
    EXPECT_EQ(u32_at(r.cdb, dattrC + 48), 4u);
    EXPECT_EQ(u32_at(r.cdb, dattr + 40), 0u);
    EXPECT_EQ(u32_at(r.cdb, dattr + 48), 100u);
}

} // namespace
