// Every sentence with which the tool refuses, fails or warns: one table, in messages.cpp.
#pragma once

#include <initializer_list>
#include <span>
#include <string>
#include <string_view>

#include "tarsel/words/failure.h"

enum class Msg : unsigned char {
    // outputs
    outputExists,
    outputIsInput,
    outputFolderAbsent,
    outputNotPlaced,
    outputTorn,
    outputNotSynced,
    setCompleted,
    setRestored,
    leftRemoved,
    workInUse,
    workNotOurs,
    workElsewhere,
    workOwnerless,
    manifestUnreadable,
    setInTheWay,
    workStays,
    recoverNoFolder,
    recoverUnfinished,
    staleNoAge,
    // plug-ins
    pluginsAbsent,
    pluginUnreadable,
    pluginUnsafe,
    pluginInvalid,
    pluginUnresolved,
    pluginUnfit,
    pluginFailed,
    pluginEndedAll,
    // runs
    runOutOfMemory,
    runHasNoThread,
    toolHasNoThread,
    runBroken,
    stoppedBeforePost,
    stoppedInPost,
    inputShrank,
    inputShrankTaken,
    // outputs that are streams
    streamClosed,
    streamToTerminal,
    streamNeedsFormat,
    streamOfFiles,
    streamOfChannels,
    streamReaderGone,
    streamShort,
    formatUnknown,
    outputFormatUnknown,
    outputFormatMissing,
    outputTwice,
    count,  // of messages, none itself
};

// A line of the tool is "WHAT: WHY; REMEDY". What failed names a file or an option; why is the reason in the
// user's words, or in the system's; the remedy says what to do, and is "" only where a warning needs none.
//
// The columns hold placeholders, which the values of a call fill in the order in which they stand:
//     {file} {name}    a file's name or another word of the user's, shown in quotes
//     {system}         a sentence of the engine's or the system's, made to fit into a line
//     {option}         an option, shown as it is
//     {text}           a number or a word of the tool's, shown as it is
struct Message {
    Msg id;
    Exit exit;
    const char *what, *why, *remedy;
};

// In the order of Msg.
std::span<const Message> messages();

// The line of a message, without "tarsel: ". As many values as the row has placeholders.
std::string lineOf(Msg id, std::initializer_list<std::string_view> values = {});
// The failure of a message, to be thrown.
Failure failure(Msg id, std::initializer_list<std::string_view> values = {});
