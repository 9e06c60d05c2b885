// The BER of a filter tree, by hand, as a client would send it.
#pragma once

#include <string>

#include "servers/vrnd/libdirbase/model/filter.h"

namespace test_support {

inline std::string ber_value(unsigned tag, const std::string& content)
{
    std::string length;
    if (content.size() < 128) {
        length = std::string(1, static_cast<char>(content.size()));
    } else {
        length = "\x84";
        for (int shift = 24; shift >= 0; shift -= 8) {
            length += static_cast<char>(content.size() >> shift & 255);
        }
    }
    return std::string(1, static_cast<char>(tag)) + length + content;
}

inline std::string ber_string(const char* text)
{
    return ber_value(4, text);
}

inline std::string ber_of(const Filter& filter)
{
    const auto tag = static_cast<unsigned>(filter.f_choice);
    if (filter_has_list(filter.f_choice)) {
        std::string members;
        for (const Filter* child = filter.f_list; child != nullptr; child = child->f_next) {
            members += ber_of(*child);
        }
        return ber_value(tag, members);
    }
    if (filter_has_ava(filter.f_choice)) {
        const berval& value = filter.f_ava.ava_value;
        return ber_value(tag, ber_string(filter.f_ava.ava_type) + ber_value(4, {value.bv_val, value.bv_len}));
    }
    if (filter.f_choice == LDAP_FILTER_PRESENT) {
        return ber_value(tag, filter.f_type);
    }
    const filter_substrings& sub = filter.f_sub;
    std::string pieces;
    if (sub.f_sub_initial != nullptr && *sub.f_sub_initial != '\0') {
        pieces += ber_value(LDAP_SUBSTRING_INITIAL, sub.f_sub_initial);
    }
    for (char** piece = sub.f_sub_any; piece != nullptr && *piece != nullptr; ++piece) {
        pieces += ber_value(LDAP_SUBSTRING_ANY, *piece);
    }
    if (sub.f_sub_final != nullptr) {
        pieces += ber_value(LDAP_SUBSTRING_FINAL, sub.f_sub_final);
    }
    return ber_value(tag, ber_string(sub.f_sub_type) + ber_value(0x30, pieces));
}

}  // namespace test_support
