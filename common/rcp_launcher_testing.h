// Hooks for the tests and the fuzz targets only; the launcher never calls
// them. They reach state that a launch otherwise keeps for its whole run.
#ifndef RCP_LAUNCHER_TESTING_H
#define RCP_LAUNCHER_TESTING_H

#include <string>

// The text still waiting in the log queue.
const std::string& getLogQueue();
// The logging module as at process start: queue empty, log closed, debug on.
void resetLoggingForTest();
// Frees the expanded copies of arguments; no argument vector may point to
// them afterwards.
void releaseExpandedArgs();

#endif  // RCP_LAUNCHER_TESTING_H
