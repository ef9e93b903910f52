// The thread key whose per-thread value is the run-time module of that thread. It has no
// destructor function, so no thread's exit calls into the library once it is unloaded, and the
// library deletes it when it unloads.
#include "graviton_rt.h"

#include <pthread.h>

namespace {

class ThreadKey {
public:
    ThreadKey() : created_(pthread_key_create(&key_, nullptr) == 0) {}
    ~ThreadKey() {
        if (created_) pthread_key_delete(key_);
    }
    ThreadKey(const ThreadKey&) = delete;
    ThreadKey& operator=(const ThreadKey&) = delete;

    uint32_t index() const { return created_ ? static_cast<uint32_t>(key_) : 0xFFFFFFFFu; }
    void set(void* module) const {
        if (created_) pthread_setspecific(key_, module);
    }

private:
    pthread_key_t key_{};
    bool created_;
};

const ThreadKey& threadKey() {
    static const ThreadKey key;
    return key;
}

}  // namespace

uint32_t grrt_sim_tlsIndex(void) { return threadKey().index(); }

void grrt_sim_setThreadModule(void* module) { threadKey().set(module); }
