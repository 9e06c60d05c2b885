// Internal to the library: reading lines whose ends are known, so that nothing is scanned twice. line64.h tells the
// rules.
#pragma once

#include <cstddef>

struct ldif_line {
    char* begin;
    char* end;    // at the zero byte that ends it
    bool folded;  // holds markers of folds
};

struct ldif_parts {
    char* type;  // null for a line without ":"
    std::size_t type_length;
    char* value;
    std::size_t length;
    bool is_url;
    bool is_base64;
};

// str_getline of a text that ends at `end`. False where that gives null.
bool ldif_take_line(char** next, char* end, ldif_line& line);

// str_parse_line_v_or_bv of a line that ends at `end`. `marked` says whether it may hold markers.
int ldif_split_line(char* line, char* end, int mode, bool marked, ldif_parts& parts);

// Whether a text that ends at `end` holds markers: of folds, or bytes that came with it.
bool ldif_has_marker(const char* text, const char* end);

// Removes the markers from a text that ends at `end`. Returns its new end.
char* ldif_remove_folds(char* text, char* end);
