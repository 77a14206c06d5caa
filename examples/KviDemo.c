/* A minimal daemon around libKviDaemonCore: loads a configuration, starts
 * the library and its plug-ins, puts back the settings saved by the last
 * run, shows the shelf as a client would see it, renames the chassis (a
 * setting kept across restarts) and stops.
 *
 *   KviDemo <configuration file>
 *
 * Run it twice: the second run shows the name the first run gave. */
#include <stdio.h>
#include <string.h>
#include <time.h>

#include "KviDaemonCore.h"

static const char *recordKind(SaHpiRdrTypeT Type)
{
    switch (Type) {
    case SAHPI_CTRL_RDR:
        return "control";
    case SAHPI_SENSOR_RDR:
        return "sensor";
    case SAHPI_INVENTORY_RDR:
        return "inventory";
    case SAHPI_WATCHDOG_RDR:
        return "watchdog";
    default:
        return "record";
    }
}

static void printText(const SaHpiTextBufferT *Text)
{
    printf("%.*s", (int)Text->DataLength, (const char *)Text->Data);
}

static void printRecords(SaHpiResourceIdT ResourceId)
{
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    while (entry != SAHPI_LAST_ENTRY) {
        SaHpiRdrT rdr;
        SaHpiBoolT active = SAHPI_FALSE;
        if (kviCsRdrGet(SAHPI_DEFAULT_DOMAIN_ID, ResourceId, SAHPI_NO_RECORD, entry, &entry, &rdr,
                        &active, NULL, NULL, NULL, NULL) != SA_OK)
            return;
        printf("      %-9s ", recordKind(rdr.RdrType));
        printText(&rdr.IdString);
        printf("\n");
    }
}

/* Walks the active resources; returns the id of the chassis. */
static SaHpiResourceIdT printShelf(void)
{
    SaHpiResourceIdT chassis = 0;
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    while (entry != SAHPI_LAST_ENTRY) {
        SaHpiRptEntryT rpt;
        if (kviCsRptActiveEntryGet(SAHPI_DEFAULT_DOMAIN_ID, entry, &entry, &rpt, NULL) != SA_OK)
            break;
        if (rpt.ResourceEntity.Entry[0].EntityType == SAHPI_ENT_SYSTEM_CHASSIS)
            chassis = rpt.ResourceId;
        printf("  resource %u: ", (unsigned)rpt.ResourceId);
        printText(&rpt.ResourceTag);
        printf("\n");
        printRecords(rpt.ResourceId);
    }
    return chassis;
}

static int fail(const char *What, SaErrorT Rc)
{
    fprintf(stderr, "KviDemo: %s failed (%d)\n", What, (int)Rc);
    return 1;
}

int main(int argc, char **argv)
{
    const char *config = argc > 1 ? argv[1] : "simulator.conf";
    SaErrorT rc;
    kviCsLogInitHelper("kvi-demo.log", "-l3");
    if ((rc = kviCsConfigInit(SAHPI_FALSE, config)) != SA_OK)
        return fail("loading the configuration", rc);
    if ((rc = kviDsApiRedirectorInitialize()) != SA_OK)
        return fail("kviDsApiRedirectorInitialize", rc);

    SaHpiVersionT version = 0;
    SaHpiSessionIdT session = 0;
    if ((rc = saHpiInitialize(&version)) != SA_OK)
        return fail("saHpiInitialize", rc);
    if ((rc = saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, NULL)) != SA_OK)
        return fail("saHpiSessionOpen", rc);
    if ((rc = saHpiResourcesDiscover(session)) != SA_OK)
        return fail("saHpiResourcesDiscover", rc);
    /* A daemon puts back what clients changed before it was restarted. */
    rc = kviCsDaemonRestoreDomain(SAHPI_DEFAULT_DOMAIN_ID);
    printf("session %u, implementation version %u, saved settings restored: %s\n",
           (unsigned)session, (unsigned)version, rc == SA_OK ? "yes" : "none");

    SaHpiResourceIdT chassis = printShelf();
    if (chassis != 0) {
        SaHpiTextBufferT tag;
        memset(&tag, 0, sizeof tag);
        tag.DataType = SAHPI_TL_TYPE_ASCII6;
        tag.Language = SAHPI_LANG_ENGLISH;
        time_t now = time(NULL);
        tag.DataLength = (SaHpiUint8T)strftime((char *)tag.Data, sizeof tag.Data,
                                               "Chassis renamed at %H:%M:%S", localtime(&now));
        if ((rc = kviCsRptEntryModifyTagByRid(SAHPI_DEFAULT_DOMAIN_ID, chassis, &tag)) != SA_OK)
            return fail("renaming the chassis", rc);
        printf("resource %u renamed to \"%s\": run again to see it restored\n", (unsigned)chassis,
               (const char *)tag.Data);
    }

    saHpiSessionClose(session);
    if ((rc = saHpiFinalize()) != SA_OK)
        return fail("saHpiFinalize", rc);
    kviCsConfigFinalize();
    kviCsLogClose();
    return 0;
}
