// Checks two entries against the installed schema, with what a C++ program shares with a library beyond its functions:
// classes to derive from and exceptions to catch.
//
//   cxx_consumer FOLDER     FOLDER holds the schema files
#include <fstream>
#include <iostream>
#include <string>

#include "servers/vrnd/libdirbase/dirbase.h"

namespace {

class finding_counter : public ldcf_entry_sink {
public:
    void report(const ldcf_entry_finding& finding) override
    {
        ++findings_;
        std::cout << "  finding " << static_cast<int>(finding.kind) << ' '
                  << (finding.name != nullptr ? finding.name : "") << '\n';
    }
    int findings() const { return findings_; }

private:
    int findings_ = 0;
};

int verdict(std::string text)
{
    _rdbm_rd_lock(ldcf_api_get_modify_attr_info_lock_g());
    Entry* entry = str2entry(text.data(), 1, 1);
    finding_counter sink;
    bool added = false;
    const int result = ldcf_check_entry(*ldcf_api_get_schema_g(), entry, ldcf_check_strict, false, &added, sink);
    std::cout << entry->e_norm_dn << ": result " << result << ", " << sink.findings() << " findings\n";
    entry_free(entry);
    _rdbm_rd_unlock(ldcf_api_get_modify_attr_info_lock_g());
    return result;
}

// An exception of the library's is caught here by its own class, by a class above it, and says where it comes from.
bool exceptions_cross()
{
    exc_t::be_quiet(true);
    bool own = false;
    try {
        ldcf_schema scratch;
        scratch.parse_str("attributeTypes { ( 1.2.3 NOMEN 'x' ) }", "text");
    } catch (const exc_invalid_grammar_t& fault) {
        own = fault.line() == 1;
    } catch (const exc_invalid_token_t& fault) {
        own = fault.line() == 1;
    }
    bool base = false;
    try {
        ldcf_schema().parse("/nonesuch/file");
    } catch (const exc_t&) {
        base = true;
    }
    return own && base;
}

}  // namespace

int main(int argc, char** argv)
{
    if (argc != 2) {
        return 2;
    }
    static Backend store = {.be_type = "rdbm"};
    g_backends = &store;
    ldcf_api_schema_init();
    const std::string folder = argv[1];
    std::ifstream list(folder + "/schema.list");
    for (std::string line; std::getline(list, line);) {
        if (!line.empty() && line.front() != '#' && ldcf_api_schema_parse((folder + "/" + line).c_str()) != 0) {
            return 1;
        }
    }
    if (ldcf_api_schema_complete() != 0 || ldcf_api_schema_complete_db_names() != 0) {
        return 1;
    }
    const int good = verdict("dn: CN = Bob , o=Acme\nobjectClass: top\nobjectClass: person\ncn: Bob\nsn: Smith\n");
    const int bad = verdict("dn: cn=Bob,o=Acme\nobjectClass: top\nobjectClass: person\ncn: Bob\n");
    return good == LDAP_SUCCESS && bad == LDAP_OBJECT_CLASS_VIOLATION && exceptions_cross() ? 0 : 1;
}
