// A source that grows every class table far past its allocation unit still
// compiles into the records and bodies it describes.
#include <gtest/gtest.h>

#include <sys/resource.h>
#include <sys/wait.h>

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
    const std::string &b = r.cdb;
    const size_t cls = CLASS;
    EXPECT_EQ(u16_at(b, cls + 168), attrs / 2); // class persistent attributes
    EXPECT_EQ(u16_at(b, cls + 172), attrs / 2); // resource persistent attributes
    EXPECT_EQ(u16_at(b, cls + 174), attrs);     // resource dynamic attributes
    EXPECT_EQ(u16_at(b, cls + 178), actions);
    size_t strings = cls + u32_at(b, cls + 160);
    size_t vl = cls + u32_at(b, cls + 128), vv = cls + u32_at(b, cls + 152);
    // The last resource persistent attribute: its name, varieties, valid
    // values and its two-element array default, all intact.
    size_t last = cls + u32_at(b, cls + 40) + 72 * size_t(attrs / 2 - 1);
    std::string n = std::to_string(attrs - 2);
    EXPECT_STREQ(b.c_str() + strings + u32_at(b, last + 8), ("attribute_number_" + n).c_str());
    size_t list = vl + u32_at(b, last + 40);
    EXPECT_EQ(u32_at(b, list + 4), 2u);
    EXPECT_EQ(u32_at(b, list + 12), uint32_t(attrs - 2));
    size_t vals = vv + u32_at(b, last + 48);
    EXPECT_EQ(u32_at(b, vals + 4), 2u);
    EXPECT_STREQ(b.c_str() + strings + u32_at(b, vals + 8), ("a" + n).c_str());
    EXPECT_STREQ(b.c_str() + strings + u32_at(b, vals + 8 + 24 + 8), "c");
    size_t array = strings + u32_at(b, last + 24);
    EXPECT_EQ(u32_at(b, array), 2u);
    EXPECT_STREQ(b.c_str() + strings + u32_at(b, array + 8), ("first_" + n).c_str());
    EXPECT_STREQ(b.c_str() + strings + u32_at(b, array + 16), "second");
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
    EXPECT_EQ(u16_at(full.cdb, CLASS + offsetof(rsrc_class_t, rc_num_pattrsC)), 65535);
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
