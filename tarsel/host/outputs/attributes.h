// What a file that replaces another one keeps of it.
#pragma once

// Gives the file `fresh` of the folder `work` the permissions, the owner and the group of the file `old` of
// `place`, and its access list, as far as this process may. Where the group or the list can't be kept, group
// members get no more than everybody. No set-user or set-group bit is kept. Nothing if `old` is absent or no
// regular file. 0 or an errno of what `fresh` refused.
int keepAttributes(int work, const char* fresh, int place, const char* old);
