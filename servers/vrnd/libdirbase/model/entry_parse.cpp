// Reading entries from text: see entry_text.h.
//
// Consecutive lines of one type are gathered and added at once; their record is looked for by the first of them. Values
// are gathered where they stand in the text. Those that would come out differently when added together are added one by
// one (see is_alone).
#include <array>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <string_view>
#include <strings.h>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libldif/line64.h"
#include "libraries/libldif/line_parts.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libpwd/pwd_format.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/attr_lookup.h"
#include "servers/vrnd/libdirbase/model/attr_records.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"

namespace {

bool is_digit(char c)
{
    return c >= '0' && c <= '9';
}

bool equals(const char* text, std::size_t length, std::string_view other)
{
    return length == other.size() && strncasecmp(text, other.data(), length) == 0;
}

// The upper text of a DN, the empty one for a DN that doesn't normalise; null without memory.
heap_text upper_text(const char* dn)
{
    ldap_escDN* record = dn_normalize_esc(dn);
    heap_text upper;
    if (record != nullptr && record->result == LDAP_SUCCESS) {
        upper.reset(std::exchange(record->upper, nullptr));  // saves a copy
    } else if (record != nullptr && record->result != LDAP_NO_MEMORY) {
        upper.reset(strdup(""));
    }
    free_ldap_escDN(&record);
    return upper;
}

class entry_reader {
public:
    entry_reader(Entry& entry, int check_duplicates, int normalize, bool trim)
        : entry_(entry), check_duplicates_(check_duplicates), normalize_(normalize), trim_(trim)
    {
    }

    bool read(char* text)
    {
        if (!take_id(&text)) {
            debug_error("str2entry_memberFix: returning NULL (missing newline after id)\n");
            return false;
        }
        char* const end = text + std::strlen(text);
        const bool has_markers = ldif_has_marker(text, end);  // bytes that look like them, before any is made
        ldif_line line;
        while (ldif_take_line(&text, end, line)) {
            ldif_parts parts;
            const int result =
                ldif_split_line(line.begin, line.end, LDIF_MODE_ENTRY, line.folded || has_markers, parts);
            if (result == LDIF_LINE_BAD) {
                debug_error("str2entry_memberFix: str_parse_line rc=%d\n", result);
            } else if (!take(parts)) {
                return false;
            }
        }
        if (!add_gathered()) {
            return false;
        }
        if (entry_.e_dn == nullptr) {
            debug_error("Error - str2entry_memberFix: returning NULL (entry ID=%d has NULL dn)\n", entry_.e_id);
            return false;
        }
        return true;
    }

private:
    // Takes the id line off the text, where there is one. False when nothing follows it.
    bool take_id(char** text)
    {
        if (!is_digit(**text) && !(**text == '-' && is_digit((*text)[1]))) {
            return true;
        }
        using limits = std::numeric_limits<std::int32_t>;
        const long id = std::strtol(*text, nullptr, 10);
        entry_.e_id = static_cast<std::int32_t>(id < limits::min()   ? limits::min()
                                                : id > limits::max() ? limits::max()
                                                                     : id);
        char* const end = std::strchr(*text, '\n');
        if (end == nullptr || end[1] == '\0') {
            return false;
        }
        *text = end + 1;
        return true;
    }

    bool take(const ldif_parts& parts)
    {
        if (trim_ && is_trimmed_member(parts)) {
            return true;
        }
        if (parts.type_length == 2 && equals(parts.type, 2, "dn")) {
            return take_dn(parts);
        }
        return take_value(parts);
    }

    bool is_trimmed_member(const ldif_parts& parts)
    {
        if (equals(parts.type, parts.type_length, "member")) {
            entry_.e_flag |= ENTRY_MEMBER_TRIMMED;
        } else if (equals(parts.type, parts.type_length, "uniquemember")) {
            entry_.e_flag |= ENTRY_UNIQUEMEMBER_TRIMMED;
        } else {
            return false;
        }
        return equals(parts.value, parts.length, "CN=NULL");
    }

    bool take_dn(const ldif_parts& parts)
    {
        if (entry_.e_dn != nullptr) {
            debug_error("str2entry_memberFix: entry ID=%d has multiple DNs \"%s\" and \"%s\" (second ignored)\n",
                        entry_.e_id, entry_.e_dn, parts.value);
            return true;
        }
        entry_.e_dn = strdup(parts.value);
        if (entry_.e_dn == nullptr) {
            debug_error("Error - str2entry_memberFix: strdup for e->e_dn failed.\n");
            return false;
        }
        entry_.e_norm_dn = upper_text(entry_.e_dn).release();
        if (entry_.e_norm_dn == nullptr) {
            debug_error("Error - str2entry_memberFix: returning NULL (strdup for normalized DN failed)\n");
            return false;
        }
        return true;
    }

    bool take_value(const ldif_parts& parts)
    {
        const bool same_type = attr_ != nullptr && type_length_ == parts.type_length &&
                               std::memcmp(type_, parts.type, parts.type_length) == 0;
        if (!same_type && !(add_gathered() && find_attribute(parts))) {
            return false;
        }
        const bool alone = is_alone(parts);
        if ((alone || count_ == most_gathered) && !add_gathered()) {
            return false;
        }
        values_[count_] = {parts.length, parts.value};
        pointers_[count_] = &values_[count_];
        ++count_;
        return !alone || add_gathered();
    }

    bool find_attribute(const ldif_parts& parts)
    {
        type_ = parts.type;
        type_length_ = parts.type_length;
        asyntaxinfo* info = nullptr;
        const int result = look_up(parts.type, &info);
        return merged(result != LDAP_SUCCESS ? result : attr_merge_record(entry_, type_, info, &attr_));
    }

    // A name with a language tag is looked up without it, which needs no memory.
    static int look_up(char* type, asyntaxinfo** info)
    {
        char* const mark = std::strchr(type, ';');
        if (mark == nullptr || find_language_tag(type) != mark + 1) {
            return look_up_attr(type, info);
        }
        *mark = '\0';
        const int result = look_up_attr(type, info);
        *mark = ';';
        return result;
    }

    // Of an encrypted attribute duplicates are looked for within one addition only, and "default" decides for all
    // values of its addition whether they are normalised.
    bool is_alone(const ldif_parts& parts) const
    {
        if (check_duplicates_ == 0 && normalize_ == 0) {
            return false;
        }
        return (attr_->a_info != nullptr && attr_->a_info->encryption != PWD_NONE) ||
               std::string_view(parts.value, parts.length) == "default";
    }

    bool add_gathered()
    {
        if (count_ == 0) {
            return true;
        }
        pointers_[std::exchange(count_, 0)] = nullptr;
        return merged(attr_merge_values(*attr_, pointers_.data(), check_duplicates_, normalize_));
    }

    static bool merged(int result)
    {
        if (result != LDAP_SUCCESS) {
            debug_error("Error - str2entry_memberFix: returning NULL (attr_merge failed)\n");
        }
        return result == LDAP_SUCCESS;
    }

    static constexpr std::size_t most_gathered = 64;

    Entry& entry_;
    int check_duplicates_;
    int normalize_;
    bool trim_;

    // The attribute of the last line, under the name that it had there, and values of it that are still to be added.
    const char* type_ = nullptr;
    std::size_t type_length_ = 0;
    Attribute* attr_ = nullptr;
    std::size_t count_ = 0;
    std::array<berval, most_gathered> values_;
    std::array<berval*, most_gathered + 1> pointers_;
};

}  // namespace

extern "C" {

Entry* str2entry_memberFix(char* text, int check_duplicates, int normalize, int trim)
{
    if (text == nullptr) {
        debug_error("Error - str2entry_memberFix: NULL text\n");
        return nullptr;
    }
    Entry* made = nullptr;
    if (CreateEntry(&made) != LDAP_SUCCESS) {
        debug_error("Error - str2entry_memberFix: allocation for entry failed\n");
        return nullptr;
    }
    entry_guard entry(made);
    return entry_reader(*entry, check_duplicates, normalize, trim != 0).read(text) ? entry.release() : nullptr;
}

Entry* str2entry(char* text, int check_duplicates, int normalize)
{
    return str2entry_memberFix(text, check_duplicates, normalize, 0);
}

}  // extern "C"
