/* Placeholder until this unit's public interface is written. */
#ifndef KVI_SESSION_H
#define KVI_SESSION_H
#endif
