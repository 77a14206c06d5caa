/* The HPI call table of the shell and the loading of the client library. */
#include "HpiTable.h"

#include <dlfcn.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

KviShellHpiTableT kviShellHpi;
bool kviShellHpiUnserved = false;

int kviShellHpiTableFill(KviShellHpiTableT *Table, void *Handle)
{
    int found = 0;
#define KVI_SHELL_HPI_FILL(name)                                                                   \
    Table->name = reinterpret_cast<decltype(Table->name)>(dlsym(Handle, #name));                   \
    found += Table->name != nullptr;
    KVI_SHELL_HPI_CALLS(KVI_SHELL_HPI_FILL)
#undef KVI_SHELL_HPI_FILL
    return found;
}

bool kviShellServerSplit(const char *Server, char *Host, size_t HostSize, char *Port,
                         size_t PortSize)
{
    const char *colon = strrchr(Server, ':');
    if (colon == nullptr || colon == Server || static_cast<size_t>(colon - Server) >= HostSize)
        return false;
    char *end = nullptr;
    long port = strtol(colon + 1, &end, 10);
    if (colon[1] == '\0' || *end != '\0' || port < 1 || port > 65535 ||
        strlen(colon + 1) >= PortSize)
        return false;
    memcpy(Host, Server, colon - Server);
    Host[colon - Server] = '\0';
    strcpy(Port, colon + 1);
    return true;
}

void *kviShellClientLibraryOpen(const char *Server)
{
    char host[256], port[8];
    if (!kviShellServerSplit(Server, host, sizeof host, port, sizeof port)) {
        fprintf(stderr, "kvi-hpi-shell: --remote wants HOST:PORT, not \"%s\"\n", Server);
        return nullptr;
    }
    setenv("KVI_HPI_SERVER", host, 1);
    setenv("KVI_HPI_PORT", port, 1);
    const char *path = getenv("KVI_HPI_CLIENT_LIB");
    if (path == nullptr || *path == '\0')
        path = "libKviHpiClient.so";
    void *handle = dlopen(path, RTLD_NOW | RTLD_LOCAL);
    if (handle == nullptr)
        fprintf(stderr, "kvi-hpi-shell: cannot load the client library: %s\n", dlerror());
    return handle;
}
