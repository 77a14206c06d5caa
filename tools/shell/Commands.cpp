/* The command table's dispatcher, help, completion and argument parsers. */
#include <cerrno>
#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <sstream>

#include "HpiNames.h"
#include "HpiTable.h"
#include "Printers.h"
#include "Shell.h"

namespace
{

const KviShellCommandT *const groups[] = {kviShellResourceCommands, kviShellServiceCommands,
                                          kviShellSessionCommands};

const KviShellCommandT *find(const std::string &Name)
{
    for (const KviShellCommandT *group : groups)
        for (const KviShellCommandT *c = group; c->Name != nullptr; c++)
            if (Name == c->Name)
                return c;
    return nullptr;
}

// Words split at blanks; a word in double quotes keeps its blanks.
KviShellArgsT split(const std::string &Line)
{
    KviShellArgsT words;
    size_t i = 0;
    while (i < Line.size()) {
        if (Line[i] == ' ' || Line[i] == '\t') {
            i++;
            continue;
        }
        if (Line[i] == '#')
            break;
        std::string word;
        if (Line[i] == '"') {
            size_t end = Line.find('"', i + 1);
            word = Line.substr(i + 1, end == std::string::npos ? std::string::npos : end - i - 1);
            i = end == std::string::npos ? Line.size() : end + 1;
        } else {
            size_t end = Line.find_first_of(" \t", i);
            word = Line.substr(i, end == std::string::npos ? std::string::npos : end - i);
            i = end == std::string::npos ? Line.size() : end;
        }
        words.push_back(word);
    }
    return words;
}

} // namespace

bool kviShellRunLine(KviShellT &Shell, const std::string &Line, bool *Quit)
{
    KviShellArgsT words = split(Line);
    if (words.empty())
        return true;
    if (words[0] == "quit" || words[0] == "exit") {
        *Quit = true;
        return true;
    }
    const KviShellCommandT *command = nullptr;
    size_t used = 1;
    if (words.size() > 1 && (command = find(words[0] + " " + words[1])) != nullptr)
        used = 2;
    else
        command = find(words[0]);
    if (command == nullptr) {
        printf("unknown command \"%s\"; \"help\" lists the commands\n",
               (words[0] + (words.size() > 1 && find(words[0]) == nullptr ? " " + words[1] : ""))
                   .c_str());
        return false;
    }
    KviShellArgsT args(words.begin() + static_cast<long>(used), words.end());
    if (static_cast<int>(args.size()) < command->MinArgs ||
        static_cast<int>(args.size()) > command->MaxArgs) {
        printf("usage: %s %s\n", command->Name, command->Usage);
        return false;
    }
    return command->Run(Shell, args);
}

void kviShellHelp(FILE *Out)
{
    for (const KviShellCommandT *group : groups) {
        for (const KviShellCommandT *c = group; c->Name != nullptr; c++) {
            std::string call = std::string(c->Name) + (*c->Usage ? " " : "") + c->Usage;
            fprintf(Out, "  %-46s %s\n", call.c_str(), c->Help);
        }
    }
    fprintf(Out, "  %-46s %s\n", "quit", "leave the shell");
}

std::vector<std::string> kviShellCommandWords(const std::string &FirstWord)
{
    std::vector<std::string> words;
    for (const KviShellCommandT *group : groups)
        for (const KviShellCommandT *c = group; c->Name != nullptr; c++) {
            std::string name = c->Name;
            size_t blank = name.find(' ');
            if (FirstWord.empty())
                words.push_back(name.substr(0, blank));
            else if (blank != std::string::npos && name.compare(0, blank, FirstWord) == 0)
                words.push_back(name.substr(blank + 1));
        }
    return words;
}

std::vector<std::string> kviShellResourceWords(KviShellT &Shell)
{
    std::vector<std::string> words;
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    SaHpiRptEntryT rpt;
    while (entry != SAHPI_LAST_ENTRY && kviShellHpi.saHpiRptEntryGet != nullptr &&
           kviShellHpi.saHpiRptEntryGet(Shell.Session, entry, &entry, &rpt) == SA_OK)
        words.push_back(std::to_string(rpt.ResourceId));
    return words;
}

bool kviShellNumber(const std::string &Arg, long long Min, long long Max, long long *Value,
                    const char *What)
{
    char *end = nullptr;
    errno = 0;
    long long value = strtoll(Arg.c_str(), &end, 0);
    if (Arg.empty() || *end != '\0' || errno == ERANGE) {
        printf("%s: \"%s\" is not a number\n", What, Arg.c_str());
        return false;
    }
    if (value < Min || value > Max) {
        printf("%s: %s is out of range (%lld to %lld)\n", What, Arg.c_str(), Min, Max);
        return false;
    }
    *Value = value;
    return true;
}

bool kviShellName(const std::string &Arg, const KviShellNameTableT &Table, long long *Value,
                  const char *What)
{
    if (kviShellValueOf(Table, Arg.c_str(), Value))
        return true;
    std::string names;
    for (size_t i = 0; i < Table.Count; i++)
        names += (i ? ", " : "") + std::string(Table.Entries[i].Name);
    printf("%s: unknown \"%s\" (one of %s)\n", What, Arg.c_str(), names.c_str());
    return false;
}

bool kviShellResource(KviShellT &Shell, const std::string &Arg, SaHpiResourceIdT *Rid,
                      SaHpiRptEntryT *Entry)
{
    SaHpiRptEntryT rpt;
    if (!Arg.empty() && Arg[0] == '{') {
        SaHpiEntityPathT path;
        if (!kviShellEntityPathParse(Arg.c_str(), &path)) {
            printf("resource: \"%s\" is not an entity path like {SYSTEM_CHASSIS,1}\n", Arg.c_str());
            return false;
        }
        SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
        while (entry != SAHPI_LAST_ENTRY &&
               HPI(saHpiRptEntryGet, Shell.Session, entry, &entry, &rpt) == SA_OK)
            if (kviShellEntityPath(rpt.ResourceEntity) == kviShellEntityPath(path)) {
                *Rid = rpt.ResourceId;
                if (Entry != nullptr)
                    *Entry = rpt;
                return true;
            }
        printf("resource: no resource at %s\n", Arg.c_str());
        return false;
    }
    long long id = 0;
    if (!kviShellNumber(Arg, 0, UINT32_MAX, &id, "resource"))
        return false;
    if (HPI(saHpiRptEntryGetByResourceId, Shell.Session, static_cast<SaHpiResourceIdT>(id), &rpt) !=
        SA_OK) {
        printf("resource: no resource %lld (\"resources\" lists them)\n", id);
        return false;
    }
    *Rid = static_cast<SaHpiResourceIdT>(id);
    if (Entry != nullptr)
        *Entry = rpt;
    return true;
}

bool kviShellRecord(KviShellT &Shell, SaHpiResourceIdT Rid, SaHpiRdrTypeT Type,
                    const std::string &Num, SaHpiRdrT *Rdr)
{
    static const char *const kinds[] = {"record", "control", "sensor", "inventory", "watchdog"};
    const char *kind = kinds[Type <= SAHPI_WATCHDOG_RDR ? Type : 0];
    long long num = 0;
    if (!kviShellNumber(Num, 0, 255, &num, kind))
        return false;
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    while (entry != SAHPI_LAST_ENTRY &&
           HPI(saHpiRdrGet, Shell.Session, Rid, entry, &entry, Rdr) == SA_OK)
        if (Rdr->RdrType == Type && kviShellRecordNum(*Rdr) == num)
            return true;
    printf("%s: no %s %lld on resource %" PRIu32 "\n", kind, kind, num, Rid);
    return false;
}

SaHpiUint8T kviShellRecordNum(const SaHpiRdrT &Rdr)
{
    const SaHpiRdrTypeUnionT &u = Rdr.RdrTypeUnion;
    switch (Rdr.RdrType) {
    case SAHPI_SENSOR_RDR:
        return u.SensorRec.Num;
    case SAHPI_CTRL_RDR:
        return u.CtrlRec.Num;
    case SAHPI_INVENTORY_RDR:
        return u.InventoryRec.EirId;
    case SAHPI_WATCHDOG_RDR:
        return u.WatchdogRec.WatchdogNum;
    default:
        return 0;
    }
}

bool kviShellCheck(const char *Call, SaErrorT Rc, bool Always)
{
    if (Rc != SA_OK || Always)
        kviShellPrintResult(Call, Rc);
    return Rc == SA_OK;
}
