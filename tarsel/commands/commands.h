// The sub-commands. Each adds itself to the command line and says what runs when it is chosen.
#pragma once

class CommandLine;
class Signals;

void addTranscode(CommandLine& line, Signals& signals);
void addInfo(CommandLine& line);
void addCaptions(CommandLine& line, Signals& signals);
void addModules(CommandLine& line);
void addFormats(CommandLine& line);
void addPresets(CommandLine& line);
void addRecover(CommandLine& line);
void addFrame(CommandLine& line, Signals& signals);
