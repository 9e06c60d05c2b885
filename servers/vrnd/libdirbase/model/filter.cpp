// Filters as trees of records: see filter.h.
#include "servers/vrnd/libdirbase/model/filter.h"

#include <cstdio>
#include <cstdlib>
#include <string_view>
#include <utility>

#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/text_builder.h"

namespace {

constexpr std::size_t first_room = 513;

std::string_view view_of(const char* text)
{
    return text == nullptr ? std::string_view() : std::string_view(text);
}

char operator_of(std::uint64_t choice)
{
    return choice == LDAP_FILTER_AND ? '&' : choice == LDAP_FILTER_OR ? '|' : '!';
}

bool write(text_builder& text, const Filter& filter);

bool write_list(text_builder& text, const Filter& filter)
{
    bool written = text.append('(') && text.append(operator_of(filter.f_choice));
    for (const Filter* child = filter.f_list; child != nullptr && written; child = child->f_next) {
        written = write(text, *child);
    }
    return written && text.append(')');
}

bool write_substrings(text_builder& text, const filter_substrings& wanted)
{
    bool written = text.append('(') && text.append(view_of(wanted.f_sub_type)) && text.append('=') &&
                   text.append(view_of(wanted.f_sub_initial)) && text.append('*');
    for (char** piece = wanted.f_sub_any; piece != nullptr && *piece != nullptr && written; ++piece) {
        written = text.append(*piece) && text.append('*');
    }
    return written && text.append(view_of(wanted.f_sub_final)) && text.append(')');
}

bool write(text_builder& text, const Filter& filter)
{
    if (filter_has_list(filter.f_choice)) {
        return write_list(text, filter);
    }
    if (filter_has_ava(filter.f_choice)) {
        return text.append('(') && text.append(view_of(filter.f_ava.ava_type)) &&
               text.append(filter_comparison(filter.f_choice)) && text.append(view_of(filter.f_ava.ava_value.bv_val)) &&
               text.append(')');
    }
    switch (filter.f_choice) {
    case LDAP_FILTER_SUBSTRINGS: return write_substrings(text, filter.f_sub);
    case LDAP_FILTER_PRESENT: return text.append('(') && text.append(view_of(filter.f_type)) && text.append("=*)");
    default:
        debug_error("Error - filter2str: unknown filter type %d\n", static_cast<int>(filter.f_choice));
        return false;
    }
}

}  // namespace

extern "C" {

void ava_init(ava* assertion)
{
    *assertion = {};
}

void ava_free(ava* assertion, int free_record)
{
    if (assertion == nullptr) {
        return;
    }
    std::free(assertion->ava_type);
    std::free(assertion->ava_value.bv_val);
    std::free(assertion->ava_encoded.bv_val);
    if (free_record != 0) {
        std::free(assertion);
    } else {
        *assertion = {};
    }
}

void filter_free(Filter* filter)
{
    if (filter == nullptr) {
        return;
    }
    if (filter_has_list(filter->f_choice)) {
        for (Filter* child = filter->f_list; child != nullptr;) {
            filter_free(std::exchange(child, child->f_next));
        }
    } else if (filter_has_ava(filter->f_choice)) {
        ava_free(&filter->f_ava, 0);
    } else if (filter->f_choice == LDAP_FILTER_SUBSTRINGS) {
        std::free(filter->f_sub.f_sub_type);
        std::free(filter->f_sub.f_sub_initial);
        charray_free(filter->f_sub.f_sub_any);
        std::free(filter->f_sub.f_sub_final);
    } else if (filter->f_choice == LDAP_FILTER_PRESENT) {
        std::free(filter->f_type);
    }
    std::free(filter);
}

char* filter2str(const Filter* filter)
{
    if (filter == nullptr) {
        return nullptr;
    }
    text_builder text(first_room);
    heap_text written = write(text, *filter) ? text.release() : nullptr;
    if (text.failed()) {
        debug_error("Error - filter2str: malloc failed. Out of memory\n");
    }
    return written.release();
}

void filter_print(const Filter* filter)
{
    const heap_text text(filter2str(filter));
    std::puts(text == nullptr ? "(no filter)" : text.get());
}

int filter_swap_with_encoded(Filter* filter)
{
    int swapped = 0;
    for (; filter != nullptr; filter = filter->f_next) {
        swapped = filter_has_ava(filter->f_choice) && filter->f_ava.ava_encoded.bv_val != nullptr ? 1 : 0;
        if (swapped != 0) {
            std::swap(filter->f_ava.ava_value, filter->f_ava.ava_encoded);
        }
    }
    return swapped;
}

}  // extern "C"
