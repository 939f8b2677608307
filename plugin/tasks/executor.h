/// The thread that runs queued tasks.
#pragma once

/// Prepares the queue's lock and starts the thread, which lives as long as the process. Failures
/// are traced only. Called once.
void startExecutor();
