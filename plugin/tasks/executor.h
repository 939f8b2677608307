/// The executor: the one thread that runs the queued tasks, in the order in which they came.
#pragma once

/// The thread's body: takes tasks off the queue, runs them and publishes their outcomes. Never
/// returns; no exception ends it. `unused` is what a thread's function takes.
void* executor_thread(void* unused);
