/* A program in plain C11 that uses an installation of the library, compiled by what pkg-config says.
 *
 *   c_consumer FOLDER     FOLDER holds the schema files
 */
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include "servers/vrnd/libdirbase/dirbase.h"

static int failures = 0;

static void expect(int holds, const char* claim)
{
    printf("%s: %s\n", holds ? "ok" : "FAILED", claim);
    failures += !holds;
}

static int load_schema(const char* folder)
{
    static Backend store;
    char path[4096];
    char line[256];
    FILE* list;

    store.be_type = "rdbm";
    g_backends = &store;
    ldcf_api_schema_init();
    snprintf(path, sizeof path, "%s/schema.list", folder);
    list = fopen(path, "r");
    if (list == NULL) {
        return 0;
    }
    while (fgets(line, sizeof line, list) != NULL) {
        line[strcspn(line, "\n")] = '\0';
        snprintf(path, sizeof path, "%s/%s", folder, line);
        if (line[0] != '\0' && line[0] != '#' && ldcf_api_schema_parse(path) != 0) {
            fclose(list);
            return 0;
        }
    }
    fclose(list);
    return ldcf_api_schema_complete() == 0 && ldcf_api_schema_complete_db_names() == 0;
}

static void normalise_names(void)
{
    ldap_escDN* a = dn_normalize_esc("CN = Bob Smith , 2.5.4.10=\"Acme, Inc.\" ; c=us");
    ldap_escDN* b = dn_normalize_esc("cn=bob smith,o=Acme\\2C Inc.,C=US");
    expect(a != NULL && b != NULL && compare_ldap_escDN(a, b) == 1, "two spellings of a DN are one");
    expect(a != NULL && strcmp(GetDNUpper33(a), GetDNUpper33(b)) == 0, "... with one upper text");
    free_ldap_escDN(&a);
    free_ldap_escDN(&b);
    expect(a == NULL, "... and the record goes");
}

static void write_and_read_a_line(void)
{
    static const char value[] =
        "Gr\xc3\xbc\xc3\x9f e aus dem Glashaus, in einer Zeile, die lang genug ist, dass sie bricht";
    char* text = ldif_type_and_value("description", value, sizeof value - 1);
    char* next = text;
    char* line = str_getline(&next);
    char* type = NULL;
    char* back = NULL;
    size_t length = 0;
    int is_url = 0;
    int is_base64 = 0;
    const int result = str_parse_line_v_or_bv(line, &type, &back, &length, LDIF_MODE_ENTRY, &is_url, &is_base64);
    expect(result == LDIF_LINE_OK && strcmp(type, "description") == 0, "an LDIF line comes back");
    expect(is_base64 && !is_url && length == sizeof value - 1 && memcmp(back, value, length) == 0, "... byte for byte");
    free(text);
}

static void search_an_entry(void)
{
    static const struct {
        const char* filter;
        int expected;
    } cases[] = {
        {"(&(objectClass=person)(sn=SMITH))", FILTER_TRUE},
        {"(cn=b*bob)", FILTER_FALSE},
        {"(cn=bo*)", FILTER_TRUE},
        {"(!(telephoneNumber=*))", FILTER_TRUE},
    };
    char text[] = "dn: cn=Bob,o=Acme\nobjectClass: top\nobjectClass: person\ncn: Bob\nsn: Smith\n";
    Entry* entry;
    bool added = false;
    size_t i;

    _rdbm_rd_lock(ldcf_api_get_modify_attr_info_lock_g());
    entry = str2entry(text, 1, 1);
    expect(entry != NULL && ldcf_api_schema_check(entry, &added, false) == LDAP_SUCCESS, "an entry obeys the schema");
    expect(entry != NULL && attr_find(entry, "surname", 0, NULL) != NULL, "... and has its attribute by another name");
    for (i = 0; i < sizeof cases / sizeof cases[0]; ++i) {
        Filter* filter = str2filter(cases[i].filter, 1);
        expect(filter != NULL && test_filter(entry, filter) == cases[i].expected, cases[i].filter);
        filter_free(filter);
    }
    entry_free(entry);
    _rdbm_rd_unlock(ldcf_api_get_modify_attr_info_lock_g());
}

int main(int argc, char** argv)
{
    if (argc != 2 || !load_schema(argv[1])) {
        fprintf(stderr, "no schema in the folder\n");
        return 2;
    }
    _rdbm_rd_lock(ldcf_api_get_modify_attr_info_lock_g());
    normalise_names();
    _rdbm_rd_unlock(ldcf_api_get_modify_attr_info_lock_g());
    write_and_read_a_line();
    search_an_entry();
    return failures != 0;
}
