// What the tests of filter evaluation share: more kinds of attributes, filters from text, and entries.
#pragma once

#include <initializer_list>
#include <string>
#include <utility>
#include <vector>

#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/model/filter_evaluation.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "servers/vrnd/str2filter.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"

namespace model_test {

class Filters : public Model {
protected:
    Filters()
    {
        ldcf_schema_g->parse_str("attributeTypes { ( 9.22 NAME 'bits' SYNTAX " ARC "6 )\n"
                                 "( 9.23 NAME 'digits' SYNTAX " ARC "36 )\n"
                                 "( 9.20 NAME 'tel' EQUALITY telephoneNumberMatch SYNTAX " ARC "50 )\n"
                                 "( 9.21 NAME 'utc' SYNTAX " ARC "53 ) }\n"
                                 "objectClasses { ( 8.1 NAME 'top' ABSTRACT MUST objectClass )\n"
                                 "( 8.3 NAME ( 'employee' 'worker' ) SUP top ) }\n",
                                 "more");
        ldcf_schema_g->complete_nocheck();
        EXPECT_EQ(ldcf_api_schema_complete_db_names(), 0);
        set_g_language_tags_enabled(1);
    }
    ~Filters() override { set_g_language_tags_enabled(0); }
};

inline filter_guard filter_of(const std::string& text, int normalize = 1)
{
    filter_guard filter(str2filter(text.c_str(), normalize));
    EXPECT_NE(filter, nullptr) << text;
    return filter;
}

inline int evaluate(const Entry& entry, const std::string& text)
{
    return test_filter(&entry, filter_of(text).get());
}

using attribute_values = std::pair<const char*, std::vector<std::string>>;

// An entry whose values are unchecked and in arrays only, or with value trees as well.
struct filled_entry : test_entry {
    filled_entry(std::initializer_list<attribute_values> attributes, bool trees = false)
    {
        for (const auto& [name, values] : attributes) {
            EXPECT_EQ(merge(name, values, 0, trees ? 1 : 0), 0) << name;
        }
    }
};

// Two kinds of attribute encrypted one way, in stored form.
inline void add_passwords(test_entry& entry)
{
    for (const auto& [name, text] : {std::pair("oneWay", "SECRET"), std::pair("oneWay;lang-en", "OTHER")}) {
        EXPECT_EQ(entry.merge(name, {"first", text}), 0);
        EXPECT_EQ(attr_encode_attribute(entry.find(name)), 0);
    }
}

// All that an entry holds, as text: what a test must not change.
inline std::string described(const Entry& entry)
{
    std::string text;
    for (const Attribute* attr = entry.e_attrs; attr != nullptr; attr = attr->a_next) {
        text += std::string(attr->a_type) + "=" + joined(attr->a_vals) + "/" + joined(attr->a_decoded) + "/" +
                tree_of(attr) + "\n";
    }
    return text;
}

inline std::string described(const Filter* filter)
{
    const heap_text text(filter2str(filter));
    return text == nullptr ? "(none)" : text.get();
}

}  // namespace model_test
