/* The test entries of the PXI chassis query stand-in, beside the 17 functions of zrqpxi.h. */
#ifndef ZRQPXI_SIM_H
#define ZRQPXI_SIM_H

#include "zrqpxi.h"

#ifdef __cplusplus
extern "C" {
#endif

/* The item handles (sessions among them) open now. */
ZRQPXI_EXPORT uint32_t zrqpxi_sim_openItems(void);
/* The containers not yet destroyed. */
ZRQPXI_EXPORT uint32_t zrqpxi_sim_openContainers(void);
/* The calls so far, oldest first, one "name(arg,...)" per line, each line ending in "\n". With
   size 0 (buffer may be null) nothing is copied; otherwise as much as fits, with a final NUL.
   Answers the size the whole log needs, its NUL included. */
ZRQPXI_EXPORT uint32_t zrqpxi_sim_log(char* buffer, uint32_t size);
/* Invalidates every open session, as a change of the chassis configuration would. */
ZRQPXI_EXPORT void zrqpxi_sim_invalidate(void);
/* Closes every handle and container, ends every wait and empties the log. */
ZRQPXI_EXPORT void zrqpxi_sim_reset(void);

typedef uint32_t (*zrqpxi_sim_openItems_fn)(void);
typedef uint32_t (*zrqpxi_sim_openContainers_fn)(void);
typedef uint32_t (*zrqpxi_sim_log_fn)(char* buffer, uint32_t size);
typedef void (*zrqpxi_sim_invalidate_fn)(void);
typedef void (*zrqpxi_sim_reset_fn)(void);

#ifdef __cplusplus
}
#endif

#endif
