// A source that grows every class table far past its allocation unit still
// compiles into the records and bodies it describes.
#include <gtest/gtest.h>

#include <sys/resource.h>
#include <sys/wait.h>

#include "cdb_read_support.h"
#include "output_support.h"

namespace {

std::string big_source(int attrs, int actions) {
    std::string s = BASE_SOURCE;
    for (int i = 0; i < attrs; i++) {
        std::string n = std::to_string(i);
        const char *kind = i % 2 ? "PersistentClassAttribute" : "PersistentResourceAttribute";
        s += std::string(kind) + "\n    Name=attribute_number_" + n +
             "\n    Description=1\n    DisplayName=2\n    Id=" + n + "\n    DataType=StringArray\n    VarietyRange=1," +
             n + "\n    VarietyRange=2,3\n    ValidValue=a" + n + ",b\n    ValidValue=c\n    DefaultValue=first_" + n +
             "\n    DefaultValue=second\n";
        s += "DynamicResourceAttribute\n    Name=d" + n + "\n    Description=1\n    DisplayName=2\n    Id=" + n +
             "\n    DataType=SD\n    VariableType=Quantity\n    VarietyRange=1,1\n"
             "DAttrSDDefinition\n    ElementName=e\n    Description=1\n    DisplayName=2\n    ElementIndex=0\n"
             "    DataType=Int64Array\n";
    }
    for (int i = 0; i < actions; i++)
        s += "ResourceAction\n    Name=act" + std::to_string(i) +
             "\n    Description=1\n    DisplayName=2\n    Id=1\n    VarietyRange=1,1\n"
             "ActionInSDDefinition\n    ElementName=x\n    Description=1\n    DisplayName=2\n    ElementIndex=0\n"
             "    DataType=String\n    ValidValue=v\n";
    return s;
}

TEST(Growth, EveryClassTableGrowsPastItsUnit) {
    const int attrs = 600, actions = 300;
    compile_result r = compile_text(big_source(attrs, actions));
    ASSERT_EQ(r.message, "");
    read_cdb f(r.cdb); // every table, list and body bounded by the full check
    ASSERT_TRUE(f.valid());
    EXPECT_EQ(cdb_attr_count(&f.cls(), CDB_PATTR_CLASS), uint32_t(attrs / 2));
    EXPECT_EQ(cdb_attr_count(&f.cls(), CDB_PATTR), uint32_t(attrs / 2));
    EXPECT_EQ(cdb_attr_count(&f.cls(), CDB_DATTR), uint32_t(attrs));
    EXPECT_EQ(cdb_action_count(&f.cls(), 0), uint32_t(actions));
    // The last resource persistent attribute: its name, varieties, valid
    // values and its two-element array default, all intact.
    cdb_attr_t last;
    ASSERT_TRUE(f.attr(CDB_PATTR, attrs / 2 - 1, last));
    std::string n = std::to_string(attrs - 2);
    EXPECT_EQ(text_or_none(cdb_attr_name(&last)), "attribute_number_" + n);
    EXPECT_EQ(varieties_of(last), (variety_list{{1, attrs - 2}, {2, 3}}));
    EXPECT_EQ(valid_values_of(last), (valid_list{{"\"a" + n + "\"", "\"b\"", 0}, {"\"c\"", "\"c\"", 0}}));
    EXPECT_EQ(default_of(last), "[\"first_" + n + "\", \"second\"]");
}

std::string class_attributes(int n) {
    std::string s = BASE_SOURCE;
    for (int i = 0; i < n; i++)
        s += "PersistentClassAttribute\n    Name=a\n    Description=1\n    DisplayName=2\n    Id=1\n"
             "    DataType=Int32\n    VarietyRange=1,1\n";
    return s;
}

TEST(Growth, ACountHoldsAtMost65535Records) {
    compile_result full = compile_text(class_attributes(65535));
    ASSERT_EQ(full.message, "");
    read_cdb f(full.cdb);
    ASSERT_TRUE(f.valid());
    EXPECT_EQ(cdb_attr_count(&f.cls(), CDB_PATTR_CLASS), 65535u);
    compile_result over = compile_text(class_attributes(65536));
    EXPECT_EQ(over.message, "Too many records in table: ClassPattrsC\n");
    EXPECT_EQ(over.code, 1);
    EXPECT_FALSE(over.has_output);
}

// Peak memory follows what a source holds, not how many records it has: a
// compile stays within twice its output and 32 MB, however small its records.
struct PeakMemory : output_test::OutputDir {
    long peak_kb(const std::string &source) {
        write("input.src", source);
        int status = 0;
        struct rusage ru {};
        wait4(output_test::start_qecfg(work), &status, 0, &ru);
        EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
        return ru.ru_maxrss;
    }
};

TEST_F(PeakMemory, ManySmallRecordsStayWithinTwiceTheOutput) {
#if defined(__SANITIZE_ADDRESS__)
    GTEST_SKIP() << "the sanitizer runtime's own memory hides the compiler's";
#else
    std::string bare_classes, variable_classes = BASE_SOURCE;
    for (int i = 0; i < 100000; i++)
        bare_classes += "ControlDefinition\n";
    bare_classes += BASE_SOURCE.substr(BASE_SOURCE.find("ClassToManagerMapping"));
    for (int i = 0; i < 50000; i++)
        variable_classes += "ResourceVariableClass\n    VariableClass=V" + std::to_string(i) +
                            "\n    ObservationInterval=60\n    ReportingInterval=60\n";
    for (const std::string *source : {&bare_classes, &variable_classes}) {
        long peak = peak_kb(*source);
        long bound = long(2 * output_test::fs::file_size(work / "out.cdef") / 1024) + 32 * 1024;
        EXPECT_LE(peak, bound) << output_test::fs::file_size(work / "out.cdef") << "-byte output";
    }
#endif
}

} // namespace
