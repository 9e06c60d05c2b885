// Language tags: see language_tag.h.
#include "servers/vrnd/libdirbase/model/language_tag.h"

#include <cstdlib>
#include <cstring>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/heap.h"

namespace {

constexpr char binary_ending[] = ";binary";
constexpr char prefix[] = "lang-";
constexpr std::size_t prefix_length = sizeof prefix - 1;

char to_lower(char c)
{
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool is_letter(char c)
{
    return to_lower(c) >= 'a' && to_lower(c) <= 'z';
}

// Copies a tag in lower case to a place with room for it and the terminator.
void copy_tag(char* to, const char* tag)
{
    do {
        *to++ = to_lower(*tag);
    } while (*tag++ != '\0');
}

bool is_none(const char* tag)
{
    return tag == nullptr || *tag == '\0';
}

}  // namespace

const char* find_language_tag(const char* name)
{
    const char* const mark = std::strrchr(name, ';');
    return mark == nullptr || vrn_strcasecmp(mark, binary_ending) == 0 ? nullptr : mark + 1;
}

extern "C" {

int parse_language_tags(const char* name, char** base, char** tag, int mode, int allocate)
{
    if (name == nullptr || mode < LANGUAGE_BASE_AND_TAG || mode > LANGUAGE_BASE) {
        debug_error("Error - parse_language_tags: parameter is not valid\n");
        return LDAP_OTHER;
    }
    const bool wants_tag = mode != LANGUAGE_BASE;
    const bool wants_base = mode != LANGUAGE_TAG;
    if (wants_base) {
        *base = nullptr;
    }
    if (wants_tag && allocate == 1) {
        *tag = nullptr;
    }
    const char* const found = find_language_tag(name);
    if (found == nullptr) {
        return LDAP_SUCCESS;
    }
    const std::size_t length = std::strlen(found);
    if (length > longest_language_tag) {
        return LDAP_INVALID_SYNTAX;
    }
    heap_text new_base(wants_base ? strndup(name, static_cast<std::size_t>(found - 1 - name)) : nullptr);
    heap_text new_tag(wants_tag && allocate == 1 ? static_cast<char*>(std::malloc(length + 1)) : nullptr);
    if ((wants_base && new_base == nullptr) || (wants_tag && allocate == 1 && new_tag == nullptr)) {
        debug_error("Error - parse_language_tags: malloc() failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    if (new_tag != nullptr) {
        *tag = new_tag.release();
    }
    if (wants_tag) {
        copy_tag(*tag, found);
    }
    if (wants_base) {
        *base = new_base.release();
    }
    return LDAP_SUCCESS;
}

int parse_language_tags_with_buffer(const char* name, char** base, char* tag, std::size_t* tag_length, int mode)
{
    if (tag != nullptr) {
        *tag = '\0';
    }
    const int result = parse_language_tags(name, base, mode == LANGUAGE_BASE ? nullptr : &tag, mode, 0);
    if (tag_length != nullptr) {
        *tag_length = tag == nullptr ? 0 : std::strlen(tag);
    }
    return result;
}

int is_valid_language_tag(const char* tag)
{
    const std::size_t length = tag == nullptr ? 0 : std::strlen(tag);
    if (length <= prefix_length || length > longest_language_tag || tag[length - 1] == '-') {
        return 0;
    }
    for (std::size_t i = 0; i < prefix_length; ++i) {
        if (to_lower(tag[i]) != prefix[i]) {
            return 0;
        }
    }
    bool first_part = true;
    for (const char* at = tag + prefix_length; *at != '\0'; ++at) {
        if (*at == '-') {
            first_part = false;
            if (at[-1] == '-') {
                return 0;
            }
        } else if (!is_letter(*at) && (first_part || *at < '0' || *at > '9')) {
            return 0;
        }
    }
    return 1;
}

bool contains_valid_language_tag(const char* name)
{
    const char* const tag = name == nullptr ? nullptr : find_language_tag(name);
    return is_valid_language_tag(tag) != 0;
}

int strtagcmp(const char* a, const char* b)
{
    if (is_none(a) || is_none(b)) {
        return static_cast<int>(!is_none(a)) - static_cast<int>(!is_none(b));
    }
    return vrn_strcasecmp(a, b);
}

}  // extern "C"
