/* Placeholder until this unit's public interface is written. */
#ifndef KVI_NON_VOLATILE_H
#define KVI_NON_VOLATILE_H
#endif
