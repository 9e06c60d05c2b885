// The exception tree's root and the raising of foreign codes: see csgl_exception.h.
#include "servers/vrnd/libcsgl/csgl_exception.h"

#include <cerrno>

#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libcsgl/csgl_output.h"

namespace {

// Stands in for the message of an exc_not_enough_memory_t when memory doesn't even last for that.
const csgl_message& reserve_message()
{
    static const csgl_message reserve("not enough memory", 0, "", 0);
    return reserve;
}

// Makes the reserve while there is still memory.
[[maybe_unused]] const csgl_message& reserve_made_at_load = reserve_message();

// An exc_not_enough_memory_t that can't have a message of its own takes the reserve: raising another one instead would
// only need a message in turn.
csgl_message make_message(const char* file, int line, const char* text, std::int64_t code, int number)
{
    if (code != exc_not_enough_memory_t::class_code || text == nullptr) {
        return {text, number, file, line};
    }
    csgl_message message = csgl_message::make_or_none(text, number, file, line);
    return message.get() == nullptr ? reserve_message() : message;
}

template <typename Class>
[[noreturn]] void raise(const char* file, int line, const char* text)
{
    throw Class(file, line, text, 0);
}

}  // namespace

bool exc_t::_quiet = false;

exc_t::exc_t(const char* file, int line, const char* text, std::int64_t code, int message_id)
    : code_(code), file_(file), line_(line), message_(make_message(file, line, text, code, csgl_get_msgid(message_id)))
{
    if (message_.get() != nullptr) {
        message_->log(MSG_SEVERE, csgl_get_catid(message_id));
    }
}

exc_t::~exc_t() = default;

bool exc_t::be_quiet(bool quiet)
{
    const bool before = _quiet;
    _quiet = quiet;
    return before;
}

csgl_output& operator<<(csgl_output& output, const exc_t& exception)
{
    const csgl_string file(exception.file());
    const csgl_string text(exception.message().text());
    return output << "exc " << csgl_str_quoted(file, '\'') << " " << exception.line() << " "
                  << static_cast<unsigned long>(exception.code()) << " " << csgl_str_quoted(text, '\'');
}

void exc_t::throw_csgl_error(const char* file, int line, long code, const char* message)
{
    switch (code) {
    case 0: return;
#define CSGL_RAISE(name) \
    case name::class_code: throw name(file, line, message, 0);
        CSGL_RAISE(exc_invalid_state_t)
        CSGL_RAISE(exc_state_underflow_t)
        CSGL_RAISE(exc_state_overflow_t)
        CSGL_RAISE(exc_invalid_cast_t)
        CSGL_RAISE(exc_invalid_operation_t)
        CSGL_RAISE(exc_invalid_protocol_t)
        CSGL_RAISE(exc_assertion_failed_t)
        CSGL_RAISE(exc_precondition_failed_t)
        CSGL_RAISE(exc_postcondition_failed_t)
        CSGL_RAISE(exc_invariant_failed_t)
        CSGL_RAISE(exc_should_not_execute_t)
        CSGL_RAISE(exc_not_implemented_t)
        CSGL_RAISE(exc_out_of_range_t)
        CSGL_RAISE(exc_range_underflow_t)
        CSGL_RAISE(exc_range_overflow_t)
        CSGL_RAISE(exc_invalid_parameter_t)
        CSGL_RAISE(exc_invalid_parameter_type_t)
        CSGL_RAISE(exc_domain_underflow_t)
        CSGL_RAISE(exc_unexpected_end_of_input_t)
        CSGL_RAISE(exc_domain_overflow_t)
        CSGL_RAISE(exc_invalid_handle_t)
        CSGL_RAISE(exc_invalid_address_t)
        CSGL_RAISE(exc_invalid_name_t)
        CSGL_RAISE(exc_invalid_token_t)
        CSGL_RAISE(exc_invalid_grammar_t)
        CSGL_RAISE(exc_not_enough_memory_t)
        CSGL_RAISE(exc_not_enough_disk_t)
        CSGL_RAISE(exc_not_enough_handles_t)
        CSGL_RAISE(exc_interrupt_t)
        CSGL_RAISE(exc_timeout_t)
        CSGL_RAISE(exc_object_busy_t)
        CSGL_RAISE(exc_would_deadlock_t)
        CSGL_RAISE(exc_owner_died_t)
        CSGL_RAISE(exc_hardware_error_t)
        CSGL_RAISE(exc_end_of_input_t)
        CSGL_RAISE(exc_does_not_exist_t)
        CSGL_RAISE(exc_already_exists_t)
        CSGL_RAISE(exc_permission_denied_t)
        CSGL_RAISE(exc_unexpected_t)
#undef CSGL_RAISE
    default: throw exc_unmapped_t(file, line, message, code, 0);  // exc_invalid_input_t's code has always been here too
    }
}

void exc_t::throw_cspl_error(const char* file, int line, long code)
{
    if (code != 0) {
        throw exc_unmapped_t(file, line, "unmapped CSPL error", code, 0);
    }
}

void exc_t::throw_posix_error(const char* file, int line, long code)
{
    switch (code) {
    case 0: return;
    case EPERM: raise<exc_permission_denied_t>(file, line, "permission_denied (EPERM)");
    case EACCES: raise<exc_permission_denied_t>(file, line, "permission_denied (EACCES)");
    case EROFS: raise<exc_permission_denied_t>(file, line, "permission_denied (EROFS)");
    case ENOENT: raise<exc_does_not_exist_t>(file, line, "does_not_exist (ENOENT)");
    case ESRCH: raise<exc_does_not_exist_t>(file, line, "does_not_exist (ESRCH)");
    case ENXIO: raise<exc_does_not_exist_t>(file, line, "does_not_exist (ENXIO)");
    case ENODEV: raise<exc_does_not_exist_t>(file, line, "does_not_exist (ENODEV)");
    case EIDRM: raise<exc_does_not_exist_t>(file, line, "does_not_exist (EIDRM)");
    case EEXIST: raise<exc_already_exists_t>(file, line, "already_exists (EEXIST)");
    case E2BIG: raise<exc_domain_overflow_t>(file, line, "domain_overflow (E2BIG)");
    case EBADF: raise<exc_invalid_handle_t>(file, line, "invalid_handle (EBADF)");
    case EFAULT: raise<exc_invalid_address_t>(file, line, "invalid_address (EFAULT)");
    case EINVAL: raise<exc_invalid_parameter_t>(file, line, "invalid_parameter (EINVAL)");
    case EAGAIN: raise<exc_object_busy_t>(file, line, "object_busy (EAGAIN)");
    case EBUSY: raise<exc_object_busy_t>(file, line, "object_busy (EBUSY)");
    case ETXTBSY: raise<exc_object_busy_t>(file, line, "object_busy (ETXTBSY)");
    case EDEADLK: raise<exc_would_deadlock_t>(file, line, "would_deadlock (EDEADLK)");
    case ENOMEM: raise<exc_not_enough_memory_t>(file, line, "not_enough_memory (ENOMEM)");
    case ENOSPC: raise<exc_not_enough_disk_t>(file, line, "not_enough_disk (ENOSPC)");
    case EDQUOT: raise<exc_not_enough_disk_t>(file, line, "not_enough_disk (EDQUOT)");
    case ENFILE: raise<exc_not_enough_handles_t>(file, line, "not_enough_handles (ENFILE)");
    case EMFILE: raise<exc_not_enough_handles_t>(file, line, "not_enough_handles (EMFILE)");
    case ENOLCK: raise<exc_not_enough_handles_t>(file, line, "not_enough_handles (ENOLCK)");
    case ENOSYS: raise<exc_not_implemented_t>(file, line, "not_implemented (ENOSYS)");
    case ENOTSUP: raise<exc_not_implemented_t>(file, line, "not_implemented (ENOTSUP)");
    case EOVERFLOW: raise<exc_range_overflow_t>(file, line, "range_overflow (EOVERFLOW)");
    default: throw exc_unmapped_t(file, line, "unmapped UNQ error", code, 0);
    }
}

void exc_t::throw_tcpip_error(const char* file, int line, long code)
{
    throw_posix_error(file, line, code);
}

void exc_t::throw_last_tcpip_error(const char* file, int line)
{
    throw_posix_error(file, line, errno);
}
