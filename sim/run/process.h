#ifndef KESBLUETOOTH_SIM_RUN_PROCESS_H
#define KESBLUETOOTH_SIM_RUN_PROCESS_H

#include "serving.h"
#include "serving/bus/glib_ptr.h"

#include <string>
#include <vector>

#include <sys/types.h>

namespace Bluetooth::Sim {

/// An array of C strings, as exec and its relatives want it; valid as long as the texts are.
std::vector<char*> cStrings(const std::vector<std::string>& texts);

/// The environment of this process with some variables replaced ("NAME=VALUE") or, when an entry
/// has no "=", removed.
std::vector<std::string> environmentWith(const std::vector<std::string>& changes);

/// A helper process of ours: in a process group of its own, so that Ctrl-C does not reach it, and
/// ended when we die. What it prints goes to our standard error.
struct Helper {
    std::vector<std::string> arguments;
    std::vector<std::string> environment;
    int pipeTarget = -1; ///< the descriptor on which it writes to us
};

/// Starts a helper.
/// @param output  receives the end of the pipe that we read
/// @throw std::runtime_error  with a text for the user
pid_t startHelper(const Helper& helper, int& output);

/// All that comes from a pipe up to the first newline or its end; closes it.
std::string readLine(int fd);

/// Asks a child to end, waits, kills it after a while, and reaps it.
void endProcess(pid_t pid);

} // namespace Bluetooth::Sim

#endif
