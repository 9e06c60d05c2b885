// A server in small: it starts the library on a folder of schema files, lets threads check an entry and evaluate a
// filter, changes the schema, and does so once more.
//
//   embedding FOLDER     FOLDER holds schema.list and the files that it names; the last of them is written to
#include <cstdio>
#include <fstream>
#include <string>
#include <thread>
#include <vector>

#include "servers/vrnd/libdirbase/dirbase.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema_recover.h"

static Backend store = {.be_type = "rdbm"};  // attribute types get their tables in it

// What a thread holds while it does anything with names, DNs, values, entries or filters.
class schema_reader {
public:
    schema_reader() { _rdbm_rd_lock(ldcf_api_get_modify_attr_info_lock_g()); }
    ~schema_reader() { _rdbm_rd_unlock(ldcf_api_get_modify_attr_info_lock_g()); }
};

static bool start(const std::vector<std::string>& files)
{
    initDOSLocks();  // 1. the locks of the process, while there is one thread
    initEnt2StrMutex();
    vrn_strerror_init();
    g_backends = &store;  // 2. the settings and the list of back ends

    std::vector<const char*> names;
    for (const std::string& file : files) {
        names.push_back(file.c_str());
    }
    if (ldcf_recover_files(names.data(), names.size()) != 0) {  // 3. what a change left that was killed
        return false;
    }
    ldcf_api_schema_init();  // 4. the schema lock
    for (const char* name : names) {
        if (ldcf_api_schema_parse(name) != 0) {  // 5. the files, in their order
            return false;
        }
    }
    return ldcf_api_schema_complete() == 0 && ldcf_api_schema_complete_db_names() == 0;  // 6. links, names in the store
}

// What a thread of the server does for an operation: 0, or why the entry is refused.
static int check(std::string text, const char* filter_text, bool& found)
{
    const schema_reader for_the_whole_operation;
    Entry* entry = str2entry(text.data(), 1, 1);  // reads in place
    Filter* filter = str2filter(filter_text, 1);
    bool added = false;
    const int result = entry != nullptr ? ldcf_api_schema_check(entry, &added, false) : LDAP_OPERATIONS_ERROR;
    found = entry != nullptr && filter != nullptr && test_filter(entry, filter) == FILTER_TRUE;
    filter_free(filter);
    entry_free(entry);
    return result;
}

// One change, in its phases, by the only thread that may look at the schema meanwhile.
static bool add_attribute(const char* definition)
{
    rdbm_lock_t* lock = ldcf_api_get_modify_attr_info_lock_g();
    _rdbm_wr_lock(lock);
    bool changed = false;
    ldcf_attrtype attribute;
    const auto run = [&](ldcf_modify_phase phase) {
        ldcf_schema_modify_attrtype(nullptr, ldcf_modify_add, phase, attribute);
    };
    try {
        {
            ldcf_schema scratch;  // lets go of the definition before the change takes it
            scratch.parse_str(definition, "");
            attribute = scratch.attribute_types.begin()->second;
            scratch.attribute_types.clear();
        }
        run(ldcf_modify_vote);
        run(ldcf_modify_commit);
        changed = true;
    } catch (const exc_t& failure) {
        std::fprintf(stderr, "embedding: %s\n", failure.message().text());
        run(ldcf_modify_rollback);
    }
    run(ldcf_modify_cleanup);
    ldcf_api_load_attr_hash();  // the change emptied the name cache
    _rdbm_wr_unlock(lock);
    return changed;
}

int main(int argc, char** argv)
{
    const std::string folder = argc == 2 ? argv[1] : "";
    std::ifstream list(folder + "/schema.list");
    std::vector<std::string> files;
    for (std::string line; std::getline(list, line);) {
        if (!line.empty() && line.front() != '#') {
            files.push_back(folder + "/" + line);
        }
    }
    if (files.empty() || !start(files)) {
        std::fprintf(stderr, "embedding: no schema that can be used\n");  // the message log has told why
        return 1;
    }

    const char* bob = "dn: cn=Bob,o=Acme\nobjectClass: top\nobjectClass: extensibleObject\nobjectClass: person\n"
                      "cn: Bob\nsn: Smith\nquillLength: 17 cm\n";
    int before[4] = {};
    bool found[4] = {};
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&, i] { before[i] = check(bob, "(sn=s*TH)", found[i]); });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    const bool added = add_attribute("attributeTypes { ( 1.2.3.4 NAME 'quillLength' SUP name ) }");
    bool has_length = false;
    const int after = check(bob, "(quilllength=17 CM)", has_length);
    std::printf("before %d %d, added %d, after %d %d\n", before[0], found[0], added, after, has_length);
    return before[0] != LDAP_SUCCESS && found[0] && added && has_length ? 0 : 1;
}
