// What the tool says while it works: lines for people on the standard error, and objects for programs, one a
// line, as docs/progress.schema.json describes them.
#pragma once

#include <string>
#include <string_view>
#include <vector>

enum class Level { note, warning, error };

// A line for people, "tarsel: " in front. Where objects are sent it is also one of them, or part of the last
// one, and is nothing else where these go to the standard error.
void tell(Level level, const std::string& line);

// The figures of a job that an object holds.
struct JobFigures {
    double percent = 0, etaSeconds = -1;       // negative: unknown
    double fps = -1, speed = -1;               // likewise
    double elapsedSeconds = 0;                 // while the job was running
    long long frame = 0, outMicroseconds = 0;  // of the output
    int pass = 1, passes = 1;
    const char* state = "running";  // or "paused"; at the end "done", "failed", "stopped", "kept"
};

// The channel of the objects. None is sent before open(); then the first is "start" and the last "end",
// whatever happens. From any thread.
class Events {
  public:
    static Events& get();

    // `target`: "" for the standard error, a number for a descriptor that is open, or the name of a file, a
    // pipe or a device. A file that exists is emptied if `overwrite`, otherwise refused; so is one of
    // `others`, which the job reads or writes. Sends "start". Throws Failure.
    void open(const std::string& target, const std::vector<std::string>& others, bool overwrite,
              const std::string& version);
    bool isOpen() const;
    // The descriptor that was asked for, which then has nothing but objects: 1, 2 or another; -1 if none.
    int descriptor() const;

    // "progress"; left out while the reader has no room.
    void progress(const JobFigures& figures);
    // For the last object.
    void remember(const JobFigures& figures);
    void wrote(const std::vector<std::string>& outputs);
    // The outputs exist, and the job has left them as they are.
    void kept();
    // Why objects were lost, "" if none were.
    std::string lost() const;
    // A stop was asked for: a reader that takes nothing is not waited for much longer.
    void hurry();

    // "end", once; `status` is that of the process. Waits for the reader unless it is to hurry.
    void end(int status);
    // The same at once, and without memory.
    void endNow(int status);
};

// For the end of the process in the middle of its work: the whole line for people ("tarsel: ...\n"; none if
// it is empty), in one write and only if there is room for it, and "end".
void lastWords(std::string_view line, int status);
