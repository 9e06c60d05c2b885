// Grammar readers and printers: see ldcf_stream.h.
#include "servers/vrnd/libdirbase/schema/ldcf_stream.h"

#include <climits>
#include <cstdlib>

namespace {

constexpr unsigned oid_mask = token_descr | token_dotted_oid | token_qdescr;

// A list of quoted items between parentheses, or a single one: qdstrings and qdescrs alike.
template <typename Add>
void read_quoted_items(ldcf_token_factory& factory, unsigned item, const char* first_text, const char* list_text,
                       int message_id, Add&& add)
{
    ldcf_token token(factory, first_text, item | token_left_paren, message_id);
    if (!token[token_left_paren]) {
        add(token.text());
        return;
    }
    token.assign(factory, list_text, item, message_id);
    while (!token[token_right_paren]) {
        add(token.text());
        token.assign(factory, list_text, item | token_right_paren, message_id);
    }
}

}  // namespace

csgl_string ldcf_stream::oid(ldcf_token_factory& factory)
{
    return ldcf_token(factory, LDCF_EXPECTED("object ID"), oid_mask, LDCF_MSG_EXPECTED).text();
}

ldcf_names ldcf_stream::oids(ldcf_token_factory& factory)
{
    ldcf_names result;
    const ldcf_token first(factory, LDCF_EXPECTED_ONE_OF("'object ID' '('"), oid_mask | token_left_paren,
                           LDCF_MSG_EXPECTED_ONE_OF);
    if (!first[token_left_paren]) {
        result.insert(first.text());
        return result;
    }
    ldcf_token token(factory, LDCF_EXPECTED_ONE_OF("'object ID' ')'"), oid_mask | token_right_paren,
                     LDCF_MSG_EXPECTED_ONE_OF);
    if (token[token_right_paren]) {
        return result;
    }
    result.insert(token.text());
    for (;;) {
        token.assign(factory, LDCF_EXPECTED_ONE_OF("'$' ')'"), token_dollar | token_right_paren,
                     LDCF_MSG_EXPECTED_ONE_OF);
        if (token[token_right_paren]) {
            return result;
        }
        result.insert(oid(factory));
    }
}

csgl_string ldcf_stream::qnoid(ldcf_token_factory& factory)
{
    constexpr char text[] = LDCF_EXPECTED("numeric object ID");
    const ldcf_token token(factory, text, token_dotted_oid | token_qdstring, LDCF_MSG_EXPECTED);
    if (!token[token_qdstring]) {
        return token.text();
    }
    ldcf_token_factory inner(token.text(), factory.file());
    try {
        const ldcf_token number(inner, "expected numeric oid", token_dotted_oid, LDCF_MSG_EXPECTED);
        if (inner.empty()) {
            return number.text();
        }
    } catch (const exc_not_enough_memory_t&) {
        throw;
    } catch (const exc_t&) {
        // Whatever is wrong inside the quotes, the fault to tell is that no numeric oid stands there.
        factory.throw_exc(text, LDCF_MSG_EXPECTED);
    }
    factory.throw_exc(text, LDCF_MSG_EXPECTED);
}

int ldcf_stream::optlen(ldcf_token_factory& factory)
{
    const ldcf_token token(factory);
    if (token[token_number]) {
        return number(token);
    }
    factory.return_token();
    return 0;
}

int ldcf_stream::number(const ldcf_token& token)
{
    const long value = std::strtol(token.text(), nullptr, 10);
    return value > INT_MAX ? INT_MAX : static_cast<int>(value);
}

csgl_string ldcf_stream::qdstring(ldcf_token_factory& factory)
{
    return ldcf_token(factory, "expected qdstring" LDCF_NOT_FOUND_AT, token_qdstring, LDCF_MSG_EXPECTED_QDSTRING)
        .text();
}

csgl_vector<csgl_string> ldcf_stream::qdstrings(ldcf_token_factory& factory)
{
    csgl_vector<csgl_string> result;
    read_quoted_items(factory, token_qdstring, LDCF_EXPECTED("a qdstring or '('"), LDCF_EXPECTED("a qdstring or ')'"),
                      LDCF_MSG_EXPECTED_QDSTRINGS, [&](const csgl_string& text) { result.push_back(text); });
    return result;
}

csgl_string ldcf_stream::descr(ldcf_token_factory& factory)
{
    return ldcf_token(factory, "expected descr" LDCF_NOT_FOUND_AT, token_descr, LDCF_MSG_EXPECTED_DESCR).text();
}

csgl_string ldcf_stream::qdescr(ldcf_token_factory& factory)
{
    return ldcf_token(factory, "expected qdescr" LDCF_NOT_FOUND_AT, token_qdescr, LDCF_MSG_EXPECTED_QDESCR).text();
}

ldcf_names ldcf_stream::qdescrs(ldcf_token_factory& factory, csgl_string& primary)
{
    ldcf_names result;
    read_quoted_items(factory, token_qdescr, LDCF_EXPECTED("a qdescr or '('"), LDCF_EXPECTED("a qdescr or ')'"),
                      LDCF_MSG_EXPECTED_QDESCRS, [&](const csgl_string& name) {
                          if (result.empty()) {
                              primary = name;
                          }
                          result.insert(name);
                      });
    return result;
}

csgl_string ldcf_stream::oids(const csgl_string& keyword, const ldcf_names& names)
{
    if (names.empty()) {
        return {};
    }
    if (names.size() == 1) {
        return ldcf_join(keyword, " ", *names.begin(), " ");
    }
    csgl_string result = keyword + " ( ";
    const char* separator = "";
    for (const csgl_string& name : names) {
        result.append(separator).append(name);
        separator = " $ ";
    }
    return result.append(" ) ");
}

csgl_string ldcf_stream::qdescrs(const csgl_string& keyword, const ldcf_names& names, const csgl_string& primary)
{
    if (names.empty()) {
        return {};
    }
    if (names.size() == 1) {
        return ldcf_join(keyword, " '", primary, "' ");
    }
    csgl_string result = ldcf_join(keyword, " ( '", primary);
    for (const csgl_string& name : names) {
        if (csgl_str_ci_compare(name, primary) != 0) {
            result.append("' '").append(name);
        }
    }
    return result.append("' ) ");
}
