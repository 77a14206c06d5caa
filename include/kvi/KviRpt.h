/* Placeholder until this unit's public interface is written. */
#ifndef KVI_RPT_H
#define KVI_RPT_H
#endif
