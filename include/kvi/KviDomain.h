/* Placeholder until this unit's public interface is written. */
#ifndef KVI_DOMAIN_H
#define KVI_DOMAIN_H
#endif
