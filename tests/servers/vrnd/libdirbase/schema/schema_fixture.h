// What the schema tests share: refusals as texts, the shipped schema, and a whole schema as one text.
//
// Everything is inline, since the tests of running out of memory stand in a program of their own.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <sstream>
#include <string>
#include <string_view>
#include <typeinfo>
#include <vector>

#include "servers/vrnd/libdirbase/base/backend.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

namespace schema_test {

#define ARC "1.3.6.1.4.1.1466.115.121.1."
#define NOT_FOUND ", but could not find it at or before "

// What an action raises: "class id: text", with "@line" behind a positive id (a fault in schema text) and "(code)"
// behind a class whose code is the raiser's; empty for nothing. `arguments` takes what was logged, without empty ones
// at the end.
template <typename Action>
std::string refused(const Action& action, std::vector<std::string>* arguments = nullptr)
{
    const test_support::message_catcher log;
    try {
        action();
    } catch (const exc_t& e) {
        std::string name = typeid(e).name();
        name.erase(0, name.find("exc_"));
        const int id = e.message()->number();
        if (id != 0 && log.count() != 0 && arguments != nullptr) {
            const test_support::caught_message logged = log.messages().back();
            EXPECT_EQ(logged.component, MSG_COMPONENT_SCHEMA);
            EXPECT_EQ(logged.severity, MSG_SEVERE);
            EXPECT_EQ(logged.id, std::abs(id));
            *arguments = logged.arguments;
            while (!arguments->empty() && arguments->back().empty()) {
                arguments->pop_back();
            }
        }
        EXPECT_EQ(log.count() != 0, id != 0);
        if (id != 0) {  // the catalogue words the fault as its exception does, behind the place of one in schema text
            const auto worded = [](std::string text) {  // one id serves lists with these words and without
                constexpr std::string_view introduction = "one of the following: ";
                const std::size_t at = text.find(introduction);
                return at == text.npos ? text : text.erase(at, introduction.size());
            };
            const std::string printed = worded(e.message().printed());
            const std::string text = worded(e.message().text());
            EXPECT_TRUE(printed.ends_with(text) && (id > 0 || printed == text)) << printed << "\n" << text;
        }
        return name + (name == "exc_ldap_rc_t" ? "(" + std::to_string(e.code()) + ")" : "") + " " + std::to_string(id) +
               (id > 0 ? " @" + std::to_string(e.line()) : "") + ": " + e.message().text();
    }
    return "";
}

template <typename Action>
std::vector<std::string> logged_arguments(const Action& action)
{
    std::vector<std::string> arguments;
    refused(action, &arguments);
    return arguments;
}

// Reads one definition by T::parse_v3 and gives it back.
template <typename T>
T parsed(const std::string& text, const char* file = "test")
{
    ldcf_map_name_to<T> map;
    ldcf_token_factory factory(text.c_str(), file);
    T::parse_v3(factory, map);
    return map.begin()->second;
}

// Reads definitions, one after the other, into one map; tells the keys with their standard forms, then the fault.
template <typename T>
std::string read_all(const char* text)
{
    ldcf_map_name_to<T> map;
    ldcf_token_factory factory(text, "test");
    const std::string fault = refused([&] {
        while (!factory.empty()) {
            T::parse_v3(factory, map);
        }
    });
    std::string result;
    for (const auto& [key, definition] : map) {
        result += std::string(key) + ":" + definition.v3_string().c_str() + ";";
    }
    return result + fault;
}

// The shipped schema files in the order of the list, with full paths.
inline std::vector<std::string> shipped_files()
{
    std::vector<std::string> files;
    std::istringstream list(test_support::file_text(DIRBASE_SOURCE_SCHEMA_DIR "/schema.list"));
    for (std::string line; std::getline(list, line);) {
        if (!line.empty() && line[0] != '#') {
            files.push_back(DIRBASE_SOURCE_SCHEMA_DIR "/" + line);
        }
    }
    return files;
}

inline void load_shipped(ldcf_schema& schema)
{
    for (const std::string& file : shipped_files()) {
        schema.parse(file.c_str());
    }
}

// The shipped syntaxes and matching rules, among them all that check asks for.
inline const std::string& required_text()
{
    static const std::string text = [] {
        std::string all;
        for (const std::string& file : shipped_files()) {
            all += file.ends_with(".sx") || file.ends_with(".mr") ? test_support::file_text(file) : "";
        }
        return all;
    }();
    return text;
}

// The smallest schema with a bit of everything: a supertype, an alias, an extended definition, a tree of classes.
constexpr char small_text[] =
    "attributeTypes { ( 9.1 NAME 'objectClass' EQUALITY 2.5.13.0 SYNTAX " ARC "38 )\n"
    "( 9.2 NAME 'name' EQUALITY caseIgnoreMatch SUBSTR caseIgnoreSubstringsMatch SYNTAX " ARC "15{64} )\n"
    "( 9.3 NAME ( 'cn' 'commonName' ) SUP name ) ( 9.4 NAME 'sn' SUP 9.2 ) ( 9.5 NAME 'spare' SUP name ) }\n"
    "XANattributeTypes { ( 9.3 DBNAME ( 'cn' 'cn' ) EQUALITY 16 ) }\n"
    "objectClasses { ( 8.1 NAME 'top' ABSTRACT MUST objectClass ) ( 8.2 NAME 'person' MUST cn MAY ( sn $ name ) )\n"
    "( 8.3 NAME ( 'employee' 'worker' ) SUP person MUST sn ) }\n";

// The required definitions and the small schema, complete, with new definitions going to "home".
inline void load_small(ldcf_schema& schema, const std::string& text = small_text)
{
    schema.parse_str(required_text().c_str(), "required");
    schema.parse_str(text.c_str(), "home");
    schema.complete();
    schema.complete_db_names();
    schema.current_file = "home";
    schema.files["home"] = ldcf_schema::modified_indicator::flushed;
}

// A relational back end for as long as one lives: completing the names in the store asks for it.
class relational_store {
public:
    relational_store() { g_backends = &store_; }
    ~relational_store() { g_backends = nullptr; }
    relational_store(const relational_store&) = delete;
    relational_store& operator=(const relational_store&) = delete;

private:
    Backend store_{.be_type = "rdbm"};
};

// The names of a set of handles, sorted, with blanks between.
template <typename T>
std::string names_of(const csgl_set<T>& handles)
{
    ldcf_names names;
    for (const T& handle : handles) {
        names.insert(handle.name());
    }
    std::string text;
    for (const csgl_string& name : names) {
        text += (text.empty() ? "" : " ") + std::string(name);
    }
    return text;
}

// A definition with all that completion made of it.
inline std::string described(const ldcf_syntax& syntax)
{
    return std::string(syntax.v3_string()) + "|" + syntax->v3_file().c_str();
}
inline std::string described(const ldcf_matchrule& rule)
{
    return std::string(rule.v3_string()) + "|" + rule->v3_file().c_str() + "|" + (rule->syntax() ? "linked" : "-");
}
inline std::string described(const ldcf_attrtype& type)
{
    std::ostringstream out;
    const auto oid_of = [](const auto& handle) { return handle ? handle.oid().c_str() : "-"; };
    out << type.v3_string() << "|" << type.v3_string_inherited() << "|" << type.xan_string() << "|"
        << type->xan_string_with_default() << "|" << type->v3_file() << "|" << type->xan_file() << "|" << type->table()
        << "|" << type->column() << "|" << oid_of(type->equality_rule()) << "|" << oid_of(type->ordering_rule()) << "|"
        << oid_of(type->substr_rule()) << "|" << oid_of(type->syntax()) << "|" << oid_of(type->supertype()) << "|"
        << type->effective_length() << "|" << type->may_be_encrypted() << "|" << static_cast<int>(type->state()) << "|"
        << type->attr_id() << "|" << type->attr_class() << "|" << names_of(type->subtypes());
    return out.str();
}
inline std::string described(const ldcf_objclass& objclass)
{
    std::ostringstream out;
    out << objclass.v3_string() << "|" << objclass.v3_string_inherited() << "|" << objclass->v3_file() << "|"
        << static_cast<int>(objclass->state()) << "|" << names_of(objclass->superclasses()) << "|"
        << names_of(objclass->subclasses()) << "|" << names_of(objclass->complete_must()) << "|"
        << names_of(objclass->complete_may());
    return out.str();
}

// A whole schema: each key with its definition, and the files.
inline std::string described(const ldcf_schema& schema)
{
    std::string text;
    const auto add = [&](const auto& map) {
        for (const auto& [key, definition] : map) {
            text += std::string(key) + " -> " + described(definition) + "\n";
        }
    };
    add(schema.syntaxes);
    add(schema.matching_rules);
    add(schema.attribute_types);
    add(schema.object_classes);
    for (const auto& [file, state] : schema.files) {
        text += std::string(file) + (state == ldcf_schema::modified_indicator::flushed ? " flushed\n" : " modified\n");
    }
    return text + "current " + schema.current_file.c_str() + "\n";
}
constexpr char nothing[] = "current \n";  // the empty schema

// What stands in a folder: each name with its content.
inline std::string content_of(const std::string& folder)
{
    std::vector<std::string> entries;
    for (const auto& entry : std::filesystem::directory_iterator(folder)) {
        entries.push_back(entry.path().filename().string() + ":\n" +
                          (entry.is_directory() ? "a folder\n" : test_support::file_text(entry.path())));
    }
    std::sort(entries.begin(), entries.end());
    std::string all;
    for (const std::string& entry : entries) {
        all += entry;
    }
    return all;
}

}  // namespace schema_test
