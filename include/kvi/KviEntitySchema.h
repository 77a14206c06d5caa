/* Placeholder until this unit's public interface is written. */
#ifndef KVI_ENTITY_SCHEMA_H
#define KVI_ENTITY_SCHEMA_H
#endif
