#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <stdexcept>

#include "request/clients.h"

namespace request {

namespace {

pid_t spawn(const std::vector<std::string>& arguments, int output) {
    std::vector<char*> argv;
    for (const std::string& argument : arguments)
        argv.push_back(const_cast<char*>(argument.c_str()));
    argv.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
    ::posix_spawn_file_actions_adddup2(&actions, output, 1);
    pid_t pid = 0;
    const int error = ::posix_spawn(&pid, argv[0], &actions, nullptr, argv.data(), environ);
    ::posix_spawn_file_actions_destroy(&actions);
    if (error != 0) throw std::runtime_error("cannot start " + arguments[0]);
    return pid;
}

}  // namespace

Exchange program(const std::vector<std::string>& arguments) {
    return [arguments] {
        int ends[2];
        if (::pipe2(ends, O_CLOEXEC) != 0) throw std::runtime_error("no pipe");
        const pid_t pid = spawn(arguments, ends[1]);
        ::close(ends[1]);
        std::string output;
        char piece[4096];
        for (ssize_t count; (count = ::read(ends[0], piece, sizeof piece)) > 0;)
            output.append(piece, static_cast<std::size_t>(count));
        ::close(ends[0]);
        int status = 0;
        if (::waitpid(pid, &status, 0) != pid || status != 0) {
            throw std::runtime_error(arguments[0] + " failed");
        }
        return output;
    };
}

}  // namespace request
