/* The test entries of the routing-service stand-in, beside the 56 functions of zrrocoapi.h.
   Texts they return are freed with zrrocoapi_destroyString. */
#ifndef ZRROCOAPI_SIM_H
#define ZRROCOAPI_SIM_H

#include "zrrocoapi.h"

#ifdef __cplusplus
extern "C" {
#endif

/* Every call so far, oldest first, as a JSON array of {"call", "args", "code"[, "result"]}. */
ZRROCOAPI_EXPORT char* zrrocoapi_sim_log(void);
/* The routes in effect on a device (every device when null) as a JSON array of route descriptions. */
ZRROCOAPI_EXPORT char* zrrocoapi_sim_routes(const char* device);
/* Ends every session, route, attributes handle and reset, and empties the log. */
ZRROCOAPI_EXPORT void zrrocoapi_sim_reset(void);

typedef char* (*zrrocoapi_sim_log_fn)(void);
typedef char* (*zrrocoapi_sim_routes_fn)(const char* device);
typedef void (*zrrocoapi_sim_reset_fn)(void);

#ifdef __cplusplus
}
#endif

#endif
