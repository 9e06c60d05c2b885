// The lexical layer of schema text (the definitions of RFC 4512, section 4.1, and the server's own around them).
//
// A factory walks a text of the caller's in place; a token is one lexical item, copied out. Every fault is an exception
// whose place is the source's name and current line, with an excerpt of the text in its message.
#pragma once

#include "servers/vrnd/libcsgl/csgl_string.h"
#include "servers/vrnd/libdirbase/schema/ldcf_messages.h"

// The kinds of token, as bits: expectations are masks of them.
enum ldcf_token_type : unsigned {
    token_descr = 0x0002,        // a name: a letter, then letters, digits, ; _ - (and . when allowed)
    token_dotted_oid = 0x0004,   // digit groups joined by single dots, at least one dot
    token_number = 0x0008,       // digits only
    token_qdescr = 0x0010,       // quoted text in the form of a name
    token_qdstring = 0x0020,     // any other quoted text
    token_left_paren = 0x0040,   // (
    token_right_paren = 0x0080,  // )
    token_left_brace = 0x0100,   // {
    token_right_brace = 0x0200,  // }
    token_dollar = 0x0400,       // $
    token_equals = 0x0800,       // =
    token_colon = 0x1000,        // :
    token_comment = 0x2000,      // # up to the end of the line
};

class DIRBASE_EXPORT ldcf_token_factory {
public:
    // One pass over `buffer`, a zero-terminated text that stays with the caller and unchanged while it is read. `file`
    // names the source in every exception; it may be empty for text that doesn't come from a file.
    ldcf_token_factory(const char* buffer, const csgl_string& file);

    // Starts another pass.
    void assign(const char* buffer, const csgl_string& file);

    const csgl_string& file() const { return file_; }
    int line() const { return line_; }

    // The text of the token read last.
    csgl_string current_token() const;

    // The excerpt that messages show: the source from the current token on, one line of it at the most, cut at a blank.
    csgl_string error_token_spot() const;

    // Skips white space; true when nothing else follows.
    bool empty();

    // Skips white space and counts lines.
    void advance();

    // Puts the last token back, so that it is read again.
    void return_token() { cursor_ = token_start_; }

    // Raises exc_invalid_grammar_t at the current place. The text may refer to the excerpt by LDCF_SPOT.
    [[noreturn]] void throw_exc(const char* text, int message_id) const;
    [[noreturn]] void throw_exc(const csgl_string& text, int message_id) const { throw_exc(text.c_str(), message_id); }

private:
    friend class ldcf_token;

    // Raises any other class at the current place, with the excerpt at hand in the same way.
    template <typename Exception>
    [[noreturn]] DIRBASE_HIDDEN void raise(const char* text, int message_id) const;

    const char* token_start_;
    const char* cursor_;
    csgl_string file_;
    int line_;
};

class DIRBASE_EXPORT ldcf_token {
public:
    // Reads the next token, whatever it is. Raises exc_invalid_token_t for what is none and
    // exc_unexpected_end_of_input_t at the end of the text or inside an open quote.
    explicit ldcf_token(ldcf_token_factory& factory);

    // Reads the next token and raises exc_invalid_token_t with the given text and id when it doesn't meet the mask.
    ldcf_token(ldcf_token_factory& factory, const char* text, unsigned mask, int message_id);

    // The same into this token.
    void assign(ldcf_token_factory& factory);
    void assign(ldcf_token_factory& factory, const char* text, unsigned mask, int message_id);

    // The text; of a quoted token what stands between the quotes.
    const csgl_string& text() const { return text_; }
    ldcf_token_type type() const { return type_; }

    // True when the token meets the mask. A mask for a dotted oid also admits a number, and one for any quoted text
    // also admits a quoted name.
    bool operator[](unsigned mask) const;

    // True when the token's text is `keyword`, without regard to case.
    bool is(const char* keyword) const { return csgl_str_ci_compare(text_, keyword) == 0; }

private:
    DIRBASE_HIDDEN void init(ldcf_token_factory& factory);
    DIRBASE_HIDDEN void read_number(ldcf_token_factory& factory);
    DIRBASE_HIDDEN void read_quoted(ldcf_token_factory& factory);
    DIRBASE_HIDDEN void take(ldcf_token_factory& factory, ldcf_token_type type, const char* end);

    csgl_string text_;
    ldcf_token_type type_;
};
