// Starting the companion programs ("slotwatch", "killall") by name along the search path.
#pragma once

// Runs program along PATH with argument as its only argument (none when argument is null) and
// does not wait for it. The program is detached: it is never left behind as a zombie child of
// this process. Returns once the program runs: false when no process could be created for it or
// it could not be executed.
bool LaunchDetached(const char* program, const char* argument);
