// What the tests of modification lists share: lists from short notations, and back to text.
//
// Values are written "a|b"; "" stands for an array without values, null for no array.
#pragma once

#include <algorithm>
#include <cstdio>
#include <initializer_list>
#include <string_view>

#include "servers/vrnd/libdirbase/model/ldap_mods.h"
#include "tests/servers/vrnd/libdirbase/model/model_fixture.h"

namespace model_test {

inline std::vector<std::string> split(std::string_view list, char separator = '|')
{
    std::vector<std::string> texts;
    while (!list.empty()) {
        const std::size_t end = std::min(list.find(separator), list.size());
        texts.emplace_back(list.substr(0, end));
        list.remove_prefix(std::min(end + 1, list.size()));
    }
    return texts;
}

// A heap record; its values are bervals or texts as `op` says.
inline LDAPMod* make_mod(int op, const char* type, const char* values)
{
    LDAPMod* const mod = alloc_ldapmod();
    mod->mod_op = op;
    mod->mod_type = type == nullptr ? nullptr : strdup(type);
    if (values != nullptr) {
        const std::vector<std::string> texts = split(values);
        mod->mod_values = static_cast<char**>(std::calloc(texts.size() + 1, sizeof(char*)));
        for (std::size_t i = 0; i < texts.size(); ++i) {
            const berval value = {texts[i].size(), const_cast<char*>(texts[i].data())};
            if ((op & LDAP_MOD_BVALUES) != 0) {
                mod->mod_bvalues[i] = ber_bvdup(&value);
            } else {
                mod->mod_values[i] = strdup(texts[i].c_str());
            }
        }
    }
    return mod;
}

inline LDAPMod** make_mods(std::initializer_list<LDAPMod*> mods)
{
    auto** const array = static_cast<LDAPMod**>(std::calloc(mods.size() + 1, sizeof(LDAPMod*)));
    std::copy(mods.begin(), mods.end(), array);
    return array;
}

// "80 cn=a|b; 1 sn" with the operation in base 16; the values must be bervals.
inline std::string text_of(const LDAPMod& mod)
{
    char op[16];
    std::snprintf(op, sizeof op, "%x ", static_cast<unsigned>(mod.mod_op));
    return std::string(op) + (mod.mod_type == nullptr ? "(null)" : mod.mod_type) +
           (mod.mod_bvalues == nullptr ? "" : "=" + joined(mod.mod_bvalues));
}

inline std::string text_of_chain(const LDAPMod* first)
{
    std::string text;
    for (const LDAPMod* mod = first; mod != nullptr; mod = mod->mod_next) {
        text += (text.empty() ? "" : "; ") + text_of(*mod);
    }
    return text;
}

// The array as text, which must be that of the chain too.
inline std::string text_of_both(LDAPMod** array)
{
    std::string text;
    for (LDAPMod** mod = array; mod != nullptr && *mod != nullptr; ++mod) {
        text += (text.empty() ? "" : "; ") + text_of(**mod);
    }
    EXPECT_EQ(text, text_of_chain(array == nullptr ? nullptr : *array));
    return text;
}

// Fills an entry from "cn=a|b;sn=;mail", where `mail` never had values; and back.
inline void fill(Entry& entry, std::string_view text)
{
    for (const std::string& part : split(text, ';')) {
        const std::string name = part.substr(0, part.find('='));
        Attribute* attr = nullptr;
        EXPECT_EQ(flatattr_insert(&entry, info_of(name.c_str()), name.c_str(), &attr, nullptr), 0);
        if (name != part) {
            const value_list values(split(part.substr(name.size() + 1)));
            EXPECT_EQ(attr_merge(&entry, name.c_str(), values.get(), 1, 1, nullptr), 0);
        }
    }
}

inline std::string text_of_attributes(const Entry& entry)
{
    std::string text;
    for (const Attribute* attr = entry.e_attrs; attr != nullptr; attr = attr->a_next) {
        text += (text.empty() ? "" : ";") + std::string(attr->a_type) + "=" + joined(attr->a_vals);
    }
    return text;
}

}  // namespace model_test
