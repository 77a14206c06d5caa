/* What the simulator plug-in offers besides its init table: ways for tests
 * and shells to drive the simulated shelf. The plug-in exports them as plain
 * C functions; find them with dlsym on the loaded plug-in (dlopen with
 * RTLD_NOLOAD of the same path gives the handle):
 *
 *     KviSimSensorReadingDriveT drive =
 *         (KviSimSensorReadingDriveT)dlsym(handle, KVI_SIM_SENSOR_READING_DRIVE);
 *
 * None of them is to be called while the plug-in is being unloaded.
 *
 * kviSimSensorReadingDrive: Drive SAHPI_TRUE makes the threshold sensor
 * SensorNum of ResourceId read Raw (0 to 255, the sensor's raw unit) from now
 * on; SAHPI_FALSE gives it back to the simulation. The sensor is evaluated at
 * once: a threshold crossed in either direction, past its hysteresis, posts a
 * sensor event if the sensor's event enables allow it. Results:
 * SA_ERR_HPI_INVALID_RESOURCE (no such resource of the simulator),
 * SA_ERR_HPI_NOT_PRESENT (no such sensor), SA_ERR_HPI_INVALID_CMD (not a
 * threshold sensor), SA_ERR_HPI_INVALID_PARAMS (Drive not boolean, Raw above
 * 255). Not to be called while the resource is being removed.
 *
 * Hot swap. Processor boards, fan trays and power supplies are FRUs with the
 * managed hot-swap model; the chassis is not a FRU. Every state change posts
 * a SAHPI_ET_HOTSWAP event (and logs it in the resource's event log). A
 * pending state runs its default policy when its timeout ends: the domain's
 * auto-insert timeout or the resource's auto-extract timeout, as they stand
 * when the state is entered (SAHPI_TIMEOUT_IMMEDIATE: at once,
 * SAHPI_TIMEOUT_BLOCK: never), unless a client took control of that pending
 * state with saHpiHotSwapControlRequest. The insertion policy powers the
 * board and turns its hot-swap indicator off; the extraction policy powers it
 * off and turns the indicator on, the sign that the board may be pulled. An
 * active board that does not run (held in reset, powered off by a client) is
 * ACTIVE_UNHEALTHY, else ACTIVE_HEALTHY.
 *
 * kviSimHotSwapDrive: the operator at the shelf. Entity names the FRU's place
 * by its entity path (the path of its RPT entry, which stays the same across
 * pulls and insertions while resource ids do not). Insert SAHPI_FALSE pulls
 * the board: the operator opens its latch and takes it out as soon as it may.
 * An active board goes to EXTRACTION_PENDING and leaves once it is INACTIVE
 * (by the extraction policy or saHpiResourceInactiveSet); a client that
 * answers with saHpiResourceActiveSet refuses the extraction, the latch is
 * closed again and the board stays. A board that is INACTIVE or
 * INSERTION_PENDING leaves at once. A board that leaves goes to NOT_PRESENT
 * with its event and then leaves the RPT; the pull returns after that when
 * the board could leave at once. Insert SAHPI_TRUE puts a board into an
 * empty place: a new resource (a new resource id) is added to the RPT and
 * goes from NOT_PRESENT to INSERTION_PENDING, unpowered, with its event; its
 * settings are those of a new board. Results: SA_ERR_HPI_INVALID_PARAMS
 * (Entity NULL, Insert not boolean), SA_ERR_HPI_NOT_PRESENT (no FRU place of
 * the shelf has that path, or the shelf is not discovered yet),
 * SA_ERR_HPI_INVALID_REQUEST (inserting into a place that holds a board,
 * pulling from an empty place or a board already being pulled), or what
 * adding the new resource to the RPT returned.
 *
 * kviSimClockAdvance: the hot-swap countdowns run on the machine's monotonic
 * clock until the first call; from then until the plug-in is finalized they
 * run on a clock that only this call moves, by Elapsed nanoseconds, and the
 * policies that fall due have run, with their events, when it returns.
 * SA_ERR_HPI_INVALID_PARAMS for a negative Elapsed. */
#ifndef KVI_SIMULATOR_H
#define KVI_SIMULATOR_H

#include "SaHpi.h"

#define KVI_SIM_SENSOR_READING_DRIVE "kviSimSensorReadingDrive"

typedef SaErrorT (*KviSimSensorReadingDriveT)(SaHpiResourceIdT ResourceId,
                                              SaHpiSensorNumT SensorNum, SaHpiBoolT Drive,
                                              SaHpiUint32T Raw);

#define KVI_SIM_HOT_SWAP_DRIVE "kviSimHotSwapDrive"
typedef SaErrorT (*KviSimHotSwapDriveT)(const SaHpiEntityPathT *Entity, SaHpiBoolT Insert);

#define KVI_SIM_CLOCK_ADVANCE "kviSimClockAdvance"
typedef SaErrorT (*KviSimClockAdvanceT)(SaHpiTimeoutT Elapsed);

#endif
