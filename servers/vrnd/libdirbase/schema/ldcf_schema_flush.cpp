// The way of a changed schema to disk: a temporary file beside each modified file, then one in the place of the other.
#include <unistd.h>

#include <cerrno>
#include <exception>

#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libcsgl/csgl_file.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema_recover.h"

namespace {

// Writes one section: the text of each definition that is at home in a file, a line each.
template <typename Map, typename Text, typename AtHome>
void write_section(csgl_output& output, const char* keyword, const Map& map, Text&& text, AtHome&& at_home)
{
    output << keyword << " {\n";
    ldcf_for_each_definition(map, [&](const auto& definition) {
        if (at_home(definition)) {
            output << text(definition) << "\n";
        }
    });
    output << "}\n\n";
}

void remove_if_there(const csgl_string& file)
{
    try {
        csgl_file::remove(file);
    } catch (const exc_does_not_exist_t&) {
        // That nothing stands there is what was wanted.
    }
}

// The old content of one schema file, kept under a second name while the new content takes its place. Unless the change
// is kept, the destructor puts it back. The second name is built on that of the temporary file, which is the server's
// own, so that no copy of the administrator's is in its way.
//
// Which of these names stand when the process is killed says what is to be loaded afterwards (ldcf_schema_recover.h):
// no backup goes before the last temporary file has gone into its place.
class replaced_file {
public:
    explicit replaced_file(const csgl_string& file) : file_(file), backup_(ldcf_backup_of(file))
    {
        remove_if_there(backup_);
        existed_ = ::link(file_, backup_) == 0;
        if (!existed_ && errno != ENOENT) {
            exc_t::throw_posix_error(__FILE__, __LINE__, errno);
        }
    }
    replaced_file(replaced_file&& other) noexcept
        : file_(other.file_), backup_(other.backup_), existed_(other.existed_), settled_(other.settled_)
    {
        other.settled_ = true;
    }
    ~replaced_file()
    {
        if (settled_) {
            return;
        }
        const int failed = existed_ ? ::rename(backup_, file_) : ::unlink(file_);
        if (failed != 0 && errno != ENOENT) {
            debug_error("Error - ldcf_schema: %s could not be put back, errno %d\n", file_.c_str(), errno);
        } else if (existed_) {
            ::unlink(backup_);  // a file that was never replaced has both names still
        }
    }

    void take_new_content() { csgl_file::rename(ldcf_temporary_of(file_), file_, csgl_file_force); }

    // The new content stays.
    void keep() noexcept
    {
        settled_ = true;
        if (existed_ && ::unlink(backup_) != 0) {
            debug_error("Error - ldcf_schema: %s could not be removed, errno %d\n", backup_.c_str(), errno);
        }
    }

private:
    csgl_string file_;
    csgl_string backup_;
    bool existed_ = false;
    bool settled_ = false;
};

}  // namespace

void ldcf_schema::flush() const
{
    for (const auto& [file, state] : files) {
        if (state == modified_indicator::modified) {
            flush(file);
        }
    }
}

void ldcf_schema::flush(const csgl_string& file) const
{
    csgl_output_file output(ldcf_temporary_of(file), csgl_output_truncate);
    const auto standard = [](const auto& definition) { return definition.v3_string().c_str(); };
    const auto at_home = [&](const auto& definition) { return definition->v3_file() == file; };

    write_section(output, "objectClasses", object_classes, standard, at_home);
    write_section(output, "attributeTypes", attribute_types, standard, at_home);
    write_section(
        output, "XANattributeTypes", attribute_types,
        [](const ldcf_attrtype& attribute) { return attribute.xan_string().c_str(); },
        [&](const ldcf_attrtype& attribute) {
            return attribute->xan_file() == file ||
                   (attribute->has_extended() && attribute->xan_file().empty() && attribute->v3_file() == file);
        });
    write_section(output, "ldapSyntaxes", syntaxes, standard, at_home);
    write_section(output, "matchingRules", matching_rules, standard, at_home);
    output.flush_to_disk();
}

void ldcf_schema::flush_commit()
{
    // A temporary file that an earlier change could not remove would make this commit look as if it were not through.
    csgl_vector<csgl_string> others;
    for (const auto& [file, state] : files) {
        if (state == modified_indicator::flushed) {
            others.push_back(file);
        }
    }
    if (ldcf_recovery leftovers(others); leftovers.found() == ldcf_leftovers::unused) {
        leftovers.run();
    }
    csgl_vector<replaced_file> replaced;
    for (const auto& [file, state] : files) {
        if (state == modified_indicator::modified) {
            replaced.emplace_back(file);
            replaced.back().take_new_content();
        }
    }
    for (replaced_file& done : replaced) {
        done.keep();
    }
    for (auto& [file, state] : files) {
        state = modified_indicator::flushed;
    }
}

void ldcf_schema::flush_rollback()
{
    std::exception_ptr first_failure;
    try {
        // What a failed commit could not put back is tried once more. When it fails again the temporary files stay:
        // they tell the next start that the commit was not through.
        if (ldcf_recovery leftovers(*this); leftovers.commit_interrupted()) {
            leftovers.run();
        }
    } catch (const exc_t&) {
        first_failure = std::current_exception();
    }
    const bool put_back = !first_failure;
    for (auto& [file, state] : files) {
        if (state == modified_indicator::modified) {
            state = modified_indicator::flushed;
            try {
                if (put_back) {
                    remove_if_there(ldcf_temporary_of(file));
                }
            } catch (const exc_t&) {
                first_failure = first_failure ? first_failure : std::current_exception();
            }
        }
    }
    if (first_failure) {
        std::rethrow_exception(first_failure);
    }
}
