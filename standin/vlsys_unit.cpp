// vlsys-unit KIND COMMAND [ARGUMENT...]: runs a command inside a stand-in unit.
// vlsys-unit --list: the kinds of unit.
// vlsys-unit --check: exit status 0 when a stand-in unit can be made here.
#include "standin/kinds.h"
#include "standin/sandbox.h"

#include <cstdio>
#include <cstring>
#include <unistd.h>

static int list_kinds() {
    for (const unit::Kind *kind = unit::kinds; kind != unit::kinds_end; ++kind)
        printf("%-16s %s\n", kind->name, kind->description);
    return 0;
}

static void make_unit(const unit::Kind &kind) {
    unit::enter_namespaces();
    unit::make_unit_files(kind.name);
    unit::set_interfaces({"eth0", "eth1", "eth2", "eth10", "virbr0"});
    if (kind.surrogate)
        unit::run("surrogate-parent");
}

int main(int argc, char **argv) {
    if (argc == 2 && strcmp(argv[1], "--list") == 0)
        return list_kinds();
    if (argc == 2 && strcmp(argv[1], "--check") == 0) {
        unit::enter_namespaces();
        return 0;
    }
    if (argc < 3) {
        fputs("usage: vlsys-unit KIND COMMAND [ARGUMENT...] | --list | --check\n", stderr);
        return 2;
    }
    const unit::Kind *const kind = unit::find_kind(argv[1]);
    if (!kind) {
        fprintf(stderr, "%s: no such unit; there are:\n", argv[1]);
        list_kinds();
        return 2;
    }
    make_unit(*kind);
    execvp(argv[2], argv + 2);
    perror(argv[2]);
    return 127;
}
