// The exceptions of the foundation and the schema engine: one tree, rooted at exc_t.
//
// A class says what happened by its type alone; the fields (code, place, message) are those of the root. An exception
// with a message id logs itself once, while it is built, so whoever catches it does not log it again. Exceptions of
// this tree end at the exported functions that return result codes.
#pragma once

#include <cstdint>

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libcsgl/csgl_message.h"

class csgl_output;

class DIRBASE_EXPORT exc_t {
public:
    // Builds the message and logs it with severity 8. When there is no memory for that, exc_not_enough_memory_t comes
    // in place of the exception.
    //
    //   file, line  the raising place; the text of file is kept, not copied. For a fault in schema text it is the name
    //               of the source, which lives as long as the source's reader: a handler further up must not use it.
    //   text        the message with its markers (csgl_message.h); null is the empty one
    //   code        the class's number, an LDAP result code in exc_ldap_rc_t, a foreign code in exc_unmapped_t
    //   message_id  message and catalogue number (csgl_get_msgid, csgl_get_catid); 0 logs nothing
    exc_t(const char* file, int line, const char* text, std::int64_t code, int message_id);
    virtual ~exc_t();
    exc_t(const exc_t&) = default;
    exc_t& operator=(const exc_t&) = default;

    std::int64_t code() const { return code_; }
    const char* file() const { return file_; }
    int line() const { return line_; }
    const csgl_message& message() const { return message_; }

    // Stores a flag for the processes that load the library and returns its last value, at first false. This library
    // itself never reads it.
    static bool be_quiet(bool quiet);

    // Raise the class that stands for a foreign code, or return when the code is 0. An unknown code raises
    // exc_unmapped_t with that code. throw_posix_error takes an errno; throw_last_tcpip_error takes the calling
    // thread's.
    static void throw_csgl_error(const char* file, int line, long code, const char* message);
    static void throw_cspl_error(const char* file, int line, long code);
    static void throw_posix_error(const char* file, int line, long code);
    static void throw_tcpip_error(const char* file, int line, long code);
    static void throw_last_tcpip_error(const char* file, int line);

private:
    DIRBASE_HIDDEN static bool _quiet;

    std::int64_t code_;
    const char* file_;
    int line_;
    csgl_message message_;
};

// Prints "exc ", the file in single quotes, the line, the code as an unsigned number, and the sentence in single
// quotes.
DIRBASE_EXPORT csgl_output& operator<<(csgl_output& output, const exc_t& exception);

// A class that is caught and never raised.
#define CSGL_EXCEPTION_GROUP(name, parent)                                                    \
    class DIRBASE_EXPORT name : public parent {                                               \
    protected:                                                                                \
        name(const char* file, int line, const char* text, std::int64_t code, int message_id) \
            : parent(file, line, text, code, message_id)                                      \
        {                                                                                     \
        }                                                                                     \
    };

// A class that is raised with the code of its own, and may have children with theirs.
#define CSGL_EXCEPTION(name, parent, number)                                                  \
    class DIRBASE_EXPORT name : public parent {                                               \
    public:                                                                                   \
        static constexpr std::int64_t class_code = number;                                    \
        name(const char* file, int line, const char* text, int message_id)                    \
            : parent(file, line, text, class_code, message_id)                                \
        {                                                                                     \
        }                                                                                     \
                                                                                              \
    protected:                                                                                \
        name(const char* file, int line, const char* text, std::int64_t code, int message_id) \
            : parent(file, line, text, code, message_id)                                      \
        {                                                                                     \
        }                                                                                     \
    };

// A class that is raised with a code that the raiser chooses.
#define CSGL_EXCEPTION_WITH_CODE(name, parent)                                                \
    class DIRBASE_EXPORT name : public parent {                                               \
    public:                                                                                   \
        name(const char* file, int line, const char* text, std::int64_t code, int message_id) \
            : parent(file, line, text, code, message_id)                                      \
        {                                                                                     \
        }                                                                                     \
    };

// The caller or the program is wrong.
CSGL_EXCEPTION_GROUP(exc_logic_t, exc_t)
CSGL_EXCEPTION(exc_invalid_state_t, exc_logic_t, 0x20030013)
CSGL_EXCEPTION(exc_state_underflow_t, exc_invalid_state_t, 0x20030014)
CSGL_EXCEPTION(exc_state_overflow_t, exc_invalid_state_t, 0x20030015)
CSGL_EXCEPTION(exc_invalid_cast_t, exc_logic_t, 0x20030016)
CSGL_EXCEPTION(exc_invalid_operation_t, exc_logic_t, 0x20030017)
CSGL_EXCEPTION(exc_invalid_protocol_t, exc_logic_t, 0x20030018)
CSGL_EXCEPTION(exc_assertion_failed_t, exc_logic_t, 0x20030003)
CSGL_EXCEPTION(exc_precondition_failed_t, exc_assertion_failed_t, 0x20030004)
CSGL_EXCEPTION(exc_postcondition_failed_t, exc_assertion_failed_t, 0x20030005)
CSGL_EXCEPTION(exc_invariant_failed_t, exc_assertion_failed_t, 0x20030006)
CSGL_EXCEPTION(exc_should_not_execute_t, exc_assertion_failed_t, 0x20030007)
CSGL_EXCEPTION(exc_not_implemented_t, exc_assertion_failed_t, 0x20030008)
CSGL_EXCEPTION(exc_out_of_range_t, exc_logic_t, 0x20030009)
CSGL_EXCEPTION(exc_range_underflow_t, exc_out_of_range_t, 0x2003000a)
CSGL_EXCEPTION(exc_range_overflow_t, exc_out_of_range_t, 0x2003000b)
CSGL_EXCEPTION(exc_invalid_parameter_t, exc_logic_t, 0x20000000)
CSGL_EXCEPTION(exc_invalid_parameter_type_t, exc_invalid_parameter_t, 0x2003000c)
CSGL_EXCEPTION(exc_domain_underflow_t, exc_invalid_parameter_t, 0x2003000d)
CSGL_EXCEPTION(exc_unexpected_end_of_input_t, exc_domain_underflow_t, 0x2003000e)
CSGL_EXCEPTION(exc_domain_overflow_t, exc_invalid_parameter_t, 0x2003000f)
CSGL_EXCEPTION(exc_invalid_handle_t, exc_invalid_parameter_t, 0x20030010)
CSGL_EXCEPTION(exc_invalid_address_t, exc_invalid_parameter_t, 0x20030011)
CSGL_EXCEPTION(exc_invalid_name_t, exc_invalid_parameter_t, 0x20030012)

// The input text or data is wrong.
CSGL_EXCEPTION_GROUP(exc_input_t, exc_t)
CSGL_EXCEPTION(exc_invalid_token_t, exc_input_t, 0x20030000)
CSGL_EXCEPTION(exc_invalid_grammar_t, exc_input_t, 0x20030001)
CSGL_EXCEPTION(exc_invalid_input_t, exc_input_t, 0x20030002)

// The environment failed.
CSGL_EXCEPTION_GROUP(exc_runtime_t, exc_t)
CSGL_EXCEPTION_GROUP(exc_not_enough_resources_t, exc_runtime_t)
CSGL_EXCEPTION(exc_not_enough_memory_t, exc_not_enough_resources_t, 0x20000001)
CSGL_EXCEPTION(exc_not_enough_disk_t, exc_not_enough_resources_t, 0x2003001c)
CSGL_EXCEPTION(exc_not_enough_handles_t, exc_not_enough_resources_t, 0x2003001d)
CSGL_EXCEPTION_GROUP(exc_timing_t, exc_runtime_t)
CSGL_EXCEPTION(exc_interrupt_t, exc_timing_t, 0x2003001e)
CSGL_EXCEPTION(exc_timeout_t, exc_timing_t, 0x20000002)
CSGL_EXCEPTION(exc_object_busy_t, exc_timing_t, 0x2003001f)
CSGL_EXCEPTION(exc_would_deadlock_t, exc_timing_t, 0x20030020)
CSGL_EXCEPTION(exc_owner_died_t, exc_runtime_t, 0x20030021)
CSGL_EXCEPTION(exc_hardware_error_t, exc_runtime_t, 0x20030019)

// An outcome that a caller may well expect.
CSGL_EXCEPTION_GROUP(exc_maybe_t, exc_t)
CSGL_EXCEPTION(exc_end_of_input_t, exc_maybe_t, 0x20030024)
CSGL_EXCEPTION(exc_does_not_exist_t, exc_maybe_t, 0x20030023)
CSGL_EXCEPTION(exc_already_exists_t, exc_maybe_t, 0x20030022)
CSGL_EXCEPTION(exc_permission_denied_t, exc_maybe_t, 0x20030025)

CSGL_EXCEPTION(exc_unexpected_t, exc_t, 0x20030026)
CSGL_EXCEPTION_WITH_CODE(exc_unmapped_t, exc_t)  // a foreign code without a class
CSGL_EXCEPTION_WITH_CODE(exc_ldap_rc_t, exc_t)   // carries an LDAP result code

#undef CSGL_EXCEPTION_GROUP
#undef CSGL_EXCEPTION
#undef CSGL_EXCEPTION_WITH_CODE
