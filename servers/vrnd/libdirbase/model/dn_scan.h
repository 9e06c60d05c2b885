// The machines that find the parts of a DN and resolve its values, behind both the structured and the plain routines.
//
// All of them read a text without changing it and never look behind its end.
#pragma once

#include <cstddef>

// Which rules a machine keeps.
enum class dn_form {
    structured,  // those of dn_normalize_esc
    older,       // those of find_end_attr_type, find_end_attr_value and minAttrValue
};

// One element of a DN, as its machine found it.
struct dn_element {
    const char* first = nullptr;  // its first character
    const char* end = nullptr;    // behind its last one; equal to `first` for an empty element
    const char* next = nullptr;   // where the machine stopped: the "=", a separator, the end, or what it refused
    int error = 0;                // 0 or one of dn_error
    bool numeric = false;         // of a type: it is an OID
    bool bare = false;  // of a value: it has neither quotes nor escapes nor a "#" in front, so it is its own bare value
};

// Finds the type at `at`, and the value that begins at or behind `at`.
dn_element scan_type(const char* at, dn_form form);
dn_element scan_value(const char* at, dn_form form);

// What became of a value.
struct dn_resolved {
    std::size_t length = 0;      // bytes written, no terminator among them; up to the fault when there is one
    const char* next = nullptr;  // where the value ended: `end` or a separator
    int error = 0;               // 0 or one of dn_error
};

// Resolves the value in [at, end) to its bare bytes. `out` has room for as many bytes as the text has. In the older
// form a "#" begins plain pairs of digits.
dn_resolved resolve_value(const char* at, const char* end, char* out, dn_form form);

// Whether the older handling of DNs is on (VRND_V4_DN_PROCESSING): the environment is asked once, at the first use.
bool older_dn_processing();
