// The strict checkers: see dn_check.h. Each step of the grammar is a function that moves `at_` on or tells what is
// wrong.
#include "servers/vrnd/libdirbase/model/dn_check.h"

#include <cstring>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/model/dn_chars.h"

using dn_chars::is;

namespace {

bool is_pair(const char* digits)
{
    return is(digits[0], dn_chars::hex) && is(digits[1], dn_chars::hex);
}

class checker {
public:
    checker(const char* text, bool whole_dn) : at_(text), whole_dn_(whole_dn) {}

    // The text isn't empty.
    bool run()
    {
        for (;; ++at_) {  // behind a separator there is another pair
            if (!pair()) {
                return false;
            }
            if (*at_ == '\0') {
                return true;
            }
            if (*at_ != '+' && !(whole_dn_ && (*at_ == ',' || *at_ == ';'))) {
                if (whole_dn_) {
                    return refuse("Found more than one rdn within a rdn\n");
                }
                debug_error("Found  %s (expected end of rdn)\n", at_);
                return false;
            }
        }
    }

    const char* at() const { return at_; }

private:
    bool refuse(const char* line)
    {
        debug_error("%s%s", whole_dn_ ? "dn_check: " : "", line);
        return false;
    }

    void skip_blanks() { at_ += std::strspn(at_, " \n\r"); }

    bool pair()
    {
        skip_blanks();
        if (!type()) {
            return false;
        }
        skip_blanks();
        if (*at_ != '=') {
            return refuse("Found bad char (expected '=')\n");
        }
        ++at_;
        skip_blanks();
        if (whole_dn_ && (*at_ == ',' || *at_ == ';')) {
            debug_error("missing value in RDN\n");
            return false;
        }
        if (!value()) {
            return false;
        }
        skip_blanks();
        return true;
    }

    bool type()
    {
        const bool prefixed = std::strncmp(at_, "oid.", 4) == 0 || std::strncmp(at_, "OID.", 4) == 0;
        if (!prefixed && !is(*at_, dn_chars::digit)) {
            if (!is(*at_, dn_chars::letter)) {
                return refuse("Found bad DN (dn[0]!=alpha_num)\n");
            }
            skip(dn_chars::name);
            return true;
        }
        at_ += prefixed ? 4 : 0;
        for (;; ++at_) {  // runs of digits with dots between them
            if (!is(*at_, dn_chars::digit)) {
                return refuse("Found bad char (expected digit)\n");
            }
            skip(dn_chars::digit);
            if (*at_ != '.') {
                return true;
            }
        }
    }

    void skip(unsigned classes)
    {
        while (is(*at_, classes)) {
            ++at_;
        }
    }

    bool value()
    {
        if (*at_ == '"') {
            return quoted();
        }
        if (*at_ == '#') {
            return hex_string();
        }
        while (!is(*at_, dn_chars::special | dn_chars::hash | dn_chars::end) || at_escape()) {
            at_ += *at_ == '\\' ? 2 : 1;  // of a pair, the second digit is a character like others
        }
        return true;
    }

    bool at_escape() const
    {
        return *at_ == '\\' && (is(at_[1], dn_chars::special | dn_chars::hash) || is_pair(at_ + 1));
    }

    bool quoted()
    {
        for (++at_; *at_ != '"'; at_ += *at_ == '\\' ? 2 : 1) {
            if (*at_ == '\0' || (*at_ == '\\' && !at_escape())) {
                return refuse("Found bad char (expected \")\n");
            }
        }
        ++at_;
        return true;
    }

    bool hex_string()
    {
        ++at_;
        if (!is_pair(at_)) {
            return refuse("Found bad char (expected digit)\n");
        }
        while (is_pair(at_)) {
            at_ += 2;
        }
        return true;
    }

    const char* at_;
    bool whole_dn_;
};

int check(const char* text, bool whole_dn, std::size_t* offset)
{
    bool good = false;
    std::size_t fault = 0;
    if (text == nullptr) {
        debug_error("%sFound bad DN (NULL)\n", whole_dn ? "dn_check: " : "");
    } else {
        checker checking(text, whole_dn);
        good = *text == '\0' || checking.run();
        fault = static_cast<std::size_t>(checking.at() - text);
    }
    if (good) {
        return LDAP_SUCCESS;
    }
    if (offset != nullptr) {
        *offset = fault;
    }
    return LDAP_INVALID_DN_SYNTAX;
}

}  // namespace

extern "C" {

int dn_check(const char* dn, std::size_t* offset)
{
    return check(dn, true, offset);
}

int rdn_check(const char* rdn, std::size_t* offset)
{
    return check(rdn, false, offset);
}

}  // extern "C"
