// Every sentence with which the tool refuses, fails or warns: one table, in messages.cpp.
#pragma once

#include <initializer_list>
#include <span>
#include <string>
#include <string_view>

#include "tarsel/words/failure.h"

enum class Msg : unsigned char {
    // the command line
    commandMissing,
    commandUnknown,
    optionUnknown,
    wordTooMany,
    argumentMissing,
    valueMissing,
    valueNotTaken,
    optionRepeated,
    choiceUnknown,
    commandLineWrong,
    keyNotPair,
    keyUnknown,
    keyRepeated,
    // values of options
    timeWrong,
    timeCountsFrames,
    rateWrong,
    rateOfFields,
    sizeWrong,
    sheetWrong,
    wholeWrong,
    decimalWrong,
    bitsWrong,
    pixelUnknown,
    colourWrong,
    encodingUnknown,
    nameUnknown,
    pairIncomplete,
    // inputs
    inputAbsent,
    inputIsFolder,
    inputNotRegular,
    inputEmpty,
    inputSystem,
    inputUnknown,
    inputIsRaw,
    inputNoDecoder,
    inputRefused,
    inputFormat,
    inputNotWav,
    inputWavDamaged,
    inputWavNoData,
    inputNoScc,
    inputNoCaptions,
    inputNoSubtitles,
    rawNoFile,
    rawNoInput,
    rawIncomplete,
    rawTooShort,
    rawNameSays,
    rawNameOpen,
    streamRefused,
    inputDamaged,
    taskDamaged,
    taskRefused,
    fileDamaged,
    inputEndedEarly,
    inputDamagedTaken,
    inputPartlyRead,
    readFailed,
    frameReadFailed,
    inputNoPicture,
    inputNoSound,
    inputNoStreams,
    fileNoPicture,
    inputMissing,
    inputUnused,
    generatorSmall,
    generatorNoFrame,
    generatorFailed,
    pictureNoPng,
    pictureDamaged,
    // parts of the input
    toNotAfter,
    fromAfterEnd,
    atAfterEnd,
    toAfterEnd,
    noFrameBetween,
    // pictures
    matrixWrong,
    matrixNoYuv,
    cropWrong,
    cropEmpty,
    cropBeyond,
    cropColumns,
    cropRows,
    cropRefused,
    deinterlaceProgressive,
    rateNotConverted,
    styleAlone,
    placeWrong,
    logoNoFile,
    logoBeyond,
    logoNoPicture,
    fontWrong,
    dropFrameNone,
    frameTooLarge,
    sheetFailed,
    pictureName,
    pictureFailed,
    // filters and modules
    filterUnknown,
    filterNoStream,
    effectNoPicture,
    filterPlaceTaken,
    filterFileMissing,
    filterRefused,
    filterFileRefused,
    filterFailed,
    filterWriteFailed,
    filterWritesFile,
    chainRefused,
    parameterUnknown,
    parameterRefused,
    moduleUnknown,
    moduleUnusable,
    muxerUnknown,
    muxerUnusable,
    outputNoModule,
    aviNoModule,
    // captions
    captionsForms,
    captionsOneFile,
    captionsLost,
    captionsLetters,
    captionsCut,
    captionsLate,
    // subtitles
    subtitlesOtherFile,
    subtitlesNoText,
    subtitlesNone,
    subtitlesLost,
    subtitlesNotInEncoding,
    subtitlesInOtherEncoding,
    subtitlesEncodingUnknown,
    noSuchFont,
    noSuchAlign,
    noMargin,
    noSwitch,
    // outputs
    outputExists,
    outputIsInput,
    outputIsOutput,
    outputTwice,
    outputFolderAbsent,
    outputFolderGone,
    outputFormatUnknown,
    outputFormatMissing,
    formatUnknown,
    outputNameSays,
    outputNameOpen,
    outputHoldsOne,
    outputTakesOne,
    numberWrong,
    numberNotStored,
    pictureNumbered,
    outputSystem,
    outputRefused,
    outputNoStream,
    outputNoSpace,
    outputNotPlaced,
    outputTorn,
    outputNotSynced,
    logNotWritten,
    standardOutput,
    // work folders and what ended runs left in them
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
    // outputs that are streams
    streamIsSocket,
    planAndTask,
    streamClosed,
    streamToTerminal,
    streamNeedsFormat,
    streamOfFiles,
    streamOfChannels,
    streamReaderGone,
    streamShort,
    // plug-ins
    pluginsAbsent,
    pluginUnreadable,
    pluginUnsafe,
    pluginInvalid,
    pluginUnresolved,
    pluginUnfit,
    pluginFailed,
    pluginEndedAll,
    // how a run ends
    linkFailed,
    jobFailed,
    runOutOfMemory,
    runHasNoThread,
    toolHasNoThread,
    runBroken,
    inputShrank,
    inputShrankTaken,
    outputUnreadable,
    outputDiffers,
    stoppedBeforePost,
    stoppedInPost,
    postNotRun,
    postFailed,
    taskFailed,
    engineWarns,
    outOfMemory,
    pathFailed,
    systemFailed,
    engineFailed,
    count,  // of messages, none itself
};

// A line of the tool is "WHAT: WHY; REMEDY". What failed names a file or an option; why is the reason in the
// user's words, or in the system's; the remedy says what to do, and is "" only where a warning needs none. A
// warning has Exit::done.
//
// The columns hold placeholders, which the values of a call fill in the order in which they stand:
//     {file} {name}    a file's name or another word of the user's, shown in quotes
//     {system}         a sentence of the engine's or the system's, made to fit into a line
//     {option}         an option, shown as it is
//     {hint}           what suggestion() says of a name that is not known, before the rest of a remedy
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
// The failure of a message about a file whose why and remedy are those of an errno value.
Failure systemFailure(Msg id, std::string_view file, int error);
// That `file` can't be written, for what a sentence of the engine says.
Failure writeFailure(std::string_view file, std::string_view sentence);
