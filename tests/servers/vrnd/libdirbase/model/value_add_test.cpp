// Value arrays and value trees: against sets of slowly normalised texts, and the rules for encrypted attributes.
#include "servers/vrnd/libdirbase/model/value_add.h"

#include <algorithm>
#include <cctype>
#include <random>
#include <set>

#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"

using model_test::delete_value;
using model_test::find_value;
using model_test::joined;
using model_test::test_entry;
using model_test::tree_of;
using model_test::value_list;
using test_support::debug_catcher;

namespace {

class ValueTree : public model_test::Model {};
class ValueAdd : public model_test::Model {};

std::string encoded(const std::string& text, int method = PWD_AES256)
{
    berval out = {};
    EXPECT_EQ(value_encode_one_value(method, *value_list({text}).get(), &out, nullptr), 0);
    const std::string result = model_test::text_of(out);
    std::free(out.bv_val);
    return result;
}

// A value and its normal form, made without the code under test.
struct sample {
    std::string text;
    std::string key;
};

sample random_sample(const std::string& name, std::mt19937& random)
{
    const int number = static_cast<int>(random() % 60);
    const auto digits = std::to_string(number);
    const bool upper = random() % 2 == 0;
    if (name == "number") {
        const std::string text = number % 3 == 0 ? "-" + digits : (upper ? "+" : "0") + digits;
        return {text, std::to_string(number % 3 == 0 ? -number : number)};
    }
    if (name == "time") {
        const std::string minute = std::to_string(100 + number).substr(1);
        return {"202401011" + std::string(upper ? "0" : "1") + minute + "00" + (upper ? "Z" : "+0100"), minute};
    }
    if (name == "member") {
        const std::string text = upper ? "CN = V" + digits + " ; sn=x" : "commonname=v" + digits + ",2.5.4.4=X";
        return {text, digits};
    }
    const std::string text = (upper ? "A b" : "a B") + digits;
    std::string key = text;
    if (name == "description") {
        std::transform(key.begin(), key.end(), key.begin(), [](unsigned char c) { return std::toupper(c); });
    }
    return {text, key};
}

TEST_F(ValueTree, AgreesWithSetsOfSlowlyNormalisedTexts)
{
    std::mt19937 random(7);
    for (const std::string name : {"description", "ref", "member", "number", "time"}) {
        for (const bool drop : {true, false}) {
            test_entry entry;
            std::int64_t in_array = 0;
            std::set<std::string> in_tree;  // normal forms
            for (int i = 0; i < 3000; ++i) {
                const sample value = random_sample(name, random);
                Attribute* attr = entry.find(name.c_str());
                if (random() % 3 != 0 || attr == nullptr) {
                    const sample second = random_sample(name, random);
                    ASSERT_EQ(entry.merge(name.c_str(), {value.text, second.text}, drop ? 1 : 0), 0);
                    for (const sample& added : {value, second}) {
                        in_array += in_tree.insert(added.key).second || !drop ? 1 : 0;
                    }
                } else {
                    ASSERT_EQ(delete_value(attr, value.text), 0);
                    in_tree.erase(value.key);
                }
                attr = entry.find(name.c_str());
                const sample wanted = random_sample(name, random);
                const int expected = in_tree.count(wanted.key) != 0 ? 0 : (attr->a_tree == nullptr ? -1 : 1);
                ASSERT_EQ(find_value(attr, wanted.text), expected) << name << " " << wanted.text;
                ASSERT_EQ(attr->a_numvals, in_array);  // the array keeps what the tree loses
            }
        }
    }
}

TEST_F(ValueAdd, WhatGoesIntoArrayAndTree)
{
    struct {
        const char* name;
        std::vector<std::string> first, second;
        int drop, mode, result;
        const char* array;
        const char* tree;  // null: not looked at
    } const table[] = {
        {"cn", {"abc"}, {"ABC", "d", "D"}, 1, 1, 0, "abc|d", "ABC|D"},
        {"cn", {"abc"}, {"ABC", "d", "D"}, 0, 1, 0, "abc|ABC|d|D", "ABC|D"},
        {"cn", {"abc"}, {"ABC", "d"}, 0, 0, 0, "abc|ABC|d", "(none)"},
        {"none", {"abc"}, {"ABC"}, 1, 1, 0, "abc", "ABC"},
        {"member", {"cn=a"}, {"cn=\"b,;+\"", "CN=A"}, 1, 1, 0, "cn=a|cn=\"b,;+\"", "CN=A|CN=B\\,\\;\\+"},
        {"member", {"cn=a"}, {"cn=b", "bad"}, 1, 1, 34, "cn=a", "CN=A"},
        {"member", {"cn=a"}, {"bad"}, 1, 0, 34, "cn=a", "CN=A"},
        {"number", {"2147483647"}, {"-2147483648", "+1", "01", "-1"}, 1, 1, 0, "2147483647|-2147483648|+1|-1", nullptr},
        {"number", {"1"}, {"2", "x"}, 0, 1, 21, "1", nullptr},
        {"flag", {"true"}, {"TRUE", "FALSE"}, 1, 1, 0, "true|FALSE", nullptr},
        {"cert", {"ab"}, {"cd", "ab", "AB", "abc"}, 1, 1, 0, "ab|cd|AB|abc", nullptr},
        {"cn", {}, {}, 0, 0, 0, "", "(none)"},
        {"cn", {std::string("a\0b", 3)}, {"a"}, 1, 1, 0, nullptr, "A"},
        {"ownerSource", {"default"}, {"default"}, 1, 1, 0, "default", "default"},
        {"ownerSource", {"cn=a"}, {"cn=b", "default"}, 1, 1, 34, "cn=a", "CN=A"},
    };
    for (const auto& row : table) {
        test_entry entry;
        ASSERT_EQ(entry.merge(row.name, row.first), 0);
        EXPECT_EQ(entry.merge(row.name, row.second, row.drop, row.mode), row.result) << row.name;
        const Attribute* attr = entry.e_attrs;
        EXPECT_EQ(joined(attr->a_vals), row.array == nullptr ? row.first[0] : row.array) << row.name;
        EXPECT_EQ(attr->a_vals[attr->a_numvals], nullptr);
        if (row.tree != nullptr) {
            EXPECT_EQ(tree_of(attr), row.tree) << row.name;
        }
    }
}

TEST_F(ValueAdd, ATreeIsBuiltOverValuesThatCameWithoutOneAndIsNeverIncomplete)
{
    test_entry entry;
    ASSERT_EQ(entry.merge("member", {"cn=b", "bad", "CN=B"}, 0, 0), 0);
    const Attribute* attr = entry.find("member");
    EXPECT_EQ(find_value(attr, "cn=b"), -1);
    ASSERT_EQ(entry.merge("member", {"cn=a", "commonName=b"}), 0);
    EXPECT_EQ(joined(attr->a_vals), "cn=b|bad|CN=B|cn=a");
    EXPECT_EQ(tree_of(attr), "CN=A|CN=B");
    ASSERT_EQ(entry.merge("member", {"cn=c"}, 0, 0), 0);
    EXPECT_EQ(tree_of(attr), "(none)");
}

TEST_F(ValueAdd, ArraysGrowByTheirRules)
{
    test_entry entry;
    const std::vector<std::pair<std::size_t, std::int64_t>> steps = {
        {0, 1}, {1, 3}, {1, 3}, {1, 7}, {3, 7}, {1, 15}, {10000 - 7, 20001}, {10000, 20001}, {1, 30002}};
    for (const auto& [count, capacity] : steps) {
        for (const char* name : {"cn", "sn"}) {
            const std::vector<std::string> values(count, "x");
            ASSERT_EQ(entry.merge(name, values, 0, name[0] == 'c' ? 0 : 1), 0);
            EXPECT_EQ(entry.find(name)->a_maxvals, capacity) << name << " " << entry.find(name)->a_numvals;
        }
    }
    Attribute* fast = nullptr;
    std::int64_t capacity = 0;
    std::int64_t total = 0;
    const value_list values(std::vector<std::string>(6, "x"));
    for (const auto& [count, expected] : {std::pair(1, 2), std::pair(1, 4), std::pair(1, 4), std::pair(6, 16)}) {
        ASSERT_EQ(attr_merge_fast(&entry, "description", values.get(), total, count, &capacity, &fast, nullptr), 0);
        total += count;
        EXPECT_TRUE(capacity == expected && fast->a_maxvals == expected && fast->a_numvals == total) << total;
    }
    EXPECT_EQ(fast, entry.find("description"));
    EXPECT_EQ(joined(fast->a_vals), "x|x|x|x|x|x|x|x|x");
}

TEST_F(ValueAdd, ValuesOfEncryptedAttributes)
{
    const std::string secret = encoded("Secret");
    const std::string hashed = encoded("x", PWD_SSHA);
    std::string damaged = secret;
    damaged[20] = damaged[20] == 'A' ? 'B' : 'A';
    struct {
        const char* name;
        std::vector<std::string> values;
        int drop, mode;
        std::string array, tree;
    } const table[] = {
        {"oneWay", {"Ab", "aB", hashed, hashed}, 1, 1, "AB|" + hashed, "(none)"},
        {"oneWay", {"Ab", "aB", hashed, hashed}, 0, 1, "AB|AB|" + hashed + "|" + hashed, "(none)"},
        {"twoWay", {"Ab", "aB", secret, secret, ""}, 1, 1, "Ab|" + secret + "|", "(none)"},
        {"twoWay", {"Ab", secret, "SECRET"}, 1, 2, "Ab|Secret", "AB|SECRET"},
        {"twoWay", {damaged, "ab", damaged, "AB"}, 1, 2, damaged + "|ab", "AB"},
    };
    for (const auto& row : table) {
        test_entry entry;
        ASSERT_EQ(entry.merge(row.name, row.values, row.drop, row.mode), 0);
        EXPECT_EQ(entry.values(row.name) + " " + tree_of(entry.find(row.name)), row.array + " " + row.tree);
    }
    const value_list given({secret, damaged, "x"});
    berval** copies = nullptr;
    ASSERT_EQ(dup_and_decode_vals(given.get(), &copies), 0);
    EXPECT_EQ(joined(copies), "Secret|" + damaged + "|x");
    EXPECT_TRUE(copies[1] == given.get()[1] && copies[2] == given.get()[2]);
    free_dup_vals(given.get(), copies);
    free_dup_vals(nullptr, nullptr);
}

TEST_F(ValueAdd, EncryptedAttributesAreDecodedAndEncodedInPlace)
{
    const std::string secret = encoded("Secret");
    test_entry entry;
    ASSERT_EQ(entry.merge("twoWay", {"Ab", secret}, 0, 0), 0);
    Attribute* attr = entry.find("twoWay");
    ASSERT_EQ(attr_create_decodedvals(attr), 0);
    EXPECT_EQ(joined(attr->a_decoded), "Ab|Secret");
    berval** const decoded = attr->a_decoded;
    EXPECT_TRUE(attr_create_decodedvals(attr) == 0 && attr->a_decoded == decoded);
    ASSERT_EQ(entry.merge("twoWay", {"c"}), 0);
    EXPECT_EQ(attr->a_decoded, nullptr);  // it would lack the new value
    ASSERT_EQ(attr_decode_and_normalize_values(attr), 0);
    EXPECT_EQ(joined(attr->a_vals) + " " + tree_of(attr), "Ab|Secret|c AB|C|SECRET");
    ASSERT_EQ(attr_encode_attribute(attr), 0);
    EXPECT_EQ(joined(attr->a_vals).find("Secret"), std::string::npos);
    ASSERT_EQ(attr_decode_and_normalize_values(attr), 0);
    EXPECT_EQ(joined(attr->a_vals), "Ab|Secret|c");

    ASSERT_EQ(entry.merge("cn", {"a"}, 0, 0), 0);
    Attribute* plain = entry.find("cn");
    EXPECT_TRUE(attr_create_decodedvals(plain) == 0 && plain->a_decoded == nullptr);
    EXPECT_TRUE(attr_decode_and_normalize_values(plain) == 0 && plain->a_tree == nullptr);
    EXPECT_TRUE(attr_encode_attribute(plain) == 0 && joined(plain->a_vals) == "a");
    Attribute unknown = {};
    EXPECT_EQ(attr_encode_attribute(&unknown), 16);
    EXPECT_EQ(attr_create_decodedvals(nullptr), 80);
}

TEST_F(ValueTree, FindingAndDeletingBesideTheTree)
{
    test_entry entry;
    ASSERT_EQ(entry.merge("cert", {"ab", "cd"}), 0);
    Attribute* cert = entry.find("cert");
    EXPECT_EQ(tree_of(cert).size(), 2u);  // one node for both, two bytes long
    EXPECT_TRUE(find_value(cert, "cd") == 0 && find_value(cert, "CD") == 1 && find_value(cert, "") == 1);
    ASSERT_EQ(entry.merge("member", {"cn=a"}), 0);
    ASSERT_EQ(entry.merge("ownerSource", {"default"}), 0);
    Attribute* member = entry.find("member");
    Attribute* source = entry.find("ownerSource");
    const debug_catcher debug;
    EXPECT_EQ(find_value(member, "bad"), -1);
    EXPECT_EQ(delete_value(member, "bad"), 34);
    EXPECT_TRUE(debug.has("Error - value_find: create_normalized_berval_in_attrvalsNorm() failed rc=34\n"));
    EXPECT_TRUE(debug.has("Error - delete_valuetree_value: create_normalized_berval_in_attrvalsNorm() failed rc=34\n"));
    EXPECT_TRUE(find_value(member, "CN=A", 0) == 0 && find_value(member, "cn=a", 0) == 1);
    EXPECT_TRUE(find_value(source, "default") == 0 && delete_value(source, "default") == 0);
    EXPECT_EQ(source->a_tree, nullptr);
    EXPECT_EQ(delete_value(source, "default"), 0);

    ASSERT_EQ(entry.merge("cn", {"Abc", ""}, 0, 0), 0);
    const Attribute* cn = entry.find("cn");
    EXPECT_TRUE(value_find_short_list(cn, "aBC", 3) == 0 && value_find_short_list(cn, "Abcd", 3) == 0);
    EXPECT_TRUE(value_find_short_list(cn, "Ab", 2) == 1 && value_find_short_list(cn, nullptr, 0) == 0);
    EXPECT_EQ(value_find_short_list(nullptr, "a", 1), 1);

    std::int64_t count = 7;
    EXPECT_EQ(create_normalized_values(0, &count, 0, 0, nullptr, nullptr, nullptr, SC_CIS, 1), 1);
    EXPECT_TRUE(debug.has("Error - create_normalized_values: create_normalized_values() NULL attr\n"));
    AttrvalsNorm* node = nullptr;
    EXPECT_EQ(create_normalized_berval_in_attrvalsNorm(&node, *value_list({"a"}).get(), SC_TEL, 1), 21);
    EXPECT_TRUE(node == nullptr && debug.has("Error - create_normalized_berval_in_attrvalsNorm: "
                                             "find_value_length() failed rc=21\n"));
}

}  // namespace
