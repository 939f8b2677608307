// What the task manager shares with the handlers and the host. On its own, so that a handler can be
// linked without all the others.

#include "tasks/zavtasks.h"

using ZAV::String;

std::vector<String>& commands = *new std::vector<String>;
std::queue<TaskQueueElem>& taskQueue = *new std::queue<TaskQueueElem>;
pthread_mutex_t queue_mutex = PTHREAD_MUTEX_INITIALIZER;
pthread_cond_t worktodo = PTHREAD_COND_INITIALIZER;
bool initialized = false;
String& depotDir = *new String;
