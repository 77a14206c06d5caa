/* Placeholder until this unit's public interface is written. */
#ifndef KVI_RDR_H
#define KVI_RDR_H
#endif
