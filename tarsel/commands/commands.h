// The sub-commands. Each adds itself to the command line and says what runs when it is chosen.
#pragma once

#include <string>

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
void addTask(CommandLine& line, Signals& signals);
void addCompare(CommandLine& line, Signals& signals);
void addScope(CommandLine& line, Signals& signals);
void addFrame(CommandLine& line, Signals& signals, const std::string& version);
