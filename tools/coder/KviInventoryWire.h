/* Inventory data on the wire. In memory it is a tree: a head with a
 * NULL-terminated list of record pointers, records whose general areas
 * point at text buffers. On the wire the same structures travel in one
 * block, each pointer replaced by its target's offset in the block plus
 * one (0 stays NULL). */
#ifndef KVI_INVENTORY_WIRE_H
#define KVI_INVENTORY_WIRE_H

#include "SaHpi.h"

/* The alignment a block must have to be taken apart in place: that of the
 * records, the most demanding of the tree's structures. */
#define KVI_WIRE_INVENTORY_ALIGN alignof(SaHpiInventDataRecordT)

/* The largest inventory that travels: a message arrives in one read, which
 * stays safe well below the 64 KiB a message may hold. A larger inventory
 * is reported as not fitting, with the size it needs. */
#define KVI_WIRE_INVENTORY_MAX 16384u

/* Copies the tree at Data into Block (Size bytes, aligned to
 * KVI_WIRE_INVENTORY_ALIGN) in wire form; *Used tells how many bytes it
 * took. When Bounds is not NULL every object of the tree must lie within
 * Bounds and BoundsSize (a tree that a plug-in wrote into a buffer), else
 * SA_ERR_HPI_INVALID_DATA. SA_ERR_HPI_OUT_OF_SPACE when Size is too small. */
SaErrorT kviWireInventoryFlatten(const SaHpiInventoryDataT *Data, const void *Bounds,
                                 SaHpiUint32T BoundsSize, void *Block, SaHpiUint32T Size,
                                 SaHpiUint32T *Used) noexcept;

/* Turns the wire form in Block (Size bytes, aligned) back into a tree of
 * pointers into Block. Every offset must point at a whole object inside
 * the block, suitably aligned, and every list must end inside it; else
 * SA_ERR_HPI_INVALID_DATA, and the block must not be used as a tree. */
SaErrorT kviWireInventoryRelocate(void *Block, SaHpiUint32T Size) noexcept;

#endif
