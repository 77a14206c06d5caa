/* What the simulator plug-in offers besides its init table: a way for tests
 * and shells to drive a sensor's reading, so thresholds are crossed and
 * events posted on demand. The plug-in exports it as a plain C function;
 * find it with dlsym on the loaded plug-in (dlopen with RTLD_NOLOAD of the
 * same path gives the handle):
 *
 *     KviSimSensorReadingDriveT drive =
 *         (KviSimSensorReadingDriveT)dlsym(handle, KVI_SIM_SENSOR_READING_DRIVE);
 *
 * Drive SAHPI_TRUE makes the threshold sensor SensorNum of ResourceId read
 * Raw (0 to 255, the sensor's raw unit) from now on; SAHPI_FALSE gives it
 * back to the simulation. The sensor is evaluated at once: a threshold
 * crossed in either direction, past its hysteresis, posts a sensor event if
 * the sensor's event enables allow it. Results: SA_ERR_HPI_INVALID_RESOURCE
 * (no such resource of the simulator), SA_ERR_HPI_NOT_PRESENT (no such
 * sensor), SA_ERR_HPI_INVALID_CMD (not a threshold sensor),
 * SA_ERR_HPI_INVALID_PARAMS (Drive not boolean, Raw above 255). Not to be
 * called while the resource is being removed. */
#ifndef KVI_SIMULATOR_H
#define KVI_SIMULATOR_H

#include "SaHpi.h"

#define KVI_SIM_SENSOR_READING_DRIVE "kviSimSensorReadingDrive"

typedef SaErrorT (*KviSimSensorReadingDriveT)(SaHpiResourceIdT ResourceId,
                                              SaHpiSensorNumT SensorNum, SaHpiBoolT Drive,
                                              SaHpiUint32T Raw);

#endif
