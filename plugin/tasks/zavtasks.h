/// The task manager, for everybody outside this folder: it checks requests, runs the quick commands
/// at once and queues the long ones for the executor, a thread that runs them one at a time in the
/// order in which they came. This header only gathers; inside the folder include what you use.
#pragma once

#include <pthread.h>

#include <queue>
#include <vector>

#include "base/zavstr.h"
#include "tasks/dispatch.h"
#include "tasks/executor.h"
#include "tasks/manager.h"
#include "tasks/required_parameter.h"
#include "tasks/return_codes.h"
#include "tasks/supported_commands.h"
#include "tasks/task_queue.h"
#include "tasks/task_state.h"
#include "tasks/zavtqelm.h"
