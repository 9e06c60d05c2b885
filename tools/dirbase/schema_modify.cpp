// dirbase schema modify
//
// The change goes through the phases that a server takes it through (ldcf_schema_modify.h), with the schema directory
// locked. Between vote and commit the tool asks for one thing more: what the vote has written must load again.
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <set>
#include <utility>
#include <variant>

#include "servers/vrnd/libdirbase/schema/ldcf_schema_modify.h"
#include "tools/dirbase/definition_users.h"
#include "tools/dirbase/schema_commands.h"
#include "tools/dirbase/schema_directory.h"
#include "tools/dirbase/text_file.h"

namespace dirbase_tool {

namespace {

using any_definition = std::variant<ldcf_syntax, ldcf_matchrule, ldcf_attrtype, ldcf_objclass>;

auto phase_function(const ldcf_syntax&)
{
    return ldcf_schema_modify_syntax;
}
auto phase_function(const ldcf_matchrule&)
{
    return ldcf_schema_modify_matchrule;
}
auto phase_function(const ldcf_attrtype&)
{
    return ldcf_schema_modify_attrtype;
}
auto phase_function(const ldcf_objclass&)
{
    return ldcf_schema_modify_objclass;
}

ldcf_modify_op operation_of(const std::string& word)
{
    if (word == "add") {
        return ldcf_modify_add;
    }
    return word == "delete" ? ldcf_modify_delete : ldcf_modify_replace;
}

const char* done_word(ldcf_modify_op operation)
{
    switch (operation) {
    case ldcf_modify_add: return "added";
    case ldcf_modify_delete: return "deleted";
    case ldcf_modify_replace: break;
    }
    return "replaced";
}

// ---- the definition ------------------------------------------------------------------------------------------------

template <typename Map>
void collect(std::vector<any_definition>& found, Map& map)
{
    ldcf_for_each_definition(map, [&found](const auto& definition) { found.emplace_back(definition); });
    // An added definition becomes part of the schema. The scratch schema must let go of it, or it would unlink it
    // when it goes itself.
    map.clear();
}

// The one definition that a file holds. Its home file is the empty name, as for a definition that comes from a client.
any_definition read_definition(const std::string& file)
{
    const std::string text = read_text(file, text_source::any);
    ldcf_schema scratch;
    parse_schema_text(scratch, text, "", source_name(file));

    std::vector<any_definition> found;
    collect(found, scratch.syntaxes);
    collect(found, scratch.matching_rules);
    collect(found, scratch.attribute_types);
    collect(found, scratch.object_classes);
    if (found.size() != 1) {
        throw tool_failure(status_unusable, source_name(file), 0,
                           found.empty() ? "holds no definition, where exactly one is expected"
                                         : "holds " + std::to_string(found.size()) +
                                               " definitions, where exactly one is expected");
    }
    const auto* attribute = std::get_if<ldcf_attrtype>(&found.front());
    if (attribute != nullptr && (*attribute)->state() == ldcf_attrtype_state::xan_defined) {
        throw tool_failure(status_findings, source_name(file), 0,
                           "holds the extended definition of attribute type '" + text_of(attribute->oid()) +
                               "' alone; its standard definition must come with it");
    }
    return found.front();
}

// ---- what a change is about ----------------------------------------------------------------------------------------

bool loses_extension(const ldcf_attrtype& replacement)
{
    const ldcf_attrtype active = ldcf_find(ldcf_schema_g->attribute_types, replacement.oid());
    return active && active->has_extended() && !replacement->has_extended();
}
template <typename T>
bool loses_extension(const T&)
{
    return false;
}

// ---- the files -----------------------------------------------------------------------------------------------------

std::string temporary_of(const std::string& path)
{
    return path + file_suffix;
}

std::vector<std::string> modified_files(const ldcf_schema& schema)
{
    std::vector<std::string> paths;
    for (const auto& [file, state] : schema.files) {
        if (state == ldcf_schema::modified_indicator::modified) {
            paths.push_back(text_of(file));
        }
    }
    return paths;
}

// Loads the schema as it would stand on disk after the commit. The vote is content with less: it lets a matching rule
// go that attribute types still name, it takes a definition for the home file's purpose on trust (encryption in the
// file of configuration attributes), and nobody there reads back what was written.
void prove_that_it_loads(const schema_directory& directory, const std::vector<std::string>& modified)
{
    const std::set<std::string> changed(modified.begin(), modified.end());
    ldcf_schema proof;
    directory.load_other(
        proof, [&changed](const std::string& path) { return changed.count(path) != 0 ? temporary_of(path) : path; });
}

// A new file would take the place of the link, and the file that it leads to stay as it was.
void refuse_links(const std::vector<std::string>& paths)
{
    for (const std::string& path : paths) {
        struct stat status = {};
        if (::lstat(path.c_str(), &status) == 0 && S_ISLNK(status.st_mode)) {
            throw tool_failure(status_unusable, path, 0, "a symbolic link; only a file itself can be changed");
        }
    }
}

// A new file takes the place of the old one, so it has to be given to the same owner and the same readers. Only the
// superuser can give it to another owner; what else may go wrong leaves the file to the owner alone.
void keep_permissions(const std::vector<std::string>& paths)
{
    for (const std::string& path : paths) {
        struct stat old_status = {};
        if (::stat(path.c_str(), &old_status) == 0) {
            const std::string temporary = temporary_of(path);
            const bool same_owner = ::chown(temporary.c_str(), old_status.st_uid, old_status.st_gid) == 0;
            ::chmod(temporary.c_str(), old_status.st_mode & (same_owner ? 07777u : 0777u));
        }
    }
}

// While one lives, the signals that end a program from outside wait, so that no change stops half way.
class signals_held {
public:
    signals_held()
    {
        sigset_t set;
        sigemptyset(&set);
        for (const int number : {SIGHUP, SIGINT, SIGQUIT, SIGTERM}) {
            sigaddset(&set, number);
        }
        sigprocmask(SIG_BLOCK, &set, &before_);
    }
    ~signals_held() { sigprocmask(SIG_SETMASK, &before_, nullptr); }
    signals_held(const signals_held&) = delete;
    signals_held& operator=(const signals_held&) = delete;

private:
    sigset_t before_ = {};
};

// ---- the phases ----------------------------------------------------------------------------------------------------

// Runs the change and gives the paths of the changed files. A failure leaves all files as they were.
template <typename T>
std::vector<std::string> run_phases(const schema_directory& directory, ldcf_modify_op operation, T& definition)
{
    const signals_held until_done;
    const auto run = phase_function(definition);
    const auto clean_up = [&] {
        try {
            run(nullptr, operation, ldcf_modify_cleanup, definition);
        } catch (const exc_t& failure) {
            tell("the cleanup failed: " + failure_of(failure, directory.folder()).message());
        }
    };
    try {
        run(nullptr, operation, ldcf_modify_vote, definition);
        std::vector<std::string> paths = modified_files(*ldcf_schema_proposed_g);
        refuse_links(paths);
        prove_that_it_loads(directory, paths);
        keep_permissions(paths);
        run(nullptr, operation, ldcf_modify_commit, definition);
        clean_up();
        return paths;
    } catch (...) {
        run(nullptr, operation, ldcf_modify_rollback, definition);
        clean_up();
        throw;
    }
}

template <typename T>
int modify(const common_options& common, const schema_directory& directory, ldcf_modify_op operation, T definition,
           message_collector& log)
{
    const bool extension_lost = operation == ldcf_modify_replace && loses_extension(definition);
    log.take_warnings();  // of the schema as it was; new ones belong to the change

    std::vector<std::string> changed;
    try {
        changed = run_phases(directory, operation, definition);
    } catch (const exc_t& refusal) {
        throw failure_of(refusal, directory.folder(),
                         operation == ldcf_modify_delete ? note_of_users(definition, *ldcf_schema_g) : "");
    }
    for (std::string& path : changed) {
        path = directory.name_of(path);
    }
    std::vector<std::string> warnings = log.take_warnings();
    if (extension_lost) {
        warnings.push_back("The extended definition of attribute type '" + text_of(definition.name()) +
                           "' is gone, since its new definition came without one.");
    }
    for (const std::string& warning : warnings) {
        tell("warning: " + warning);
    }

    const std::string kind = ldcf_kind_of(definition);
    const std::string name = text_of(definition.name());
    const std::string oid = text_of(definition.oid());
    std::string text =
        on_one_line(done_word(operation) + (": " + kind) + " '" + name + "'" + (name == oid ? "" : " (" + oid + ")")) +
        "\n";
    for (const std::string& file : changed) {
        text += "changed: " + on_one_line(file) + "\n";
    }
    try {
        if (common.as_json) {
            write_json(json{{"ok", true},
                            {"done", done_word(operation)},
                            {"kind", kind},
                            {"oid", json_of_value(oid)},
                            {"name", json_of_value(name)},
                            {"changedFiles", json_of_values(changed)},
                            {"warnings", warnings}});
        } else {
            write_result(text);
        }
    } catch (const output_failure& failure) {
        throw output_failure(failure.what(), false, "the change is made all the same");
    }
    return status_yes;
}

}  // namespace

int modify_schema(const common_options& common, const std::string& operation, const std::string& file,
                  message_collector& log)
{
    // Who reads the report may go ahead of its end. The change, and the exit status that tells of it, don't depend on
    // that.
    std::signal(SIGPIPE, SIG_IGN);
    any_definition definition = read_definition(file);  // ahead of the lock: it may come slowly
    const schema_directory directory(common.schema_folder, schema_directory::purpose::change);
    directory.load();
    return std::visit(
        [&](auto& one) { return modify(common, directory, operation_of(operation), std::exchange(one, {}), log); },
        definition);
}

}  // namespace dirbase_tool
