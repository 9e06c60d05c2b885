// Reading BER elements, value by value and by formats.
//
// A header is believed only as far as the innermost end that is known: that of the construction which the call entered,
// or that of the element. Formats are data of the program, so their nesting is bounded by a small stack; the nesting of
// what is read is bounded by nothing here, because no call goes deeper than its format.
#include <algorithm>
#include <cstdarg>
#include <cstdlib>
#include <cstring>

#include "libraries/libber/ber_element.h"
#include "libraries/libber/ber_state.h"

namespace {

// What a value's tag has to be for a letter, if it is universal.
enum class kind { boolean, number, text, null };

bool is_of_kind(ber_tag_t tag, kind wanted)
{
    if (ber_is_constructed(tag)) {
        return false;
    }
    if (!ber_is_universal(tag)) {
        return true;
    }
    switch (wanted) {
    case kind::boolean: return tag == LBER_BOOLEAN;
    case kind::number: return tag == LBER_INTEGER || tag == LBER_ENUMERATED;
    case kind::text: return tag == LBER_OCTETSTRING;
    case kind::null: return tag == LBER_NULL;
    }
    return false;
}

// Of the other classes a tag that looks primitive may stand for a construction as well: some are written so.
bool is_construction(ber_tag_t tag)
{
    return tag != LBER_ERROR && (!ber_is_universal(tag) || tag == LBER_SEQUENCE || tag == LBER_SET);
}

// One call's way through what an element reads: where it is, and the ends of the constructions that it has entered.
class cursor {
public:
    cursor(const char* at, const char* end) : at_(at), end_(end) {}

    const char* at() const { return at_; }
    ber_tag_t tag() const { return tag_; }

    // The header at the position, which stays.
    bool peek(ber_tag_t* tag, ber_len_t* len)
    {
        const char* at = at_;
        if (!ber_read_header(&at, end_, tag, len)) {
            return false;
        }
        tag_ = *tag;
        return true;
    }

    // Moves behind the header.
    bool skip_header(ber_tag_t* tag, ber_len_t* len)
    {
        if (!ber_read_header(&at_, end_, tag, len)) {
            return false;
        }
        tag_ = *tag;
        return true;
    }

    // Moves behind a value, and gives its content.
    bool take(kind wanted, berval* content)
    {
        ber_tag_t tag = 0;
        if (!skip_header(&tag, &content->bv_len) || !is_of_kind(tag, wanted)) {
            return false;
        }
        content->bv_val = const_cast<char*>(at_);
        at_ += content->bv_len;
        return true;
    }

    bool skip()
    {
        ber_tag_t tag = 0;
        ber_len_t len = 0;
        if (!skip_header(&tag, &len)) {
            return false;
        }
        at_ += len;
        return true;
    }

    bool enter()
    {
        ber_tag_t tag = 0;
        ber_len_t len = 0;
        if (depth_ == LBER_MAX_OPEN || !skip_header(&tag, &len) || !is_construction(tag)) {
            return false;
        }
        outer_ends_[depth_++] = end_;
        end_ = at_ + len;
        return true;
    }

    void leave()
    {
        if (depth_ != 0) {
            at_ = end_;
            end_ = outer_ends_[--depth_];
        }
    }

    // How many strings there are from the position to the end of the construction; false when anything else is there.
    bool count_strings(std::size_t* count) const
    {
        const char* at = at_;
        for (*count = 0; at != end_; ++*count) {
            ber_tag_t tag = 0;
            ber_len_t len = 0;
            if (!ber_read_header(&at, end_, &tag, &len) || !is_of_kind(tag, kind::text)) {
                return false;
            }
            at += len;
        }
        return true;
    }

private:
    const char* at_;
    const char* end_;
    ber_tag_t tag_ = 0;  // the one read last
    unsigned depth_ = 0;
    const char* outer_ends_[LBER_MAX_OPEN];
};

// ---- values ---------------------------------------------------------------------------------------------------------

bool read_number(cursor& from, std::size_t most, std::int64_t* number)
{
    berval content;
    if (!from.take(kind::number, &content) || content.bv_len == 0 || content.bv_len > most) {
        return false;
    }
    std::uint64_t bits = static_cast<signed char>(content.bv_val[0]) < 0 ? ~std::uint64_t{0} : 0;
    for (ber_len_t i = 0; i < content.bv_len; ++i) {
        bits = bits << 8 | static_cast<unsigned char>(content.bv_val[i]);
    }
    *number = static_cast<std::int64_t>(bits);
    return true;
}

bool read_boolean(cursor& from, int* truth)
{
    berval content;
    if (!from.take(kind::boolean, &content) || content.bv_len != 1) {
        return false;
    }
    *truth = content.bv_val[0] != 0 ? 1 : 0;
    return true;
}

bool has_zero(const berval& content)
{
    return content.bv_len != 0 && std::memchr(content.bv_val, '\0', content.bv_len) != nullptr;
}

// Each puts a new copy of a string into *copy.
bool read_copy(cursor& from, char** copy)
{
    berval content;
    if (!from.take(kind::text, &content) || has_zero(content)) {
        return false;
    }
    *copy = ber_copy_bytes(content);
    return *copy != nullptr;
}

bool read_copy(cursor& from, berval** copy)
{
    berval content;
    if (!from.take(kind::text, &content)) {
        return false;
    }
    *copy = ber_bvdup(&content);
    return *copy != nullptr;
}

bool read_bytes(cursor& from, berval* copy)
{
    berval content;
    if (!from.take(kind::text, &content)) {
        return false;
    }
    char* bytes = ber_copy_bytes(content);
    if (bytes == nullptr) {
        return false;
    }
    *copy = {content.bv_len, bytes};
    return true;
}

bool read_into(cursor& from, char* buffer, ber_len_t* size)
{
    berval content;
    if (!from.take(kind::text, &content) || content.bv_len >= *size) {
        return false;
    }
    if (content.bv_len != 0) {
        std::memcpy(buffer, content.bv_val, content.bv_len);
    }
    buffer[content.bv_len] = '\0';
    *size = content.bv_len;
    return true;
}

void release(char** texts)
{
    for (char** text = texts; text != nullptr && *text != nullptr; ++text) {
        std::free(*text);
    }
    std::free(texts);
}

void release(berval** values)
{
    ber_bvecfree(values);
}

// Reads all strings up to the end of the construction. They are counted first, so the array is made once.
template <typename Item>
bool read_all(cursor& from, Item*** items)
{
    std::size_t count = 0;
    if (!from.count_strings(&count)) {
        return false;
    }
    *items = nullptr;
    if (count == 0) {
        return true;
    }
    auto** array = static_cast<Item**>(std::calloc(count + 1, sizeof(Item*)));
    if (array == nullptr) {
        return false;
    }
    for (std::size_t i = 0; i < count; ++i) {
        if (!read_copy(from, &array[i])) {
            release(array);
            return false;
        }
    }
    *items = array;
    return true;
}

// ---- formats --------------------------------------------------------------------------------------------------------

// Reads what one letter asks for.
bool scan_letter(char letter, cursor& from, va_list* args)
{
    ber_tag_t tag = 0;
    ber_len_t len = 0;
    switch (letter) {
    case 'b': return read_boolean(from, va_arg(*args, int*));
    case 'i':
    case 'e': {
        auto* out = va_arg(*args, std::int32_t*);
        std::int64_t number = 0;
        if (!read_number(from, sizeof(*out), &number)) {
            return false;
        }
        *out = static_cast<std::int32_t>(number);
        return true;
    }
    case 'I': return read_number(from, sizeof(std::int64_t), va_arg(*args, std::int64_t*));
    case 'a': return read_copy(from, va_arg(*args, char**));
    case 'A': {
        char** out = va_arg(*args, char**);
        const bool read = read_copy(from, out);
        if (read && **out == '\0') {
            std::free(*out);
            *out = nullptr;
        }
        return read;
    }
    case 's': {
        char* buffer = va_arg(*args, char*);
        return read_into(from, buffer, va_arg(*args, ber_len_t*));
    }
    case 'o': return read_bytes(from, va_arg(*args, berval*));
    case 'O': return read_copy(from, va_arg(*args, berval**));
    case 'm': return from.take(kind::text, va_arg(*args, berval*));
    case 'v': return read_all(from, va_arg(*args, char***));
    case 'V': return read_all(from, va_arg(*args, berval***));
    case 'n': {
        berval content;
        return from.take(kind::null, &content) && content.bv_len == 0;
    }
    case '{':
    case '[': return from.enter();
    case '}':
    case ']': from.leave(); return true;
    case 't': return from.peek(va_arg(*args, ber_tag_t*), &len);
    case 'T': return from.skip_header(va_arg(*args, ber_tag_t*), &len);
    case 'l': return from.peek(&tag, va_arg(*args, ber_len_t*));
    case 'x': return from.skip();
    default: return false;
    }
}

// Goes through a failed format again: releases what the letters before `failed` made, and sets all pointers to null.
void undo(const char* format, const char* failed, va_list* args)
{
    for (const char* letter = format; *letter != '\0'; ++letter) {
        const bool made = letter < failed;
        switch (*letter) {
        case 'a':
        case 'A': {
            char** text = va_arg(*args, char**);
            std::free(made ? *text : nullptr);
            *text = nullptr;
            break;
        }
        case 'm':
        case 'o': {
            auto* value = va_arg(*args, berval*);
            std::free(made && *letter == 'o' ? value->bv_val : nullptr);
            *value = {0, nullptr};
            break;
        }
        case 'O': {
            auto** value = va_arg(*args, berval**);
            ber_bvfree(made ? *value : nullptr);
            *value = nullptr;
            break;
        }
        case 'v': {
            char*** texts = va_arg(*args, char***);
            release(made ? *texts : nullptr);
            *texts = nullptr;
            break;
        }
        case 'V': {
            auto*** values = va_arg(*args, berval***);
            release(made ? *values : nullptr);
            *values = nullptr;
            break;
        }
        case 's':
            va_arg(*args, char*);
            va_arg(*args, ber_len_t*);
            break;
        case 'b':
        case 'i':
        case 'e':
        case 'I':
        case 't':
        case 'T':
        case 'l': va_arg(*args, void*); break;
        case 'n':
        case 'x':
        case '{':
        case '}':
        case '[':
        case ']': break;
        default: return;  // what its argument is isn't known
        }
    }
}

}  // namespace

extern "C" {

ber_tag_t ber_scanf(BerElement* ber, const char* format, ...)
{
    if (format == nullptr) {
        return LBER_ERROR;
    }
    const bool readable = ber != nullptr && ber_is(*ber, ber_reads);
    cursor from(readable ? ber->ber_ptr : nullptr, readable ? ber->ber_end : nullptr);
    va_list args;
    va_start(args, format);
    const char* letter = format;
    while (readable && *letter != '\0' && scan_letter(*letter, from, &args)) {
        ++letter;
    }
    va_end(args);
    if (readable && *letter == '\0') {
        ber->ber_ptr = const_cast<char*>(from.at());
        return from.tag();
    }
    va_start(args, format);
    undo(format, letter, &args);
    va_end(args);
    return LBER_ERROR;
}

ber_tag_t ber_scanf_w(BerElement* ber, const char* format, ...) __attribute__((alias("ber_scanf")));
ber_tag_t fber_scanf(BerElement* ber, const char* format, ...) __attribute__((alias("ber_scanf")));

ber_tag_t ber_skip_tag(BerElement* ber, ber_len_t* len)
{
    const char* at = ber == nullptr ? nullptr : ber->ber_ptr;
    ber_tag_t tag = 0;
    if (at == nullptr || len == nullptr || !ber_is(*ber, ber_reads) || !ber_read_header(&at, ber->ber_end, &tag, len)) {
        return LBER_ERROR;
    }
    ber->ber_ptr = const_cast<char*>(at);
    return tag;
}

ber_tag_t ber_peek_tag(const BerElement* ber, ber_len_t* len)
{
    if (ber == nullptr) {
        return LBER_ERROR;
    }
    const char* at = ber->ber_ptr;
    ber_tag_t tag = 0;
    const bool read =
        at != nullptr && len != nullptr && ber_is(*ber, ber_reads) && ber_read_header(&at, ber->ber_end, &tag, len);
    return read ? tag : LBER_ERROR;
}

ber_tag_t ber_next_element(BerElement* ber, ber_len_t* len, const char* last)
{
    if (ber == nullptr || last == nullptr || len == nullptr || !ber_is(*ber, ber_reads)) {
        return LBER_ERROR;
    }
    if (ber->ber_ptr == last) {
        return LBER_DEFAULT;
    }
    const char* at = ber->ber_ptr;
    ber_tag_t tag = 0;
    return ber_read_header(&at, std::min<const char*>(last, ber->ber_end), &tag, len) ? tag : LBER_ERROR;
}

ber_tag_t ber_first_element(BerElement* ber, ber_len_t* len, char** last)
{
    ber_len_t content = 0;
    if (last == nullptr || len == nullptr || !is_construction(ber_peek_tag(ber, &content))) {
        return LBER_ERROR;
    }
    char* before = ber->ber_ptr;
    ber_skip_tag(ber, &content);
    char* end = ber->ber_ptr + content;
    const ber_tag_t tag = ber_next_element(ber, len, end);
    if (tag == LBER_ERROR) {
        ber->ber_ptr = before;
    } else {
        *last = end;
    }
    return tag;
}

ber_tag_t fber_get_string_len(BerElement* ber, char** text, ber_len_t* len)
{
    berval value = {0, nullptr};
    const ber_tag_t tag = text == nullptr || len == nullptr ? LBER_ERROR : ber_scanf(ber, "o", &value);
    if (text != nullptr) {
        *text = value.bv_val;
    }
    if (len != nullptr) {
        *len = value.bv_len;
    }
    return tag;
}

}  // extern "C"
