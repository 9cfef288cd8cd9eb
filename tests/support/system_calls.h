#pragma once

#include <functional>

namespace kelo::test {

// Watches TORVCExec, KELOFSMkdirP and KELOSystemdReload, in addition to PlatformCalls and on the same count
// of calls that can fail; each is recorded with all of its arguments ("/bin/sh -c COMMAND", "FOLDER 0 1 -1 -1
// 777", "SERVICE"). Commands and folders reach the platform, a reload never does. Part of the program that
// lists system_calls.cpp among its sources.
class SystemCalls {
public:
    // Reloads succeed from now on.
    static void Reset();
    // What a reload answers from now on.
    static void AnswerReloadWith(bool result);
    // Is called at every reload, to look at what is there then.
    static void OnReload(std::function<void()> look);
};

} // namespace kelo::test
