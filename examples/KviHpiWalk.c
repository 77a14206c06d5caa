/* A plain HPI A.01.01 client, written against SaHpi.h alone: it walks the
 * domain's resources and their records, reads every sensor, then subscribes
 * and prints the events that arrive for a few seconds.
 *
 *   KviHpiWalk [SECONDS]
 *
 * Built against libKviHpiClient it talks to a running kvi-hpid (see
 * KVI_HPI_SERVER and KVI_HPI_PORT); nothing in it is specific to that. */
#include <stdio.h>
#include <stdlib.h>

#include "SaHpi.h"

static void printText(const SaHpiTextBufferT *Text)
{
    printf("%.*s", (int)Text->DataLength, (const char *)Text->Data);
}

static void printReading(const SaHpiSensorReadingT *Reading)
{
    const SaHpiSensorInterpretedT *v = &Reading->Interpreted;
    if (Reading->ValuesPresent & SAHPI_SRF_RAW)
        printf(" raw %u", (unsigned)Reading->Raw);
    if (!(Reading->ValuesPresent & SAHPI_SRF_INTERPRETED))
        return;
    switch (v->Type) {
    case SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32:
        printf(" = %.2f", (double)v->Value.SensorFloat32);
        break;
    case SAHPI_SENSOR_INTERPRETED_TYPE_UINT32:
        printf(" = %u", (unsigned)v->Value.SensorUint32);
        break;
    case SAHPI_SENSOR_INTERPRETED_TYPE_INT32:
        printf(" = %d", (int)v->Value.SensorInt32);
        break;
    default:
        printf(" (interpreted type %d)", (int)v->Type);
        break;
    }
}

static void walkRecords(SaHpiSessionIdT Session, SaHpiResourceIdT Resource)
{
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    while (entry != SAHPI_LAST_ENTRY) {
        SaHpiRdrT rdr;
        SaHpiEntryIdT next;
        if (saHpiRdrGet(Session, Resource, entry, &next, &rdr) != SA_OK)
            return;
        entry = next;
        printf("    record %u: ", (unsigned)rdr.RecordId);
        printText(&rdr.IdString);
        if (rdr.RdrType == SAHPI_SENSOR_RDR) {
            SaHpiSensorReadingT reading;
            SaErrorT rc = saHpiSensorReadingGet(Session, Resource,
                                                rdr.RdrTypeUnion.SensorRec.Num, &reading);
            if (rc == SA_OK)
                printReading(&reading);
            else
                printf(" (reading failed: %d)", (int)rc);
        }
        printf("\n");
    }
}

static int walk(SaHpiSessionIdT Session)
{
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    int resources = 0;
    while (entry != SAHPI_LAST_ENTRY) {
        SaHpiRptEntryT rpt;
        SaHpiEntryIdT next;
        SaErrorT rc = saHpiRptEntryGet(Session, entry, &next, &rpt);
        if (rc != SA_OK) {
            fprintf(stderr, "KviHpiWalk: saHpiRptEntryGet failed (%d)\n", (int)rc);
            return -1;
        }
        entry = next;
        ++resources;
        printf("resource %u: ", (unsigned)rpt.ResourceId);
        printText(&rpt.ResourceTag);
        printf("\n");
        walkRecords(Session, rpt.ResourceId);
    }
    return resources;
}

static void printEvents(SaHpiSessionIdT Session, int Seconds)
{
    for (int i = 0; i < Seconds * 2; ++i) {
        SaHpiEventT event;
        SaHpiRdrT rdr;
        SaHpiRptEntryT rpt;
        SaErrorT rc = saHpiEventGet(Session, 500000000LL, &event, &rdr, &rpt);
        if (rc == SA_ERR_HPI_TIMEOUT)
            continue;
        if (rc != SA_OK) {
            fprintf(stderr, "KviHpiWalk: saHpiEventGet failed (%d)\n", (int)rc);
            return;
        }
        printf("event type %d from resource %u (", (int)event.EventType,
               (unsigned)event.Source);
        printText(&rpt.ResourceTag);
        printf("), severity %d\n", (int)event.Severity);
    }
}

int main(int argc, char **argv)
{
    int seconds = argc > 1 ? atoi(argv[1]) : 2;
    SaHpiVersionT version;
    SaHpiSessionIdT session;
    SaErrorT rc = saHpiInitialize(&version);
    if (rc == SA_OK)
        rc = saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, NULL);
    if (rc != SA_OK) {
        fprintf(stderr, "KviHpiWalk: cannot start (%d)\n", (int)rc);
        return 1;
    }
    int resources = walk(session);
    if (resources >= 0 && saHpiSubscribe(session, SAHPI_TRUE) == SA_OK) {
        printEvents(session, seconds);
        saHpiUnsubscribe(session);
    }
    saHpiSessionClose(session);
    saHpiFinalize();
    printf("%d resources\n", resources);
    return resources >= 0 ? 0 : 1;
}
