// kvi-hpid: the HPI daemon. Hosts libKviDaemonCore and its plug-ins and
// serves HPI clients (through libKviHpiClient) over TCP, one thread per
// connection.
#include <arpa/inet.h>
#include <fcntl.h>
#include <getopt.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <signal.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/socket.h>
#include <unistd.h>

#include <list>
#include <string>
#include <thread>

#include "KviHpid.h"

namespace
{

constexpr const char *PROGRAM = "kvi-hpid";
constexpr const char *DEFAULT_CONFIG = "/etc/kvi-hpid/kvi-hpid.conf";
constexpr const char *DEFAULT_LOG = "/var/log/kvi-hpid.log";
constexpr const char *DEFAULT_ADDRESS = "127.0.0.1";
constexpr SaHpiUint32T DEFAULT_PORT = 4743;
constexpr size_t MAX_CONNECTIONS = 128;

struct Options {
    std::string Config = DEFAULT_CONFIG;
    std::string Log;
    long Port = -1;
    bool Daemonize = false;
};

void usage(FILE *To)
{
    fprintf(To,
            "Usage: %s [--config FILE] [--port N] [--log FILE] [--daemonize]\n"
            "Serves HPI clients with the plug-ins named in the configuration.\n\n"
            "  --config FILE  configuration file (default %s)\n"
            "  --port N       TCP port to listen on, 0 for any free one (default: the\n"
            "                 configuration's KviHpidPort, else %u)\n"
            "  --log FILE     log file (default: the configuration's KviHpidLogFile,\n"
            "                 else %s)\n"
            "  --daemonize    run in the background\n"
            "  --help         this text\n"
            "  --version      the daemon's version\n",
            PROGRAM, DEFAULT_CONFIG, DEFAULT_PORT, DEFAULT_LOG);
}

int parseOptions(int argc, char **argv, Options *O)
{
    static const option longOptions[] = {{"config", required_argument, nullptr, 'c'},
                                         {"port", required_argument, nullptr, 'p'},
                                         {"log", required_argument, nullptr, 'l'},
                                         {"daemonize", no_argument, nullptr, 'd'},
                                         {"help", no_argument, nullptr, 'h'},
                                         {"version", no_argument, nullptr, 'v'},
                                         {nullptr, 0, nullptr, 0}};
    int c;
    while ((c = getopt_long(argc, argv, "", longOptions, nullptr)) != -1) {
        char *end = nullptr;
        switch (c) {
        case 'c':
            O->Config = optarg;
            break;
        case 'l':
            O->Log = optarg;
            break;
        case 'd':
            O->Daemonize = true;
            break;
        case 'p':
            O->Port = strtol(optarg, &end, 10);
            if (*optarg == '\0' || *end != '\0' || O->Port < 0 || O->Port > 65535) {
                fprintf(stderr, "%s: invalid port \"%s\"\n", PROGRAM, optarg);
                return 2;
            }
            break;
        case 'h':
            usage(stdout);
            exit(0);
        case 'v':
            printf("%s %s (HPI A.01.01, protocol %u.%u)\n", PROGRAM, KVI_HPID_VERSION,
                   KVI_LIB_PROTOCOL_MAJOR_VERSION, KVI_LIB_PROTOCOL_MINOR_VERSION);
            exit(0);
        default:
            usage(stderr);
            return 2;
        }
    }
    if (optind < argc) {
        fprintf(stderr, "%s: unexpected argument \"%s\"\n", PROGRAM, argv[optind]);
        return 2;
    }
    return 0;
}

std::string configText(const char *Key, const char *Default)
{
    char value[256];
    return kviCsCfgDataGet(Key, sizeof value, value, nullptr) == SA_OK ? value : Default;
}

int fail(const char *What, SaErrorT Rc)
{
    fprintf(stderr, "%s: %s failed (%d)\n", PROGRAM, What, static_cast<int>(Rc));
    return 1;
}

// The library and its plug-ins, as every daemon brings them up; the
// session opened here only discovers and is closed again.
int startLibrary(const Options &O)
{
    SaErrorT rc = kviCsConfigInit(SAHPI_TRUE, O.Config.c_str());
    if (rc != SA_OK) {
        return fail(("loading the configuration " + O.Config).c_str(), rc);
    }
    const std::string log = O.Log.empty() ? configText("KviHpidLogFile", DEFAULT_LOG) : O.Log;
    kviCsLogInitHelper(log.c_str(), configText("KviHpidLogLevel", "").c_str());
    SaHpiVersionT version = 0;
    SaHpiSessionIdT session = 0;
    if ((rc = kviDsApiRedirectorInitialize()) != SA_OK) {
        return fail("kviDsApiRedirectorInitialize", rc);
    }
    if ((rc = saHpiInitialize(&version)) != SA_OK) {
        return fail("saHpiInitialize", rc);
    }
    if ((rc = saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr)) != SA_OK) {
        return fail("saHpiSessionOpen", rc);
    }
    rc = saHpiResourcesDiscover(session);
    // An empty domain is most often a plug-in that did not load.
    SaHpiEntryIdT next;
    SaHpiRptEntryT first;
    if (rc == SA_OK && saHpiRptEntryGet(session, SAHPI_FIRST_ENTRY, &next, &first) != SA_OK) {
        fprintf(stderr, "%s: no resources; check \"mapl_modules\" in %s\n", PROGRAM,
                O.Config.c_str());
    }
    saHpiSessionClose(session);
    if (rc != SA_OK) {
        return fail("saHpiResourcesDiscover", rc);
    }
    // Nothing saved yet is not a failure.
    kviCsDaemonRestoreDomain(SAHPI_DEFAULT_DOMAIN_ID);
    return 0;
}

int openListener(const Options &O, int *Fd)
{
    const std::string address = configText("KviHpidAddress", DEFAULT_ADDRESS);
    SaHpiUint32T port = DEFAULT_PORT;
    if (O.Port >= 0) {
        port = static_cast<SaHpiUint32T>(O.Port);
    } else if (kviCsCfgDataUint32Get("KviHpidPort", &port, nullptr) != SA_OK || port > 65535) {
        port = DEFAULT_PORT;
    }
    sockaddr_in at = {};
    at.sin_family = AF_INET;
    at.sin_port = htons(static_cast<uint16_t>(port));
    if (inet_pton(AF_INET, address.c_str(), &at.sin_addr) != 1) {
        fprintf(stderr, "%s: KviHpidAddress \"%s\" is not an IPv4 address\n", PROGRAM,
                address.c_str());
        return 1;
    }
    int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    int one = 1;
    socklen_t length = sizeof at;
    if (fd < 0 || setsockopt(fd, SOL_SOCKET, SO_REUSEADDR, &one, sizeof one) != 0 ||
        bind(fd, reinterpret_cast<sockaddr *>(&at), sizeof at) != 0 || listen(fd, 64) != 0 ||
        getsockname(fd, reinterpret_cast<sockaddr *>(&at), &length) != 0) {
        fprintf(stderr, "%s: cannot listen on %s:%u: %s\n", PROGRAM, address.c_str(), port,
                strerror(errno));
        if (fd >= 0) {
            close(fd);
        }
        return 1;
    }
    printf("%s: listening on %s:%u\n", PROGRAM, address.c_str(), ntohs(at.sin_port));
    fflush(stdout);
    *Fd = fd;
    return 0;
}

struct Connection {
    int Fd;
    std::atomic<bool> Done{false};
    std::thread Thread;
};

void reap(std::list<Connection> &Connections, bool All)
{
    for (auto c = Connections.begin(); c != Connections.end();) {
        if (All || c->Done) {
            c->Thread.join();
            c = Connections.erase(c);
        } else {
            ++c;
        }
    }
}

void accepted(std::list<Connection> &Connections, int Fd)
{
    reap(Connections, false);
    if (Connections.size() >= MAX_CONNECTIONS) {
        KVI_WLOG(KVI_LOG_WARN, "%zu connections already: refused another", Connections.size());
        close(Fd);
        return;
    }
    int one = 1;
    setsockopt(Fd, IPPROTO_TCP, TCP_NODELAY, &one, sizeof one);
    kviCsSetSockNbio(Fd);
    Connection &c = Connections.emplace_back();
    c.Fd = Fd;
    c.Thread = std::thread([&c] {
        kviHpidServeConnection(c.Fd);
        c.Done = true;
    });
}

// Accepts until SIGTERM or SIGINT, which arrive on StopFd.
void acceptLoop(int Listener, int StopFd)
{
    std::list<Connection> connections;
    for (;;) {
        pollfd p[2] = {{Listener, POLLIN, 0}, {StopFd, POLLIN, 0}};
        if (poll(p, 2, -1) < 0 && errno != EINTR) {
            break;
        }
        if (p[1].revents != 0) {
            break;
        }
        SaHpiInt32T fd = -1;
        if ((p[0].revents & POLLIN) != 0 && kviCsAcceptConnection(Listener, &fd) == SA_OK) {
            accepted(connections, fd);
        }
    }
    close(Listener);
    kviHpidStopping = true;
    for (Connection &c : connections) {
        shutdown(c.Fd, SHUT_RDWR);
    }
    reap(connections, true);
}

// SIGTERM and SIGINT become a readable pipe; SIGPIPE is ignored, since a
// vanished client is an error of its write, not the end of the daemon.
int stopSignals(int Pipe[2])
{
    static int writeEnd = -1;
    if (pipe2(Pipe, O_CLOEXEC) != 0) {
        return -1;
    }
    writeEnd = Pipe[1];
    struct sigaction a = {};
    a.sa_handler = [](int) {
        const char byte = 1;
        ssize_t ignored = write(writeEnd, &byte, 1);
        (void)ignored;
    };
    sigemptyset(&a.sa_mask);
    sigaction(SIGTERM, &a, nullptr);
    sigaction(SIGINT, &a, nullptr);
    signal(SIGPIPE, SIG_IGN);
    return 0;
}

} // namespace

int main(int argc, char **argv)
{
    Options o;
    int rc = parseOptions(argc, argv, &o);
    if (rc != 0) {
        return rc;
    }
    int stop[2];
    if (stopSignals(stop) != 0) {
        return fail("pipe", SA_ERR_HPI_ERROR);
    }
    // A daemon works from the root directory: the configuration's path must
    // not depend on where it was started.
    char *config = realpath(o.Config.c_str(), nullptr);
    if (config != nullptr) {
        o.Config = config;
        free(config);
    }
    if (o.Daemonize && kviCsDaemonize() != SA_OK) {
        return fail("kviCsDaemonize", SA_ERR_HPI_ERROR);
    }
    int listener = -1;
    if ((rc = startLibrary(o)) != 0 || (rc = openListener(o, &listener)) != 0) {
        return rc;
    }
    KVI_ILOG(KVI_LOG_INFO, "kvi-hpid serving");
    acceptLoop(listener, stop[0]);
    // No plug-in reload may start while the library stops.
    kviDsMaplManagerFinalize();
    SaErrorT done = saHpiFinalize();
    kviCsConfigFinalize();
    KVI_ILOG(KVI_LOG_INFO, "kvi-hpid stopped (%d)", done);
    kviCsLogClose();
    return done == SA_OK ? 0 : 1;
}
