// Attribute statements: value syntax, integer conversion, properties,
// permissions, varieties and valid values, as they land in the records.
#include <gtest/gtest.h>

#include "cdb_read_support.h"
#include "compile_support.h"

namespace {

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
    read_cdb f(r.cdb);
    cdb_attr_t a;
    testing::AssertionResult found = f.attr(CDB_PATTR, 0, a);
    return found ? text_or_none(cdb_attr_name(&a)) : found.message();
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
    auto id_and_description = [](const compile_result &r) {
        read_cdb f(r.cdb);
        cdb_attr_t a;
        EXPECT_EQ(r.message, "");
        testing::AssertionResult found = f.attr(CDB_PATTR, 0, a);
        EXPECT_TRUE(found);
        return found ? std::pair(cdb_attr_id(&a), cdb_attr_field(&a, CDB_ATTR_DSCR_MSGID)) : std::pair(-1, 0u);
    };
    EXPECT_EQ(id_and_description(with("Id=0x10", "Description=abc")), std::pair(16, 0u));
    EXPECT_EQ(id_and_description(with("Id=12abc", "Description=070000")), std::pair(12, 070000u & 0xFFFF));
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
    read_cdb f(r.cdb);
    cdb_attr_t a;
    ASSERT_TRUE(f.attr(CDB_PATTR, 0, a));
    EXPECT_EQ(cdb_attr_field(&a, CDB_ATTR_GROUP_ID), 3u);
}

TEST(Statement, PropertiesAreCombined) {
    compile_result r = compile_text(pattr("", "    Properties=Public,,ReadOnly\n"));
    ASSERT_EQ(r.message, "");
    read_cdb f(r.cdb);
    cdb_attr_t a;
    ASSERT_TRUE(f.attr(CDB_PATTR, 0, a));
    EXPECT_EQ(cdb_attr_field(&a, CDB_ATTR_PROPS), 0x21u | 0x4u); // and InvalForDefine
}

TEST(Statement, VarietiesInStatementOrder) {
    compile_result r = compile_text(pattr("    VarietyRange=7,3\n"));
    ASSERT_EQ(r.message, "");
    read_cdb f(r.cdb); // the full check has seen the list's identifier word
    cdb_attr_t a;
    ASSERT_TRUE(f.attr(CDB_PATTR, 0, a));
    EXPECT_EQ(varieties_of(a), (variety_list{{1, 1}, {7, 3}}));
}

TEST(Statement, ValidValuesAndDisplayNames) {
    compile_result r = compile_text(
        pattr("", "    ValidValue=5\n    ValidValue=1,9\n    ValueDisplayName=6\n    ValueDisplayName=7\n"));
    ASSERT_EQ(r.message, "");
    read_cdb f(r.cdb);
    cdb_attr_t a;
    ASSERT_TRUE(f.attr(CDB_PATTR, 0, a));
    // A single value is both ends; the second display name wins.
    EXPECT_EQ(valid_values_of(a), (valid_list{{"5", "5", 0}, {"1", "9", 7}}));
}

std::string action(const std::string &optional) {
    return BASE_SOURCE +
           "ResourceAction\n    Name=a\n    Description=1\n    DisplayName=2\n    Id=4\n"
           "    VarietyRange=1,1\n" +
           optional;
}

// The permissions and time-out of the resource action of `optional`.
std::pair<uint32_t, uint32_t> permissions_and_timeout(const std::string &optional) {
    compile_result r = compile_text(action(optional));
    EXPECT_EQ(r.message, "");
    read_cdb f(r.cdb);
    cdb_action_t x;
    testing::AssertionResult found = f.action(0, 0, x);
    EXPECT_TRUE(found);
    return found ? std::pair(cdb_action_field(&x, CDB_ACTION_PERMS), cdb_action_field(&x, CDB_ACTION_TIMEOUT))
                 : std::pair(~0u, ~0u);
}

TEST(Statement, PermissionLooksAtTheFirstLetterOnly) {
    EXPECT_EQ(permissions_and_timeout("    Permission=xq\n").first, 0x200u);
    EXPECT_EQ(permissions_and_timeout("    Permission=rw\n").first, 0u);
    EXPECT_EQ(permissions_and_timeout("    TimeOut=30\n"), std::pair(0x40u, 30u));
}

TEST(Statement, ListActionsStoreNothing) {
    compile_result r = compile_text(pattr("", "    ListActionRsrc=x\n    ListActionClass=y\n"));
    ASSERT_EQ(r.message, "");
    EXPECT_EQ(r.cdb, compile_text(pattr("")).cdb);
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
    read_cdb f(r.cdb);
    auto range_of = [&f](int kind) -> std::string {
        cdb_attr_t a;
        cdb_value_t low, high;
        testing::AssertionResult found = f.attr(kind, 0, a);
        if (!found)
            return found.message();
        int err = cdb_attr_range(&a, &low, &high);
        return err == CDB_OK ? text_of(low) + ".." + text_of(high) : cdb_strerror(err);
    };
    EXPECT_EQ(range_of(CDB_DATTR_CLASS), "3..4");
    EXPECT_EQ(range_of(CDB_DATTR), "0..100");
}

} // namespace
