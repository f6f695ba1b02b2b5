#include "UTIL/big_stack.h"

#include <csignal>
#include <exception>
#include <memory>
#include <pthread.h>

namespace {

struct Job {
    const std::function<void()>* work;
    std::exception_ptr failure;
};

void run(Job& job) {
    try {
        (*job.work)();
    } catch (...) { job.failure = std::current_exception(); }
}

// A handler for a fault of the big stack itself needs a stack of its own to report from.
void* thread_main(void* arg) {
    constexpr std::size_t signal_stack_size = 64 * 1024;
    auto memory = std::make_unique<char[]>(signal_stack_size);
    stack_t signal_stack{};
    signal_stack.ss_sp = memory.get();
    signal_stack.ss_size = signal_stack_size;
    sigaltstack(&signal_stack, nullptr);
    run(*static_cast<Job*>(arg));
    signal_stack.ss_flags = SS_DISABLE;
    sigaltstack(&signal_stack, nullptr);
    return nullptr;
}

} // namespace

void run_on_big_stack(std::size_t bytes, const std::function<void()>& work) {
    Job job{&work, nullptr};
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    pthread_t thread;
    const bool started = pthread_attr_setstacksize(&attributes, bytes) == 0 &&
                         pthread_create(&thread, &attributes, thread_main, &job) == 0;
    pthread_attr_destroy(&attributes);
    if (started)
        pthread_join(thread, nullptr);
    else
        run(job);
    if (job.failure) std::rethrow_exception(job.failure);
}
