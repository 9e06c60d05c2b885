// Values between the clear and their stored form.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <initializer_list>
#include <string>
#include <vector>

#include "servers/vrnd/libdirbase/base/password_values.h"
#include "tests/support/message_catcher.h"

using test_support::debug_catcher;

namespace {

// A null-terminated array of values that goes with its owner.
class value_array {
public:
    value_array(std::initializer_list<std::string> texts)
    {
        for (const std::string& text : texts) {
            const berval value = {text.size(), const_cast<char*>(text.data())};
            values_.push_back(ber_bvdup(&value));
        }
        values_.push_back(nullptr);
    }
    ~value_array()
    {
        for (berval* value : values_)
            ber_bvfree(value);
    }
    berval** get() { return values_.data(); }
    std::string text(std::size_t i) const { return {values_[i]->bv_val, values_[i]->bv_len}; }
    int method(std::size_t i) const { return check_format(values_[i]->bv_val, values_[i]->bv_len); }

private:
    std::vector<berval*> values_;
};

class PasswordValues : public testing::Test {
protected:
    PasswordValues() { g_DirKeyData = &key_; }
    ~PasswordValues() override { g_DirKeyData = nullptr; }

    aes_key_data key_ = {32, {1}, {2}};
    aes_key_data other_key_ = {32, {3}, {4}};
};

TEST_F(PasswordValues, OnlyClearValuesAreEncodedAndTwoWayOnesComeBack)
{
    for (const int method : {PWD_SHA, PWD_SSHA, PWD_AES128, PWD_AES256}) {
        value_array values = {"one", "{SHA}abc", std::string("t\0wo", 4), "{AES192}broken", ""};
        EXPECT_EQ(value_encode_values(method, values.get(), 1, nullptr), 0);
        EXPECT_EQ(values.text(1), "{SHA}abc");
        EXPECT_EQ(values.text(3), "{AES192}broken");
        for (const std::size_t i : {0u, 2u, 4u}) {
            EXPECT_EQ(values.method(i), method);
            EXPECT_EQ(std::strlen(values.get()[i]->bv_val), values.get()[i]->bv_len);
        }
        const std::string first = values.text(0);
        EXPECT_EQ(value_decode_values(values.get()), 0);
        const bool two_way = (method & PWD_TWO_WAY) != 0;
        EXPECT_EQ(values.text(0), two_way ? "one" : first);
        EXPECT_EQ(values.text(2) == std::string("t\0wo", 4), two_way);
        EXPECT_EQ(values.text(3), "{AES192}broken");
        EXPECT_EQ(values.text(4).empty(), two_way);
    }
}

TEST_F(PasswordValues, TheOldTextGoesOnlyWhenItShouldAndANewOneIsThere)
{
    value_array kept = {"secret"};
    char* old_text = kept.get()[0]->bv_val;
    EXPECT_EQ(value_encode_values(PWD_SHA, kept.get(), 0, nullptr), 0);
    EXPECT_STREQ(old_text, "secret");
    std::free(old_text);

    g_DirKeyData = nullptr;  // nothing can be made
    const debug_catcher debug;
    value_array values = {"secret", "{SHA}x"};
    berval* value = values.get()[0];
    old_text = value->bv_val;
    EXPECT_EQ(value_encode_one_value(PWD_AES256, value, value, nullptr), 0);
    EXPECT_EQ(value_encode_values(PWD_AES256, values.get(), 1, nullptr), 0);
    EXPECT_TRUE(debug.has("Error - value_encode_values: value stays in the clear, no text by method 133\n"));
    EXPECT_EQ(value->bv_val, old_text);
    EXPECT_STREQ(old_text, "secret");

    berval out = {7, const_cast<char*>("rubbish")};
    EXPECT_EQ(value_encode_one_value(PWD_AES256, value, &out, nullptr), 0);
    EXPECT_EQ(out.bv_val, nullptr);

    // A given key stands in front of the server's.
    g_DirKeyData = &key_;
    EXPECT_EQ(value_encode_one_value(PWD_AES256, value, value, &other_key_), 0);
    const std::string stored = values.text(0);
    EXPECT_EQ(value_decode_values(values.get()), 0);
    EXPECT_EQ(values.text(0), stored);
    g_DirKeyData = &other_key_;
    EXPECT_EQ(value_decode_values(values.get()), 0);
    EXPECT_EQ(values.text(0), "secret");
}

TEST_F(PasswordValues, ClearTextAndCryptAreNoEncodings)
{
    value_array values = {"secret"};
    EXPECT_EQ(value_encode_one_value(PWD_NONE, values.get()[0], values.get()[0], nullptr), 80);
    EXPECT_EQ(value_encode_values(PWD_NONE, values.get(), 1, nullptr), 0);
    EXPECT_EQ(value_encode_values(PWD_CRYPT, values.get(), 1, nullptr), 80);
    EXPECT_EQ(values.text(0), "secret");
}

}  // namespace
