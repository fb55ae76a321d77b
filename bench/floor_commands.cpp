// floor_commands FILE
//
// Runs the commands of FILE one after another and does nothing else: the cost of the converters
// alone. FILE contains the arguments of each command, each followed by a NUL; an empty argument
// ends the command.

#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fstream>
#include <string>
#include <vector>

namespace {

using Command = std::vector<std::string>;

std::vector<Command> ReadCommands(const char* path) {
  std::ifstream file(path, std::ios::binary);
  std::vector<Command> commands(1);
  for (std::string argument; std::getline(file, argument, '\0');) {
    if (argument.empty()) {
      commands.emplace_back();
    } else {
      commands.back().push_back(argument);
    }
  }
  commands.pop_back();
  return commands;
}

bool Run(Command& command) {
  std::vector<char*> arguments;
  for (std::string& argument : command) {
    arguments.push_back(argument.data());
  }
  arguments.push_back(nullptr);
  pid_t child = 0;
  if (posix_spawn(&child, arguments[0], nullptr, nullptr, arguments.data(), environ) != 0) {
    return false;
  }
  int status = 0;
  return waitpid(child, &status, 0) == child && status == 0;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 2) {
    return 2;
  }
  std::vector<Command> commands = ReadCommands(argv[1]);
  if (commands.empty()) {
    return 3;
  }
  for (Command& command : commands) {
    if (!Run(command)) {
      return 1;
    }
  }
  return 0;
}
