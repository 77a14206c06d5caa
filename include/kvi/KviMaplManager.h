/* The plug-in manager: the table of loaded plug-in libraries (MAPLs), their
 * pools of locks and the master lock that every redirected call takes for
 * reading.
 *
 * The set of loaded plug-ins follows the configuration key "mapl_modules", a
 * list of file names separated by ';', each handed to dlopen as written. It
 * is brought in line at saHpiInitialize, whenever the configuration file
 * changes, and emptied at saHpiFinalize. A plug-in keeps its slot number
 * (MaplNum) from registration until it is unloaded.
 *
 * kviDsMaplManagerGetMaplLock and kviDsMaplManagerUnprotectedGetMaplLock,
 * which plug-ins call, are declared with the plug-in interface
 * (KviMaplInterface.h). */
#ifndef KVI_MAPL_MANAGER_H
#define KVI_MAPL_MANAGER_H

#include "SaHpi.h"
#include "kvi/KviExport.h"
#include "kvi/KviRwLock.h"

KVI_EXTERN_C_BEGIN

/* Reads "max_mapl_count" and "max_mapl_rwlocks_count" (10 each when absent
 * or invalid), creates the slot table and the master lock and registers for
 * configuration changes. A second call gives SA_ERR_HPI_DUPLICATE. */
KVI_API SaErrorT kviDsMaplManagerInitialize(void) KVI_NOEXCEPT;

/* Stops following configuration changes; the table stays as it is. */
KVI_API SaErrorT kviDsMaplManagerFinalize(void) KVI_NOEXCEPT;

KVI_API SaErrorT kviDsMaplManagerGetMaplMasterLock(KviCsRwLockT **MaplMasterLock) KVI_NOEXCEPT;

/* Unloads the plug-ins no longer listed in "mapl_modules", then loads the
 * newly listed ones into the lowest free slots. A plug-in that cannot be
 * loaded is logged and skipped: the result is SA_OK all the same. Listing more
 * plug-ins than there are slots ends the process. */
KVI_API SaErrorT kviDsMaplManagerLoadMapls(void) KVI_NOEXCEPT;

/* Unloads every plug-in, waiting (up to 10 s per lock) for the calls that are
 * running in it; its resources are removed from the RPT first. */
KVI_API SaErrorT kviDsMaplManagerUnloadAllMapls(void) KVI_NOEXCEPT;

/* Runs every loaded plug-in's ResourcesDiscover; a failing plug-in is logged
 * and the others still run. */
KVI_API SaErrorT kviDsMaplManagerDiscoverResources(SaHpiDomainIdT DomainId) KVI_NOEXCEPT;

/* Copies the file name of slot MaplNum, as listed, with its terminator. */
KVI_API SaErrorT kviDsMaplManagerGetMaplName(SaHpiUint32T MaplNum, SaHpiUint32T BufferSize,
                                             SaHpiInt8T *Buffer) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
