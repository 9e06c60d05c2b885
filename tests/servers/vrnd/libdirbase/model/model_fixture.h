// What the tests of attributes and their values share: a schema with one attribute of each kind, and guards.
#pragma once

#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "servers/vrnd/libdirbase/base/password_values.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_index.h"
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "tests/servers/vrnd/libdirbase/schema/schema_fixture.h"

namespace model_test {

#define IGNORE_CASE " EQUALITY caseIgnoreMatch SYNTAX " ARC "15 )\n"

constexpr char schema_text[] =
    "attributeTypes { ( 2.5.4.0 NAME 'objectClass' EQUALITY objectIdentifierMatch SYNTAX " ARC "38 )\n"
    "( 2.5.4.3 NAME ( 'commonName' 'cn' )" IGNORE_CASE "( 2.5.4.4 NAME ( 'surname' 'sn' )" IGNORE_CASE
    "( 9.1 NAME 'cn1'" IGNORE_CASE "( 9.2 NAME 'a'" IGNORE_CASE "( 9.3 NAME 'B'" IGNORE_CASE
    "( 2.5.4.31 NAME 'member' EQUALITY distinguishedNameMatch SYNTAX " ARC "12 )\n"
    "( 2.5.4.50 NAME 'uniqueMember' EQUALITY distinguishedNameMatch SYNTAX " ARC "12 )\n"
    "( 9.4 NAME 'xan-allmembers' EQUALITY distinguishedNameMatch SYNTAX " ARC "12 )\n"
    "( 9.5 NAME 'ownerSource' EQUALITY distinguishedNameMatch SYNTAX " ARC "12 )\n"
    "( 9.6 NAME 'ref' EQUALITY caseExactMatch SYNTAX " ARC "15 ) ( 9.7 NAME 'cert' SYNTAX " ARC "8 )\n"
    "( 9.8 NAME 'number' EQUALITY integerMatch SYNTAX " ARC "27 ) ( 9.9 NAME 'flag' SYNTAX " ARC "7 )\n"
    "( 9.10 NAME 'time' EQUALITY generalizedTimeMatch SYNTAX " ARC "24 )\n"
    "( 9.11 NAME 'oneWay'" IGNORE_CASE "( 9.12 NAME 'twoWay'" IGNORE_CASE "( 9.13 NAME 'description'" IGNORE_CASE "}\n"
    "XANattributeTypes { ( 9.11 ENCRYPT SSHA ) ( 9.12 ENCRYPT AES-256 ) }\n";

class Model : public testing::Test {
protected:
    Model()
    {
        ldcf_api_schema_init();
        ldcf_schema_g->parse_str(schema_test::required_text().c_str(), "required");
        ldcf_schema_g->parse_str(schema_text, "home");
        ldcf_schema_g->complete_nocheck();
        EXPECT_EQ(ldcf_api_schema_complete_db_names(), 0);
        g_DirKeyData = &key_;
    }
    ~Model() override
    {
        g_DirKeyData = nullptr;
        ldcf_schema_g->clear();
    }

private:
    schema_test::relational_store store_;
    aes_key_data key_ = {32, "0123456789abcdef0123456789abcde", "salt"};
};

inline asyntaxinfo* info_of(const char* name)
{
    return ldcf_api_attr_get_info(name, nullptr);
}

// Values for a call, in blocks of their own without a byte behind them.
class value_list {
public:
    value_list(const std::vector<std::string>& texts)
    {
        for (const std::string& text : texts) {
            bytes_.emplace_back(new char[text.size()]);
            std::memcpy(bytes_.back().get(), text.data(), text.size());
            values_.push_back({text.size(), bytes_.back().get()});
        }
        for (berval& value : values_) {
            pointers_.push_back(&value);
        }
        pointers_.push_back(nullptr);
    }
    berval** get() const { return const_cast<berval**>(pointers_.data()); }

private:
    std::vector<std::unique_ptr<char[]>> bytes_;
    std::vector<berval> values_;
    std::vector<berval*> pointers_;
};

inline std::string text_of(const berval& value)
{
    return {value.bv_val, value.bv_len};
}

inline std::string joined(berval** values)
{
    std::string text;
    for (berval** value = values; value != nullptr && *value != nullptr; ++value) {
        text += (text.empty() ? "" : "|") + text_of(**value);
    }
    return text;
}

// The normal forms in a value tree, in its order; "(none)" without one.
inline std::string tree_of(const Attribute* attr)
{
    const std::unique_ptr<berval*, decltype(&std::free)> array(attr_get_normvals_array(attr), std::free);
    return array == nullptr ? "(none)" : joined(array.get());
}

// An entry that releases its attributes.
struct test_entry : Entry {
    test_entry() : Entry{} {}
    ~test_entry()
    {
        for (Attribute* attr = e_attrs; attr != nullptr;) {
            attr_free(std::exchange(attr, attr->a_next));
        }
        delete e_index;
    }
    test_entry(const test_entry&) = delete;
    test_entry& operator=(const test_entry&) = delete;

    int merge(const char* name, const std::vector<std::string>& texts, int drop_duplicates = 1, int tree_mode = 1)
    {
        return attr_merge(this, name, value_list(texts).get(), drop_duplicates, tree_mode, nullptr);
    }
    Attribute* find(const char* name) const { return attr_find(this, name, 0, nullptr); }
    std::string values(const char* name) const
    {
        const Attribute* attr = find(name);
        return attr == nullptr ? "(none)" : joined(attr->a_vals);
    }
};

inline int find_value(const Attribute* attr, const std::string& text, int normalize = 1)
{
    return value_find(attr, *value_list({text}).get(), static_cast<std::uint32_t>(attr->a_syntax), normalize);
}

inline int delete_value(Attribute* attr, const std::string& text)
{
    return delete_valuetree_value(attr, *value_list({text}).get(), static_cast<std::uint32_t>(attr->a_syntax));
}

}  // namespace model_test
