/* The run time of the graphical environment Graviton as libgrrt.so, libgrffrt.so and their
   numbered copies stand in for it: the one function the driver calls, and the test entries. */
#ifndef GRAVITON_RT_H
#define GRAVITON_RT_H

#include <stdint.h>

#ifndef GRRT_EXPORT
#define GRRT_EXPORT __attribute__((visibility("default")))
#endif

#ifdef __cplusplus
extern "C" {
#endif

/* The clean-up procedure the driver registers: it closes the session whose handle it is given. */
typedef int32_t (*RTCleanupProc)(void* argument);
/* mode 2 registers (procedure, argument); mode 0 withdraws that registration; other modes are recorded and otherwise ignored. Returns 0. */
GRRT_EXPORT int32_t RTSetCleanupProc(RTCleanupProc procedure, void* argument, int32_t mode);

/* The registrations in force. */
GRRT_EXPORT uint32_t grrt_sim_registered(void);
/* Every RTSetCleanupProc call since the library was loaded or last reset, oldest first, one line
   each ending in "\n": "mode=2 procedure=0x7f3a10 argument=0x2a" (lowercase hexadecimal, null as
   0x0). Free it with grrt_sim_free; null when out of memory. */
GRRT_EXPORT char* grrt_sim_log(void);
/* Frees a text of grrt_sim_log; null is ignored. */
GRRT_EXPORT void grrt_sim_free(char* text);
/* Withdraws every registration and runs their procedures in the order registered, on a thread of
   its own that is joined before it returns. Answers how many ran, or -1 when no thread could be
   started (the registrations then stay in force). */
GRRT_EXPORT int32_t grrt_sim_shutdown(void);
/* The thread key (a pthread_key_t) whose per-thread value is that thread's run-time module,
   created at the first call and deleted when the library unloads; 0xFFFFFFFF when none could be
   created. */
GRRT_EXPORT uint32_t grrt_sim_tlsIndex(void);
/* Sets the calling thread's value of that key. */
GRRT_EXPORT void grrt_sim_setThreadModule(void* module);
/* Forgets the registrations (without running them) and the log. */
GRRT_EXPORT void grrt_sim_reset(void);

#ifdef __cplusplus
}
#endif

#endif
