// Tokens of schema text: see ldcf_token.h.
#include "servers/vrnd/libdirbase/schema/ldcf_token.h"

#include <array>
#include <cstring>

#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/environment.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/schema/ldcf_common.h"

namespace {

// Some directories hold attribute names with dots; the server has to be told so.
bool allow_dots_in_attrname()
{
    static const bool allowed = [] {
        const heap_text value = environment_value("VRN_ATTRNAME_CONTAINS_DOTS");
        if (value == nullptr || std::strcmp(value.get(), "YES") != 0) {
            return false;
        }
        debug_trace("server allows attrnames to contain dots\n");
        return true;
    }();
    return allowed;
}

// Classes of bytes as in the C locale: a byte above 0x7f is in none. Indexed by the byte taken as unsigned.
struct character_tables {
    std::array<bool, 256> is_first_descr{};
    std::array<bool, 256> is_middle_descr{};
    std::array<bool, 256> is_digit{};
    std::array<bool, 256> is_space{};
    std::array<bool, 256> is_separator{};
    std::array<ldcf_token_type, 256> separator_to_type{};

    character_tables()
    {
        for (unsigned c = 0; c < 256; ++c) {
            const bool letter = (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
            is_digit[c] = c >= '0' && c <= '9';
            is_first_descr[c] = letter;
            is_middle_descr[c] = letter || is_digit[c] || c == ';' || c == '_' || c == '-';
            is_space[c] = c == ' ' || (c >= '\t' && c <= '\r');
        }
        is_middle_descr['.'] = allow_dots_in_attrname();
        separator('(', token_left_paren);
        separator(')', token_right_paren);
        separator('{', token_left_brace);
        separator('}', token_right_brace);
        separator('$', token_dollar);
        separator('=', token_equals);
        separator(':', token_colon);
    }

private:
    void separator(unsigned char c, ldcf_token_type type)
    {
        is_separator[c] = true;
        separator_to_type[c] = type;
    }
};

const character_tables& tables()
{
    static const character_tables built;
    return built;
}

unsigned char byte_at(const char* text)
{
    return static_cast<unsigned char>(*text);
}

constexpr std::size_t spot_limit = 43;
constexpr char cut_mark[] = ".....";

}  // namespace

ldcf_token_factory::ldcf_token_factory(const char* buffer, const csgl_string& file)
    : token_start_(buffer), cursor_(buffer), file_(file), line_(1)
{
    tables();
}

void ldcf_token_factory::assign(const char* buffer, const csgl_string& file)
{
    token_start_ = buffer;
    cursor_ = buffer;
    file_ = file;
    line_ = 1;
}

csgl_string ldcf_token_factory::current_token() const
{
    return {token_start_, static_cast<unsigned>(cursor_ - token_start_)};
}

csgl_string ldcf_token_factory::error_token_spot() const
{
    char spot[spot_limit + sizeof(cut_mark)];
    std::size_t length = strnlen(token_start_, spot_limit);
    std::memcpy(spot, token_start_, length);
    if (length == spot_limit) {
        while (length > 0 && spot[length - 1] != ' ') {
            --length;
        }
        if (length == 0) {
            length = spot_limit;
        }
        std::memcpy(spot + length, cut_mark, sizeof(cut_mark) - 1);
        length += sizeof(cut_mark) - 1;
    }
    if (const void* found = std::memchr(spot, '\n', length); found != nullptr) {
        length = static_cast<std::size_t>(static_cast<const char*>(found) - spot);
        length -= length > 0 ? 1 : 0;
    }
    return {spot, static_cast<unsigned>(length)};
}

bool ldcf_token_factory::empty()
{
    advance();
    return *cursor_ == '\0';
}

void ldcf_token_factory::advance()
{
    const character_tables& classes = tables();
    for (; classes.is_space[byte_at(cursor_)]; ++cursor_) {
        if (*cursor_ == '\n') {
            ++line_;
        }
    }
}

template <typename Exception>
void ldcf_token_factory::raise(const char* text, int message_id) const
{
    const csgl_string message = ldcf_join("[v['", error_token_spot(), "']v]", text);
    throw Exception(file_.c_str(), line_, message.c_str(), message_id);
}

void ldcf_token_factory::throw_exc(const char* text, int message_id) const
{
    raise<exc_invalid_grammar_t>(text, message_id);
}

ldcf_token::ldcf_token(ldcf_token_factory& factory) : text_(""), type_(token_comment)
{
    init(factory);
}

ldcf_token::ldcf_token(ldcf_token_factory& factory, const char* text, unsigned mask, int message_id)
    : ldcf_token(factory)
{
    if (!(*this)[mask]) {
        factory.raise<exc_invalid_token_t>(text, message_id);
    }
}

void ldcf_token::assign(ldcf_token_factory& factory)
{
    init(factory);
}

void ldcf_token::assign(ldcf_token_factory& factory, const char* text, unsigned mask, int message_id)
{
    init(factory);
    if (!(*this)[mask]) {
        factory.raise<exc_invalid_token_t>(text, message_id);
    }
}

bool ldcf_token::operator[](unsigned mask) const
{
    if ((mask & token_dotted_oid) != 0) {
        mask |= token_number;
    }
    if ((mask & token_qdstring) != 0) {
        mask |= token_qdescr;
    }
    return (type_ & mask) != 0;
}

// Keeps the text from the token's start up to `end`, which the cursor has reached or is one byte ahead of.
void ldcf_token::take(ldcf_token_factory& factory, ldcf_token_type type, const char* end)
{
    const char* start = factory.token_start_ + (*factory.token_start_ == '\'' ? 1 : 0);
    if (static_cast<std::size_t>(end - start) > 0xfffffff0u) {
        csgl_throw_no_memory(__FILE__, __LINE__);
    }
    text_.assign(start, static_cast<unsigned>(end - start));
    type_ = type;
}

void ldcf_token::init(ldcf_token_factory& factory)
{
    const character_tables& classes = tables();
    factory.advance();
    factory.token_start_ = factory.cursor_;
    const char*& cursor = factory.cursor_;

    if (*cursor == '#') {
        cursor += std::strcspn(cursor, "\n");
        take(factory, token_comment, cursor);
    } else if (classes.is_separator[byte_at(cursor)]) {
        const ldcf_token_type type = classes.separator_to_type[byte_at(cursor)];
        ++cursor;
        take(factory, type, cursor);
    } else if (classes.is_first_descr[byte_at(cursor)]) {
        while (classes.is_middle_descr[byte_at(cursor)]) {
            ++cursor;
        }
        take(factory, token_descr, cursor);
    } else if (classes.is_digit[byte_at(cursor)]) {
        read_number(factory);
    } else if (*cursor == '\'') {
        read_quoted(factory);
    } else if (*cursor == '\0') {
        factory.raise<exc_unexpected_end_of_input_t>("unexpected end of input", LDCF_MSG_END_OF_INPUT);
    } else {
        factory.raise<exc_invalid_token_t>("invalid token " LDCF_SPOT, LDCF_MSG_INVALID_TOKEN);
    }
}

void ldcf_token::read_number(ldcf_token_factory& factory)
{
    const character_tables& classes = tables();
    const char*& cursor = factory.cursor_;
    const auto skip_digits = [&] {
        while (classes.is_digit[byte_at(cursor)]) {
            ++cursor;
        }
    };
    ldcf_token_type type = token_number;
    skip_digits();
    while (*cursor == '.') {
        type = token_dotted_oid;
        ++cursor;
        if (!classes.is_digit[byte_at(cursor)]) {
            factory.raise<exc_invalid_token_t>("expected digit after '.'" LDCF_NOT_FOUND_AT, LDCF_MSG_EXPECTED_DIGIT);
        }
        skip_digits();
    }
    take(factory, type, cursor);
}

// There is no escape for a quote: the next one ends the text.
void ldcf_token::read_quoted(ldcf_token_factory& factory)
{
    const character_tables& classes = tables();
    const char*& cursor = factory.cursor_;
    ++cursor;
    if (*cursor == '\'') {
        factory.raise<exc_invalid_token_t>("expected non-empty quoted string" LDCF_NOT_FOUND_AT, LDCF_MSG_EMPTY_QUOTES);
    }
    ldcf_token_type type = classes.is_first_descr[byte_at(cursor)] ? token_qdescr : token_qdstring;
    for (; *cursor != '\''; ++cursor) {
        if (*cursor == '\0') {
            factory.raise<exc_unexpected_end_of_input_t>("non-terminated quoted string " LDCF_SPOT,
                                                         LDCF_MSG_OPEN_QUOTE);
        }
        if (!classes.is_middle_descr[byte_at(cursor)]) {
            type = token_qdstring;
        }
    }
    take(factory, type, cursor);
    ++cursor;
}
