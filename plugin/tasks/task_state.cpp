// A unit of its own, so that a handler can be linked without the rest of the task manager.

#include "tasks/task_state.h"

using ZAV::String;

std::vector<String>& commands = *new std::vector<String>;
std::mutex ZAV::commandsMutex;
std::queue<TaskQueueElem>& taskQueue = *new std::queue<TaskQueueElem>;
pthread_mutex_t queue_mutex = PTHREAD_MUTEX_INITIALIZER;
pthread_cond_t worktodo = PTHREAD_COND_INITIALIZER;
bool initialized = false;
String& depotDir = *new String;
