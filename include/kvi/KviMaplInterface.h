/* Placeholder until this unit's public interface is written. */
#ifndef KVI_MAPL_INTERFACE_H
#define KVI_MAPL_INTERFACE_H
#endif
