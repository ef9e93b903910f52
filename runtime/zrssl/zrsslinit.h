/* Interface of the SSL initialisation library (zrssl/libzrsslinit.so). Valid C and C++.
 *
 * ZRSSLINIT_Init starts the process-wide TLS and libcurl state and returns a non-null handle, or
 * null when that fails. ZRSSLINIT_Uninit releases a handle; the state ends when the last handle
 * is released, so Init/Uninit pairs nest. Uninit of a null handle does nothing.
 */
#ifndef ZRSSL_ZRSSLINIT_H
#define ZRSSL_ZRSSLINIT_H

#ifdef __cplusplus
extern "C" {
#endif

void* ZRSSLINIT_Init(void);
void ZRSSLINIT_Uninit(void* handle);

/* Types of the two entry points, for the pointers dlsym returns. */
typedef void* (*zrsslinit_init_fn)(void);
typedef void (*zrsslinit_uninit_fn)(void* handle);

#ifdef __cplusplus
}
#endif

#endif
