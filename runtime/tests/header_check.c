/* The headers for the loader compile as strict C99 (the C++ side is covered by runtime_test.cpp),
 * and the list in zrcurl_entries.h has ZRCURL_ENTRY_COUNT names. */
#include "zrcurl/zrcurl.h"
#include "zrcurl/zrcurl_entries.h"
#include "zrssl/zrsslinit.h"

#define ZRCURL_ENTRY(name) #name,
static const char* const names[] = {ZRCURL_ENTRIES};
#undef ZRCURL_ENTRY

int main(void) {
  zrcurl_easy_init_fn init = 0;
  zrcurl_easy_setopt_fn setopt = 0;
  zrcurl_easy_perform_fn perform = 0;
  zrcurl_easy_getinfo_fn getinfo = 0;
  zrcurl_easy_cleanup_fn cleanup = 0;
  zrcurl_slist_append_fn append = 0;
  zrcurl_slist_free_all_fn free_all = 0;
  zrsslinit_init_fn ssl_init = 0;
  zrsslinit_uninit_fn ssl_uninit = 0;
  (void)init, (void)setopt, (void)perform, (void)getinfo, (void)cleanup, (void)append, (void)free_all;
  (void)ssl_init, (void)ssl_uninit;
  return sizeof names / sizeof names[0] == ZRCURL_ENTRY_COUNT && names[0][0] == 'c' ? 0 : 1;
}
