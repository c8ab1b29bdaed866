// The sub-commands. Each adds itself to the command line and says what runs when it is chosen.
#pragma once

#include <functional>
#include <string>
#include <vector>

class CommandLine;
class Signals;

// `version`: of the tool, for the objects of --progress.
void addTranscode(CommandLine& line, Signals& signals, const std::string& version);
void addInfo(CommandLine& line);
void addLoudness(CommandLine& line);
void addMix(CommandLine& line, Signals& signals);
void addViews(CommandLine& line, Signals& signals);
void addCaptions(CommandLine& line, Signals& signals);
void addModules(CommandLine& line);
void addFormats(CommandLine& line);
void addPresets(CommandLine& line, Signals& signals);
void addRecover(CommandLine& line);
void addRun(CommandLine& line, Signals& signals, const std::string& version);
// `words`: the whole command line; `log`: of --log, once it is parsed; it outlives the line.
void addBatch(CommandLine& line, Signals& signals, const std::string& version,
              const std::vector<std::string>& words, const std::string& log);
void addTask(CommandLine& line, Signals& signals);
void addCompare(CommandLine& line, Signals& signals);
void addScope(CommandLine& line, Signals& signals);
void addFrame(CommandLine& line, Signals& signals, const std::string& version);
void addWatch(CommandLine& line, Signals& signals, const std::string& version);
