// The sub-commands. Each adds itself to the command line and says what runs when it is chosen.
#pragma once

#include <functional>
#include <string>

#include <CLI/CLI.hpp>

#include "tarsel/host/signals.h"

using Action = std::function<void()>;

void addTranscode(CLI::App& app, Action& chosen, Signals& signals);
void addInfo(CLI::App& app, Action& chosen);
void addCaptions(CLI::App& app, Action& chosen);
void addModules(CLI::App& app, Action& chosen);
void addFormats(CLI::App& app, Action& chosen);
void addPresets(CLI::App& app, Action& chosen);
void addFrame(CLI::App& app, Action& chosen, Signals& signals);
