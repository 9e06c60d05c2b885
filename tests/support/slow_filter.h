// Evaluating filters once more, slow and obvious: what the tests and the fuzzer compare the library with.
//
// It shares with the library what is below the level of filters: the schema, normal forms, and the comparison of two
// values or nodes. Object classes go by the name that is asserted.
#pragma once

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <regex>
#include <string>
#include <vector>

#include <strings.h>

#include "servers/vrnd/libdirbase/base/password_values.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_ids.h"
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/filter.h"
#include "servers/vrnd/libdirbase/model/value_compare.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace test_support {

// ---- texts ----------------------------------------------------------------------------------------------------------

inline std::string slow_text(const char* bytes, std::size_t length)
{
    const std::string text = bytes == nullptr ? "" : std::string(bytes, length);
    return text.substr(0, text.find('\0'));
}

// Whether a text can be cut into the pieces of a pattern, of which "any" stands for any bytes: all ways of cutting are
// tried, with those that led nowhere noted.
class slow_pattern {
public:
    slow_pattern(const char* initial, char* const* any, const char* final)
    {
        add(initial == nullptr ? "" : initial);
        wild_.push_back(true);
        signs_.push_back('\0');
        bool fits = reserve(initial, "^", "");
        for (; any != nullptr && *any != nullptr; ++any) {
            fits = fits && reserve(*any, ".*", "");
            add(*any);
            wild_.push_back(true);
            signs_.push_back('\0');
        }
        add(final == nullptr ? "" : final);
        fits_ = fits && reserve(final, ".*", "$");
    }

    // Whether the pattern, written out for an engine, has the room that it may take.
    bool fits() const { return fits_; }

    bool matches(const std::string& text) const
    {
        std::vector<std::vector<bool>> failed(signs_.size() + 1, std::vector<bool>(text.size() + 1));
        return matches_from(text, 0, 0, failed);
    }

private:
    void add(const std::string& piece)
    {
        signs_ += piece;
        wild_.resize(signs_.size(), false);
    }

    bool reserve(const char* piece, const char* before, const char* behind)
    {
        if (piece == nullptr) {
            return true;
        }
        if (written_.size() + 2 * std::strlen(piece) + 2 > 1022) {
            return false;
        }
        static const std::regex special(R"([$*+.\[\\\]^])");
        written_ += before + std::regex_replace(std::string(piece), special, "\\$&") + behind;
        return true;
    }

    bool matches_from(const std::string& text, std::size_t sign, std::size_t at,
                      std::vector<std::vector<bool>>& failed) const
    {
        if (failed[sign][at]) {
            return false;
        }
        bool found = false;
        if (sign == signs_.size()) {
            found = at == text.size();
        } else if (wild_[sign]) {
            found = matches_from(text, sign + 1, at, failed) ||
                    (at < text.size() && matches_from(text, sign, at + 1, failed));
        } else {
            found = at < text.size() && text[at] == signs_[sign] && matches_from(text, sign + 1, at + 1, failed);
        }
        failed[sign][at] = !found;
        return found;
    }

    std::string signs_;
    std::vector<bool> wild_;  // which of them stand for any bytes
    std::string written_;
    bool fits_ = false;
};

// The published Soundex coding, by its groups of letters.
inline std::string slow_phonetic(const std::string& text)
{
    static const char* const groups[] = {"AEIOUHWY", "BFPV", "CGJKQSXZ", "DT", "L", "MN", "R"};
    std::string letters;
    std::string digits;
    for (char c : text) {
        c = c >= 'a' && c <= 'z' ? static_cast<char>(c - 32) : c;
        for (std::size_t group = 0; group < std::size(groups); ++group) {
            if (c != '\0' && std::strchr(groups[group], c) != nullptr) {
                letters += c;
                digits += static_cast<char>('0' + group);
            }
        }
    }
    if (letters.empty()) {
        return "Z000";
    }
    digits.erase(std::unique(digits.begin(), digits.end()), digits.end());
    digits.erase(0, 1);
    digits.erase(std::remove(digits.begin(), digits.end(), '0'), digits.end());
    return letters.substr(0, 1) + (digits + "000").substr(0, 3);
}

// ---- filters --------------------------------------------------------------------------------------------------------

class slow_filter {
public:
    explicit slow_filter(const Entry& entry) : entry_(entry) {}

    int test(const Filter* filter) const
    {
        if (filter == nullptr) {
            return 1;
        }
        switch (filter->f_choice) {
        case LDAP_FILTER_AND: return test_all(filter->f_list);
        case LDAP_FILTER_OR: return test_any(filter->f_list);
        case LDAP_FILTER_NOT: {
            const int result = test(filter->f_list);
            return result > 0 ? result : result == 0 ? -1 : 0;
        }
        case LDAP_FILTER_PRESENT: return versions(filter->f_type).empty() ? -1 : 0;
        case LDAP_FILTER_EQUALITY: return test_equality(filter->f_ava);
        case LDAP_FILTER_GE:
        case LDAP_FILTER_LE: return test_order(filter->f_ava, filter->f_choice == LDAP_FILTER_GE);
        case LDAP_FILTER_APPROX: return test_sound(filter->f_ava);
        case LDAP_FILTER_SUBSTRINGS: return test_substrings(filter->f_sub);
        default: return 1;
        }
    }

private:
    using records = std::vector<const Attribute*>;

    int test_all(const Filter* child) const
    {
        if (child == nullptr) {
            return -1;
        }
        const int result = test(child);
        return result != 0 || child->f_next == nullptr ? result : test_all(child->f_next);
    }

    int test_any(const Filter* child) const
    {
        if (child == nullptr) {
            return -1;
        }
        const int result = test(child);
        return result != -1 ? result : test_any(child->f_next);
    }

    static std::string tag_of(const std::string& name)
    {
        const std::size_t at = name.rfind(';');
        const std::string tag = at == std::string::npos ? "" : name.substr(at + 1);
        return strcasecmp(tag.c_str(), "binary") == 0 ? "" : tag;
    }

    static bool is_valid(const std::string& tag)
    {
        static const std::regex form("lang-[a-z]+(-[a-z0-9]+)*", std::regex::icase);
        return tag.size() <= 240 && std::regex_match(tag, form);
    }

    // The version without a tag, then the others in their order; of these one only for a name with a tag. The entry
    // keeps but one record at hand of an attribute of classes or members, which a tag doesn't choose from.
    records versions(const char* name) const
    {
        const asyntaxinfo* const info = ldcf_api_attr_get_info(name, nullptr);
        records all;
        for (const Attribute* attr = entry_.e_attrs; attr != nullptr && info != nullptr; attr = attr->a_next) {
            if (attr->a_info == info) {
                all.push_back(attr);
            }
        }
        std::stable_partition(all.begin(), all.end(), [](const Attribute* a) { return tag_of(a->a_type).empty(); });
        const std::string tag = name == nullptr ? "" : tag_of(name);
        if (all.empty() || !is_valid(tag)) {
            return all;
        }
        const std::int32_t at_hand[] = {attr_id_objectclass, attr_id_member, attr_id_uniquemember, attr_id_allmembers};
        if (std::find(std::begin(at_hand), std::end(at_hand), info->attr_id) != std::end(at_hand)) {
            return {all.front()};
        }
        all.erase(
            std::remove_if(all.begin(), all.end(),
                           [&](const Attribute* a) { return strcasecmp(tag_of(a->a_type).c_str(), tag.c_str()) != 0; }),
            all.end());
        return all;
    }

    static std::uint32_t syntax_of(const char* name)
    {
        const asyntaxinfo* const info = ldcf_api_attr_get_info(name, nullptr);
        return info == nullptr ? SC_CIS : info->syntax;
    }

    static std::uint32_t syntax_of(const Attribute& attr) { return static_cast<std::uint32_t>(attr.a_syntax); }

    static std::vector<berval> values(berval* const* array)
    {
        std::vector<berval> all;
        for (; array != nullptr && *array != nullptr; ++array) {
            all.push_back(**array);
        }
        return all;
    }

    static bool is_text(std::uint32_t syntax) { return (syntax & (SC_BIN | SC_BOOL | SC_INT | SC_GT | SC_UTCT)) == 0; }

    int test_equality(const ava& wanted) const
    {
        if ((syntax_of(wanted.ava_type) & SC_BIN) != 0) {
            return 92;
        }
        if (wanted.ava_type == nullptr) {
            return 1;
        }
        for (const Attribute* attr : versions(wanted.ava_type)) {
            const int encryption = attr->a_info->encryption;
            if (encryption != 1 && (encryption & 0x80) == 0) {
                return has_password(*attr, wanted.ava_value) ? 0 : -1;
            }
            const int result = attr->a_tree != nullptr
                                   ? test_in_tree(*attr, wanted.ava_value)
                                   : test_in_array(*attr, wanted.ava_value, (encryption & 0x80) != 0);
            if (result != -1) {
                return result;
            }
        }
        return -1;
    }

    static bool has_password(const Attribute& attr, const berval& password)
    {
        const std::vector<berval> stored = values(attr.a_vals);
        return std::any_of(stored.begin(), stored.end(), [&](const berval& value) {
            return verify_password(&password, &value, 1, g_DirKeyData) == 0;
        });
    }

    // What a tree holds are the normal forms of all values that have one.
    static int test_in_tree(const Attribute& attr, const berval& wanted)
    {
        const auto node_of = [&](const berval& value, int normalize) {
            AttrvalsNorm* node = nullptr;
            create_normalized_berval_in_attrvalsNorm(&node, &value, syntax_of(attr), normalize);
            return std::unique_ptr<AttrvalsNorm, decltype(&free_AttrvalsNorm)>(node, free_AttrvalsNorm);
        };
        // A normal form that can't be normalised once more is looked for as it is; only of the digits of a bit string
        // it is plain that they are one.
        auto node = node_of(wanted, 1);
        int otherwise = -1;
        if (node == nullptr) {
            const std::string text(wanted.bv_val, wanted.bv_len);
            const bool digits = syntax_of(attr) == (SC_CIS | SC_BIT_STRING) && !text.empty() &&
                                text.find_first_not_of("01") == text.npos;
            otherwise = digits ? -1 : 1;
            node = node_of(wanted, 0);
        }
        if (node == nullptr) {
            return 1;
        }
        for (const berval& value : values(attr.a_vals)) {
            const auto other = node_of(value, 1);
            if (other != nullptr && value_cmp_fast(node.get(), other.get()) == 0) {
                return 0;
            }
        }
        return otherwise;
    }

    static int test_in_array(const Attribute& attr, const berval& wanted, bool two_way)
    {
        for (const berval& value : values(two_way && attr.a_decoded != nullptr ? attr.a_decoded : attr.a_vals)) {
            if (value_cmp(&value, &wanted, syntax_of(attr), 1) == 0) {
                return 0;
            }
        }
        return -1;
    }

    int test_order(const ava& wanted, bool greater) const
    {
        const std::uint32_t syntax = syntax_of(wanted.ava_type);
        if ((syntax & SC_BIN) != 0) {
            return 92;
        }
        if ((syntax & SC_BOOL) != 0) {
            return 87;
        }
        if (wanted.ava_type == nullptr) {
            return 1;
        }
        for (const Attribute* attr : versions(wanted.ava_type)) {
            for (const berval& value : values(attr->a_vals)) {
                const int order = value_cmp(&value, &wanted.ava_value, syntax_of(*attr), 1);
                if (greater ? order >= 0 : order <= 0) {
                    return 0;
                }
            }
        }
        return -1;
    }

    int test_sound(const ava& wanted) const
    {
        if (!is_text(syntax_of(wanted.ava_type))) {
            return 87;
        }
        if (wanted.ava_type == nullptr) {
            return 1;
        }
        const std::string code = slow_phonetic(slow_text(wanted.ava_value.bv_val, wanted.ava_value.bv_len));
        for (const Attribute* attr : versions(wanted.ava_type)) {
            for (const berval& value : values(attr->a_vals)) {
                if (slow_phonetic(slow_text(value.bv_val, value.bv_len)) == code) {
                    return 0;
                }
            }
        }
        return -1;
    }

    int test_substrings(const filter_substrings& wanted) const
    {
        if (!is_text(syntax_of(wanted.f_sub_type))) {
            return 87;
        }
        if (wanted.f_sub_type == nullptr) {
            return 1;
        }
        const slow_pattern pattern(wanted.f_sub_initial, wanted.f_sub_any, wanted.f_sub_final);
        for (const Attribute* attr : versions(wanted.f_sub_type)) {
            if (!pattern.fits()) {
                return 1;
            }
            for (const berval& value : values(attr->a_vals)) {
                char* copy = strdup(slow_text(value.bv_val, value.bv_len).c_str());
                value_normalize(&copy, syntax_of(*attr));
                const std::string text = copy;
                std::free(copy);
                if (pattern.matches(text)) {
                    return 0;
                }
            }
        }
        return -1;
    }

    const Entry& entry_;
};

// What test_filter has to give for an entry.
inline int slow_test_filter(const Entry& entry, const Filter* filter)
{
    return slow_filter(entry).test(filter);
}

}  // namespace test_support
