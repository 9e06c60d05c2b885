// Controls in LDIF, and values from files.
#include "libraries/libldif/control_text.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>
#include <fstream>
#include <memory>
#include <string>

#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

namespace {

struct release {
    void operator()(LDAPControl* control) const { ldap_control_free(control); }
    void operator()(char* text) const { std::free(text); }
};

// "OID critical value", with marks of Base64 and URL.
std::string read(const std::string& line)
{
    int base64 = 9;
    int url = 9;
    const std::unique_ptr<LDAPControl, release> control(string2control(line.c_str(), &base64, &url));
    const std::string marks = std::string(base64 == 1 ? " b" : "") + (url == 1 ? " u" : "");
    if (control == nullptr) {
        return "(null)" + marks;
    }
    const berval& value = control->ldctl_value;
    return std::string(control->ldctl_oid) + (control->ldctl_iscritical != 0 ? " true" : " false") +
           (value.bv_val == nullptr ? "" : " [" + std::string(value.bv_val, value.bv_len) + "]") + marks;
}

std::string text_of(LDAPControl** array)
{
    const std::unique_ptr<char, release> text(control2stringarray(array));
    return text == nullptr ? "(null)" : text.get();
}

TEST(ControlText, OidCriticalityAndValueAreRead)
{
    const std::pair<const char*, const char*> table[] = {
        {"1.2.3", "1.2.3 false"},
        {"1.2.3 true\n", "1.2.3 true"},
        {" 1.2.3 false ", "1.2.3 false"},
        {"1.2.3: abc", "1.2.3 false [abc]"},
        {"1.2.3: abc def", "1.2.3 false [abc]"},
        {"1.2.3 true: abc d:e \r\n", "1.2.3 true [ abc d:e ]"},
        {"1.2.3:: YWJj", "1.2.3 false [abc] b"},
        {"1.2.3 true:: YWJj\n", "1.2.3 true [abc] b"},
        {"1.2.3 true:: Y!==", "(null) b"},
        {"1.2.3 true:", "1.2.3 true"},
        {"1.2.3:", "1.2.3 false"},
        {"1.2.3: true", "1.2.3 true"},
        {"1.2.3:< file:///", "(null) u"},
        {"1.2.3 true:<", "1.2.3 true u"},
        {"", "(null)"},
        {" : ", "(null)"},
    };
    for (const auto& [line, expected] : table) {
        EXPECT_EQ(read(line), expected) << line;
    }
    const test_support::debug_catcher log;
    int flag = 0;
    EXPECT_EQ(string2control("1.2", nullptr, &flag), nullptr);
    EXPECT_EQ(string2control(nullptr, &flag, &flag), nullptr);
    EXPECT_TRUE(log.has("string2control: invalid input data\n") && log.has("string2control: no input string\n"));
}

TEST(ControlText, ArraysAreWrittenAndReadBack)
{
    char text[] = "control: 1.2 true\ncontrol: 1.3:: AAE\n C\nno line\ncontrol: \ncontrol\ncontrol: 1.4 false: :x\n";
    LDAPControl** array = string2controlarray(nullptr, text);
    ASSERT_NE(array, nullptr);
    EXPECT_EQ(text_of(array), "control: 1.2 true\ncontrol: 1.3 false:: AAEC\n\ncontrol: 1.4 false:: IDp4\n");
    char more[] = "control: 1.5";
    array = string2controlarray(array, more);
    char nothing[] = "cn: a";
    array = string2controlarray(array, nothing);
    ASSERT_TRUE(array[3] != nullptr && array[4] == nullptr);
    EXPECT_STREQ(array[3]->ldctl_oid, "1.5");
    std::string one = text_of(array + 3);
    EXPECT_EQ(one, "control: 1.5 false\n");
    EXPECT_EQ(text_of(array + 4), "(null)");
    EXPECT_EQ(control2string(nullptr), nullptr);
    for (std::string oid : {"", "1.2\nchangetype: delete", "1.2 true", "1.2:x", "1.2\r"}) {
        const LDAPControl control = {oid.data(), {}, 0};
        const std::unique_ptr<char, release> written(control2string(&control));
        EXPECT_EQ(written != nullptr, oid.empty()) << oid;
    }
    ldap_controls_free(array);
}

TEST(ControlText, ValuesComeFromFiles)
{
    const test_support::temp_dir folder;
    const std::string path = std::string(folder.path()) + "/a b";
    std::ofstream(path) << std::string("x\0y\n", 4);
    std::string url = "file://" + path;
    url.replace(url.find(' '), 1, "%20");
    EXPECT_EQ(read("1.2 true:< " + url + "\n"), "1.2 true [" + std::string("x\0y\n", 4) + "] u");

    berval value = {7, nullptr};
    for (const char* bad :
         {"file:/x", "http:///x", "file:///%4", "file:///%zz", "file:///%00x", "file:///nowhere/x", ""}) {
        std::string text = bad;
        EXPECT_EQ(localfromfile_url(text.data(), &value), -1) << bad;
    }
    const test_support::debug_catcher log;
    EXPECT_EQ(localfromfile("/nowhere/x", &value), -1);
    EXPECT_EQ(localfromfile(std::string(folder.path()).c_str(), &value), -1);
    EXPECT_EQ(localfromfile("/dev/zero", &value), -1);
    const std::string pipe = folder.path("pipe");
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    EXPECT_EQ(localfromfile(pipe.c_str(), &value), -1);  // and doesn't wait for a writer
    EXPECT_TRUE(log.has("localfromfile: fopen error /nowhere/x\n"));
    EXPECT_EQ(value.bv_len, 7u);
    std::ofstream(path, std::ios::trunc).flush();
    EXPECT_EQ(localfromfile(path.c_str(), &value), 0);
    EXPECT_EQ(value.bv_len, 0u);
    std::free(value.bv_val);
}

}  // namespace
