#include "tarsel/words/messages.h"

#include <cassert>
#include <iterator>

#include "tarsel/words/systemcause.h"

namespace {

// clang-format off
constexpr Message kMessages[] = {
    // the command line
    {Msg::commandMissing,   Exit::usage, "no command",                     "there is nothing to do",                                   "'tarsel --help' lists all commands"},
    {Msg::commandUnknown,   Exit::usage, "there is no command {name}",     "tarsel has no such command",                               "{hint}'tarsel --help' lists all"},
    {Msg::optionUnknown,    Exit::usage, "unknown option {name}",          "the command has none of this name",                        "{hint}see '{text}'"},
    {Msg::wordTooMany,      Exit::usage, "unknown argument {name}",        "the command takes no further one",                         "see '{text}'"},
    {Msg::argumentMissing,  Exit::usage, "{option} is missing",            "the command needs it",                                     "see '{text}'"},
    {Msg::valueMissing,     Exit::usage, "{option}",                       "it needs a value",                                         "give {text}"},
    {Msg::valueNotTaken,    Exit::usage, "{option}",                       "it takes no value, but has {name}",                        "leave out the value"},
    {Msg::valueApart,       Exit::usage, "{option}",                       "{name} after it is not its value but an argument of the command", "write {text}"},
    {Msg::optionRepeated,   Exit::usage, "{option}",                       "it is given twice, and only one value counts",             "leave one out"},
    {Msg::optionsExclude,   Exit::usage, "{option}",                       "{option} contradicts it",                                  "give one of them"},
    {Msg::choiceUnknown,    Exit::usage, "{option}",                       "{name} is none of its values",                             "{hint}use {text}"},
    {Msg::commandLineWrong, Exit::usage, "the command line can't be read", "no option explains a part of it",                          "see '{text}'"},
    {Msg::keyNotPair,       Exit::usage, "{option}",                       "{name} is not of the form key=value",                      "write key=value,key=value"},
    {Msg::keyUnknown,       Exit::usage, "{option}",                       "unknown key {name}",                                       "{hint}the keys are {text}"},
    {Msg::keyRepeated,      Exit::usage, "{option}",                       "the key {name} is given twice, and only one value counts", "leave one out"},
    {Msg::listWrong,        Exit::usage, "{option}",                       "{name} is no list",                                        "give a JSON array; 'tarsel modules' says what is in it"},
    // values of options
    {Msg::timeWrong,        Exit::usage, "{option}", "{name} is not a time",                                  "use SS[.mmm], MM:SS, HH:MM:SS[.mmm], 120f, HH:MM:SS:FF or HH:MM:SS;FF"},
    {Msg::timeCountsFrames, Exit::usage, "{option}", "{name} counts frames, but the input has no frame rate", "give seconds"},
    {Msg::rangeWrong,        Exit::usage, "{option}",                               "{name} is no part of a time",                           "give FROM-TO, as 10-20, 1:30-2:00, 250f-500f or 10-"},
    {Msg::segmentNoStreams,  Exit::input, "can't join {file}",                      "it has neither picture nor sound that the output takes", "leave it out"},
    {Msg::joinRefuses,       Exit::usage, "{option}",                               "it has no meaning for several segments",                "join first, and give it to a second run"},
    {Msg::joinLevelLater,    Exit::done,  "--normalize",                            "the gain is measured when the job runs",                ""},
    {Msg::timeBeforeStart,  Exit::usage, "{option}", "{name} is before the start, as all of it is {text}",    "give a time nearer to the end"},
    {Msg::rateWrong,        Exit::usage, "{option}", "{name} is not a frame rate",                            "use 25, 29.97, 30000/1001, pal, ntsc or film, or 25i and 25b for fields"},
    {Msg::rateOfFields,     Exit::usage, "{option}", "{name} counts fields; 'i' and 'b' follow frames a second", "use {text}"},
    {Msg::rateNoDropFrame,  Exit::usage, "{option}", "{name} is drop frame, which only 29.97 and 59.94 frames a second have", "leave out df"},
    {Msg::sizeWrong,        Exit::usage, "{option}", "{name} is not a size",                                  "use WIDTHxHEIGHT such as 1280x720, each from 1 to 65535"},
    {Msg::sizeOrShapeWrong, Exit::usage, "{option}", "{name} is not a size",                                  "use WIDTHxHEIGHT such as 1280x720, each from 1 to 65535, or -1 for one of them to keep the shape"},
    {Msg::sheetWrong,       Exit::usage, "{option}", "{name} is not a sheet of pictures",                     "use COLUMNSxROWS from 1x1 to 32x32"},
    {Msg::wholeWrong,       Exit::usage, "{option}", "{name} can't be used",                                  "give a whole number from {text} to {text}"},
    {Msg::decimalWrong,     Exit::usage, "{option}", "{name} can't be used",                                  "give a number from {text} to {text}"},
    {Msg::bitsWrong,        Exit::usage, "{option}", "{name} bits a sample can't be written",                 "use 8, 16 or 24"},
    {Msg::pixelUnknown,     Exit::usage, "{option}", "there is no pixel format {name}",                       "{hint}'tarsel formats' lists all"},
    {Msg::colourWrong,      Exit::usage, "{option}", "{name} is not a colour",                                "use RRGGBB in hexadecimal digits, or a name such as yellow"},
    {Msg::encodingUnknown,  Exit::usage, "{option}", "there is no encoding {name}",                           "{hint}use a name such as utf-8 or windows-1252"},
    {Msg::nameUnknown,      Exit::usage, "{option}", "there is no {text} {name}",                             "{hint}use {text}"},
    {Msg::pairIncomplete,   Exit::usage, "{option}", "{text} and {text} go together",                         "give both or none"},
    // inputs
    {Msg::inputAbsent,       Exit::input, "can't open {file}",                      "no such file",                                          "check the name"},
    {Msg::inputIsFolder,     Exit::input, "can't open {file}",                      "this is a folder",                                      "give the name of a file in it"},
    {Msg::inputNotRegular,   Exit::input, "can't open {file}",                      "this is no regular file",                               "copy it into a file first"},
    {Msg::inputEmpty,        Exit::input, "can't open {file}",                      "the file is empty",                                     "copy or make it again"},
    {Msg::inputSystem,       Exit::input, "can't open {file}",                      "{text}",                                                "{text}"},
    {Msg::inputUnknown,      Exit::input, "can't open {file}",                      "no decoder for the extension {name}",                   "'tarsel formats' lists what opens"},
    {Msg::inputIsRaw,        Exit::input, "can't open {file}",                      "a raw file has no header",                              "give its format with --raw size=WxH,pixel=FORMAT,rate=R"},
    {Msg::inputNoDecoder,    Exit::input, "can't open {file}",                      "this installation can't use the decoder of such files", "'tarsel modules' lists all"},
    {Msg::inputRefused,      Exit::input, "can't open {file}",                      "{system}",                                              "check that the file is whole and named for what it holds"},
    {Msg::inputFormat,       Exit::input, "can't open {file}",                      "it holds {text}",                                       "only {text} can be read; convert it first"},
    {Msg::inputNotWav,       Exit::input, "can't open {file}",                      "this is no WAV file",                                   "check where it comes from"},
    {Msg::inputWavDamaged,   Exit::input, "can't open {file}",                      "it is a damaged WAV file without a format",             "copy or make it again"},
    {Msg::inputWavNoData,    Exit::input, "can't open {file}",                      "it is a damaged WAV file without usable sound data",    "copy or make it again"},
    {Msg::inputNoScc,        Exit::input, "can't open {file}",                      "this is no SCC file",                                   "its first line has to be Scenarist_SCC V1.0"},
    {Msg::inputNoCaptions,   Exit::input, "can't open {file}",                      "it has no caption lines",                               "check how it was made"},
    {Msg::inputNoSubtitles,  Exit::input, "can't open {file}",                      "this is no subtitle file",                              "check that it holds .srt or .sub text"},
    {Msg::rawNoFile,         Exit::usage, "--raw",                                  "it describes a raw file, and {name} is none",           "leave it out"},
    {Msg::rawNoInput,        Exit::usage, "--raw",                                  "it describes a raw file, and no input is one",          "leave it out"},
    {Msg::rawIncomplete,     Exit::usage, "--raw",                                  "size and pixel are not both there",                     "give size=WIDTHxHEIGHT,pixel=FORMAT"},
    {Msg::rawTooShort,       Exit::input, "can't open {file}",                      "it is shorter than one frame of {text} {text}",         "check size and pixel of --raw"},
    {Msg::rawNameSays,       Exit::usage, "--raw pixel={text}",                     "{file} says {text}",                                    "leave out pixel, or rename the file"},
    {Msg::rawNameOpen,       Exit::usage, "--raw",                                  "the name of {file} does not say the order of its bytes", "give pixel=FORMAT too; 'tarsel formats' lists all"},
    {Msg::streamRefused,     Exit::input, "can't read {file}",                      "its {text} stream {text} can't be decoded",             "'tarsel info' shows its streams"},
    {Msg::inputDamaged,      Exit::input, "{file} is damaged",                      "{text}",                                                "--accept-partial takes what is there"},
    {Msg::taskDamaged,       Exit::input, "{file} is no sound task",                "line {text}, {text}: {system}",                         "correct it, or save it again with --save-task"},
    {Msg::taskRefused,       Exit::input, "{file} is no sound task",                "{system}",                                              "correct it, or save it again with --save-task"},
    {Msg::taskManyStreams,   Exit::usage, "can't write {file}",                     "a stream takes one stream, and the task makes {text}",  "give -o the name of a file"},
    {Msg::xmlNameLost,       Exit::usage, "can't write {file}",                     "XML can't keep the name {name} as it is",              "give it a name of plain characters"},
    {Msg::taskPostLeft,      Exit::done,  "{file}",                                 "its command '{text}' is left out",                      "--allow-post runs it"},
    {Msg::taskLogLeft,       Exit::done,  "{file}",                                 "its log of encoding quality {file} is left out",        "an application can write it"},
    {Msg::taskFilterWrites,  Exit::input, "can't run {file}",                       "its filter {name} would write {file} anew in each segment", "take the filter out, and use it on the joined output"},
    {Msg::taskRelinkWrong,   Exit::usage, "{option}",                                 "{name} does not say which name takes whose place",      "give OLD=NEW"},
    {Msg::taskRelinkNothing, Exit::usage, "can't change {file}",                    "it names neither {file} nor anything in it",            "'tarsel task show' prints its names"},
    {Msg::taskRelinkWords,   Exit::usage, "{option}",                                 "it takes OLD=NEW and one task file",                    "give both, as in 'tarsel task relink old.wav=new.wav job.xml'"},
    {Msg::taskWords,         Exit::usage, "{option}",                                 "it takes one task file",                                "give one"},
    {Msg::fileDamaged,       Exit::input, "{file} is damaged",                      "{text}",                                                "copy or make it again"},
    {Msg::inputEndedEarly,   Exit::input, "{file} ended early",                     "{text} of {text} {text} were read",                     "--accept-partial keeps what is there"},
    {Msg::soundEndedEarly,   Exit::input, "{file} ended early",                     "not all of its sound was read",                         "--accept-partial keeps what is there"},
    {Msg::soundPartlyRead,   Exit::done,  "{file} ended early",                     "not all of its sound was read",                         "silence is in the place of the rest"},
    {Msg::inputDamagedTaken, Exit::done,  "{file} is damaged",                      "{text}",                                                "the part that can be read is used"},
    {Msg::inputPartlyRead,   Exit::done,  "{file} ended early",                     "{text} of {text} {text} were read",                     "the output holds these"},
    {Msg::inputClipped,      Exit::done,  "{file} goes beyond full scale",          "{text} samples of audio stream {text} were clipped",    "lower its level where it is made"},
    {Msg::inputChunksLost,   Exit::done,  "{file}",                                 "the output can't keep {text} of it",                    ""},
    {Msg::readFailed,        Exit::input, "can't read {file}",                      "its data has changed or can't be reached",              "check the file and its disk"},
    {Msg::frameReadFailed,   Exit::input, "can't read frame {text} of {file}",      "its data has changed or can't be reached",              "check the file and its disk"},
    {Msg::inputNoPicture,    Exit::input, "no input has a picture for {file}",      "there is nothing but sound",                            "write sound alone as WAV: a name in .wav, or --format wav"},
    {Msg::inputNoSound,      Exit::input, "no input has sound for {file}",          "a .wav file holds sound only",                          "add an input that has sound, or write another format"},
    {Msg::inputNoStreams,    Exit::input, "no input has a picture or sound",        "there is nothing to write into {file}",                 "'tarsel info' shows what an input holds"},
    {Msg::inputUnwanted,     Exit::usage, "{option}",                               "it leaves nothing to write into {file}",                "leave it out"},
    {Msg::fileNoPicture,     Exit::input, "{file} has no picture",                  "there is nothing to show",                              "'tarsel info' shows what it holds"},
    {Msg::inputMissing,      Exit::usage, "no input",                               "there is nothing to read",                              "give a file or testgen:..."},
    {Msg::inputUnused,       Exit::done,  "nothing of {file} goes into the output", "the output has no place for its streams",               ""},
    {Msg::generatorSmall,    Exit::usage, "testgen: size",                          "the test picture is at least 32x32, not {text}",        "give a larger size"},
    {Msg::generatorNoFrame,  Exit::usage, "testgen: duration",                      "{text} holds no frame",                                 "give a longer duration"},
    {Msg::generatorFailed,   Exit::input, "can't make the test picture {name}",     "{system}",                                              "see 'tarsel transcode --help' for its keys"},
    {Msg::pictureNoPng,      Exit::input, "can't read the picture {file}",          "it is no PNG file",                                     "give a PNG picture"},
    {Msg::pictureDamaged,    Exit::input, "can't read the picture {file}",          "the file is damaged",                                   "copy or make it again"},
    // parts of the input
    {Msg::toNotAfter,     Exit::usage, "{option} {text}",             "it is not after {text}",                      "give a later end"},
    {Msg::fromAfterEnd,   Exit::usage, "{option} {text}",             "it is after the end of {file} ({text})",      "give an earlier time"},
    {Msg::atAfterEnd,     Exit::usage, "--at {text}",                 "it is after the end of {file} ({text})",      "give an earlier time"},
    {Msg::toAfterEnd,     Exit::done,  "{option} {text}",             "it is after the end of {file} ({text})",      "stopped at the end"},
    {Msg::durationAfterEnd, Exit::done, "--duration {text}",          "from {text} it is after the end of {file} ({text})", "stopped at the end"},
    {Msg::noFrameBetween, Exit::usage, "can't take a part of {file}", "there is no frame between {text} and {text}", "take a longer part"},
    {Msg::durationNone,   Exit::usage, "--duration",                  "{name} is no length",                         "give more than 0"},
    // pictures
    {Msg::fitWrong,               Exit::usage,  "{option}",                         "{name} is not a box for the picture",                          "use WxH, WxH,bars or WxH,crop"},
    {Msg::fitFar,                 Exit::usage,  "--fit",                            "{name} is too far from the shape of the picture",              "give a box that is more like it"},
    {Msg::matrixWrong,            Exit::usage,  "--matrix",                         "{name} is not 601, 709, or IN:OUT of these",                   "use 601, 709 or 601:709"},
    {Msg::matrixNoYuv,            Exit::usage,  "--matrix",                         "neither the input nor the output is YUV",                      "leave it out, or choose a YUV format with --pixel"},
    {Msg::cropWrong,              Exit::usage,  "{option}",                         "{name} is not a part of a picture",                            "use WxH, WxH+X+Y or W:H"},
    {Msg::cropEmpty,              Exit::usage,  "--crop",                           "{name} leaves less than 4x4 pixels",                           "give a larger part"},
    {Msg::cropBeyond,             Exit::usage,  "--crop",                           "{name} is beyond the picture, which is {text}",                "give a part of it"},
    {Msg::cropColumns,            Exit::usage,  "--crop",                           "{name} splits pairs of pixels that share their colour",        "use an even width and X"},
    {Msg::cropRows,               Exit::usage,  "--crop",                           "{name} splits groups of lines that share their colour",        "use an even height, and a Y that is a multiple of {text}"},
    {Msg::cropRefused,            Exit::usage,  "{option}",                         "{name} can't be cut from this picture",                        "give another part"},
    {Msg::deinterlaceProgressive, Exit::usage,  "--deinterlace",                    "the input is progressive",                                     "for fields in a raw file give rate=25i or 25b in --raw"},
    {Msg::rateNotConverted,       Exit::usage,  "--rate",                           "{text} to {text} frames a second can't be converted",          "each may be above 0.1 and up to 120"},
    {Msg::styleAlone,             Exit::usage,  "--subtitle-style",                 "there are no subtitles",                                       "give them with --subtitles FILE"},
    {Msg::placeWrong,             Exit::usage,  "--logo {name}",                    "{name} is no place",                                           "use FILE@X,Y or FILE@X,Y,OPACITY with an opacity from 0 to 1"},
    {Msg::logoNoFile,             Exit::usage,  "--logo {name}",                    "it names no file",                                             "use FILE@X,Y"},
    {Msg::logoBeyond,             Exit::usage,  "--logo {name}",                    "it is beyond the picture, which is {text}",                    "give a place in the picture"},
    {Msg::logoNoPicture,          Exit::input,  "--logo: can't use {file}",         "it holds no picture that can be read",                         "give a PNG or a file with moving pictures"},
    {Msg::fontWrong,              Exit::input,  "{option}: can't use {file}",       "it is no font",                                                "give a TrueType or OpenType font"},
    {Msg::dropFrameNone,          Exit::usage,  "{option}",                         "{name} is drop frame, which {text} frames a second don't have", "use ':' in place of ';'"},
    {Msg::frameTooLarge,          Exit::usage,  "{option}",                         "a frame of {text} is too large for the memory or this format", "give a smaller size"},
    {Msg::sheetFailed,            Exit::failed, "--sheet",                          "a picture can't be scaled: {system}",                          "give another sheet"},
    {Msg::pictureName,            Exit::usage,  "{option} {file}",                    "a picture is a .png file",                                     "give a name that ends in .png"},
    {Msg::pictureFailed,          Exit::failed, "can't make the picture of {file}", "{system}",                                                     "choose another --at or --size; --log FILE keeps the details"},
    // sound
    {Msg::mapWrong,        Exit::usage,  "--map",                                               "{name} is no list of channels",                                         "use as 1,0 or 0+1,-,a:1.0"},
    {Msg::mapLong,         Exit::usage,  "--map",                                               "it asks for {text} than the {text} that can be made",                   "give fewer"},
    {Msg::mapSounds,       Exit::usage,  "--map",                                               "sound {text} has another rate ({text} Hz) than sound {text} ({text} Hz)", "convert one of them first, with --samplerate"},
    {Msg::mapNoTask,       Exit::usage,  "--save-task", "a task has no place for --map with channels of several sounds", "take the channels of one of them"},
    {Msg::mapSoundNone,    Exit::usage,  "--map",                                               "it takes sound {text}, and the last one is {text}",                     "sounds count from 0"},
    {Msg::mapChannelNone,  Exit::usage,  "--map",                                               "it takes channel {text}, and the last one of {file} is {text}",         "channels count from 0"},
    {Msg::volumeSoundNone, Exit::usage,  "--volume a:{text}",                                   "the last sound of the output is {text}",                                 "sounds count from 0"},
    {Msg::channelsMix,     Exit::usage,  "--channels",                                          "{text} channels to {text} would mix more than {text} into one",         "choose channels with --map"},
    {Msg::soundChannels,   Exit::usage,  "{option}",                                            "the sound of {file} has {text} channels, and this works on {text}",     "take fewer with --channels or --map"},
    {Msg::effectNoSound,   Exit::usage,  "{option}",                                            "this job has no sound",                                                 "leave it out"},
    {Msg::delayLong,       Exit::usage,  "--delay",                                             "{name} is more than an hour",                                           "give less"},
    {Msg::delayAll,        Exit::usage,  "--delay",                                             "nothing of the sound of {file} is left",                                "give less"},
    {Msg::rateQualityNone, Exit::done,   "the rate of {file} is converted in plain quality",     "this installation was built without the better one",                    ""},
    {Msg::endsNoSound,     Exit::usage,  "{option}",                                            "this job has not both a picture and a sound",                           "leave it out"},
    {Msg::soundEndsFirst,  Exit::usage,  "--shortest",                                          "the sound of {file} ends within the first frame of the picture",        "leave it out"},
    {Msg::soundCut,        Exit::done,   "the sound of {file} is cut",                          "it lasts {text}, and the picture {text}",                               "--longest keeps all of it"},
    {Msg::soundFilled,     Exit::done,   "the sound of {file} is followed by silence",          "it lasts {text}, and the picture {text}",                               "--shortest ends the picture with it"},
    {Msg::soundClipped,    Exit::done,   "audio stream {text} of {file} is clipped",            "{text} of its samples were beyond full scale",                          "lower it with --volume or --normalize"},
    {Msg::loudnessNoSound, Exit::input,  "{file} has no sound",                                 "there is nothing to measure",                                           "'tarsel info' shows what it holds"},
    {Msg::loudnessFailed,  Exit::input,  "can't measure {file}",                                "audio stream {text}: {system}",                                         "check the file"},
    // mixes
    {Msg::mixInput,   Exit::input, "can't open {file}",  "{system}",                               "check the files that it names"},
    {Msg::mixSources, Exit::input, "{option}",           "{system}",                               "'tarsel info' shows what a file holds"},
    {Msg::mixNone,    Exit::input, "can't open {file}",  "it holds no mix of sounds",              "'tarsel mix' makes one"},
    {Msg::mixWrong,   Exit::usage, "{option}",           "{name} is no channel of a mix",          "give POSITION=FILE, as L=a.wav, L=a.wav:1*0.5 or L=a.wav+b.wav:0.1"},
    {Msg::mixName,    Exit::usage, "can't write {file}", "a mix is a file in .mmf",                "give it a name in .mmf"},
    {Msg::mixNothing, Exit::usage, "{option}",           "without it there is nothing to mix",     "give --ch POSITION=FILE for each channel, or a file in .mmf"},
    {Msg::mixWeightRounded, Exit::done, "{file} keeps weights with three decimals", "{text} became {text}", ""},
    // the standard input
    {Msg::stdinNotTaken,   Exit::usage,  "can't open {file}",                     "this command does not read the standard input",                    "give the name of a file; 'tarsel transcode' and 'tarsel info' take -"},
    {Msg::stdinNoFormat,   Exit::usage,  "can't open {file}",                     "the standard input has no extension that says what it holds",      "give it, as in --input-format wav"},
    {Msg::stdinUnused,     Exit::usage,  "--input-format",                        "it describes the standard input, and no input is -",               "leave it out"},
    {Msg::stdinTwice,      Exit::usage,  "can't open {file} twice",               "the standard input is one input",                                  "name it once"},
    {Msg::stdinRefuses,    Exit::usage,  "{option}",                              "it needs inputs with names, and the standard input has none",      "write it into a file first"},
    {Msg::streamReadTwice, Exit::usage,  "{option}",                              "it reads the pictures twice, and the standard input can be read once", "write it into a file first, or leave the option out"},
    {Msg::stdinIsDocument, Exit::usage,  "{option}",                              "such a file names others, seen from the folder that it is in",     "give the file by its name"},
    {Msg::stdinClosed,     Exit::input,  "can't open {file}",                     "the standard input is closed",                                     "send a file into it"},
    {Msg::stdinIsTerminal, Exit::usage,  "can't open {file}",                     "the standard input is a terminal",                                 "send a file into it, or the output of another program"},
    {Msg::stdinNotKept,    Exit::output, "can't keep the standard input in {file}", "{text}",                                                         "{text}"},
    {Msg::stdinNoSpace,    Exit::output, "can't keep the standard input in {file}", "{text} are free there",                                          "make room, or name another folder in TMPDIR"},
    // views and clips
    {Msg::viewNone,    Exit::input, "can't open {file}",  "it holds no views",                   "'tarsel views' makes one that does"},
    {Msg::viewName,    Exit::usage, "can't write {file}", "views are a file in .mmf or .mvf",    "give it a name in .mmf or .mvf"},
    {Msg::viewNothing, Exit::usage, "{option}",           "without it there is nothing to show", "give --view FILE for each view, or a file in .mmf"},
    {Msg::cardInput,   Exit::input, "can't open {file}",  "{system}",                            "check the clips of the card"},
    // comparing
    {Msg::compareSizes,       Exit::usage,  "{file} and {file} can't be compared",   "their pictures are {text} and {text}",               "convert one with 'tarsel transcode --size'"},
    {Msg::compareNothing,     Exit::usage,  "{file} and {file} can't be compared",   "no picture of one has a counterpart in the other",   "give another --offset"},
    {Msg::compareFailed,      Exit::failed, "{file} can't be measured",              "{system}",                                           "--log FILE keeps the details"},
    {Msg::comparePsnr,        Exit::check,  "{file} failed its check",               "the mean PSNR is {text} dB, below {text}",           "'tarsel compare' without --min-psnr shows the worst pictures"},
    {Msg::compareLength,      Exit::check,  "{file} failed its check",               "{text} of its pictures have no counterpart",         "give another --offset, or compare without --min-psnr"},
    {Msg::compareLengthNoted, Exit::done,   "{file}",                                "{text} of its pictures have no counterpart",         "they were left out"},
    // filters and modules
    {Msg::filterUnknown,     Exit::module, "--filter",                               "there is no filter {name}",                             "{hint}'tarsel modules' lists all"},
    {Msg::filterNoStream,    Exit::usage,  "--filter {text}",                        "this job has no {text}",                                "leave it out"},
    {Msg::filterNotDivided,  Exit::usage,  "--filter {text}",                     "it would begin anew in each segment",                          "leave it out, and filter the joined output in a second run"},
    {Msg::filterChannels,    Exit::usage,  "--filter {text}",                        "the sound has {text} channels, and it works on {text}", "take fewer with --channels"},
    {Msg::effectNoPicture,   Exit::usage,  "{option}",                               "this job has no picture",                               "leave it out"},
    {Msg::filterPlaceTaken,  Exit::usage,  "--filter {text}",                        "its one place in the chain is taken by another option", "leave one out"},
    {Msg::filterFileMissing, Exit::usage,  "--filter {text}",                        "it writes a file, and none is named",                   "give it with filename=FILE"},
    {Msg::filterRefused,     Exit::usage,  "--filter {text}",                        "it can't be used: {system}",                            "change its values, see 'tarsel modules'"},
    {Msg::filterFileRefused, Exit::input,  "the filter {name} can't use {file}",     "{system}",                                              "check what the file holds"},
    {Msg::filterFailed,      Exit::failed, "the filter {name} failed",               "{system}",                                              "leave it out, or change its values"},
    {Msg::filterWriteFailed, Exit::output, "the filter {name} can't write {file}",   "{text}",                                                "{text}"},
    {Msg::filterWritesFile,  Exit::usage,  "--filter {text}",                        "it writes a file, and single pictures are no run",      "use it with 'tarsel transcode'"},
    {Msg::chainRefused,      Exit::module, "the filters can't be used",              "{system}",                                              "'tarsel modules' lists what this installation has"},
    {Msg::parameterUnknown,  Exit::usage,  "{option}",                               "{text} has no parameter {name}",                        "{hint}'tarsel modules {text}' lists all"},
    {Msg::parameterRefused,  Exit::usage,  "{option}",                               "{name} can't take this value: {system}",                "give another value"},
    {Msg::moduleUnknown,     Exit::module, "there is no module {name}",              "this installation has none of this name and kind",      "{hint}'tarsel modules' lists all"},
    {Msg::moduleUnusable,    Exit::module, "the module {name} can't be used",        "this installation lacks what does its work",            "leave out what needs it"},
    {Msg::muxerUnknown,      Exit::module, "--muxer",                                "there is no multiplexer {name} for this tool",          "{hint}use rawmux, rawavimux or nullmux"},
    {Msg::muxerOther,        Exit::usage,  "--muxer {text}",                         "{file} is written by {text}",                           "leave it out, or give -o or --format another format"},
    {Msg::muxerUnusable,     Exit::module, "the multiplexer {name} can't be used",   "{system}",                                              "'tarsel modules' lists what this installation has"},
    // presets
    {Msg::presetUnknown,     Exit::usage,  "there is no preset {name}",              "neither its name nor its symbol is known",              "{hint}'tarsel presets list --all' lists all"},
    {Msg::presetWaits,       Exit::module, "the preset {name} can't be used",        "it waits for one of these modules: {text}",             "load the plug-in that has it with --plugins"},
    {Msg::presetBuiltin,     Exit::usage,  "the preset {name} can't be changed",     "it is built in",                                        "save one of your own with 'tarsel presets save'"},
    {Msg::presetInvalid,     Exit::module, "the preset {name} can't be used",        "{system}",                                              "'tarsel presets check' lists what is wrong with your presets"},
    {Msg::presetMuxer,       Exit::usage,  "--muxer {text}",                         "the preset {name} does not go with it",                 "use one of {text}, or leave it out"},
    {Msg::presetNoStream,    Exit::usage,  "the preset {name} takes no further {text} stream", "{system}",                                    "leave streams out with --no-video, --no-audio or --map"},
    {Msg::presetEmpty,       Exit::usage,  "the preset {name} has neither picture nor sound", "there is nothing to write into {file}",         "'tarsel presets show' shows what it has; use another one"},
    {Msg::presetRange,       Exit::usage,  "{option}",                               "{text} takes {text}",                                   "give one of these, or use --match to fit the output to the input"},
    {Msg::presetOutput,      Exit::usage,  "-o {file}",                              "its name means a format that the preset {name} does not write", "give it another extension, or another preset"},
    {Msg::outputNoPreset,    Exit::module, "-o {file}",                              "{text}",                                                "'tarsel presets list --all' lists what it waits for; or write .avi, .png, .wav or a raw format such as .yuv"},
    {Msg::matchNoPreset,     Exit::usage,  "--match",                                "it fits a preset to the input, and there is no preset", "give --preset"},
    {Msg::presetNameWrong,   Exit::usage,  "the name {name} can't be given",         "a preset's name is a text of one line, of 200 bytes at most, without blanks at its ends", "give another name"},
    {Msg::presetNameTaken,   Exit::usage,  "the name {name} can't be given",         "the built-in preset {name} has it",                     "give another name"},
    {Msg::presetExists,      Exit::usage,  "there is a preset {name}",               "one of your presets has this name",                     "give another name, or --overwrite to replace it"},
    {Msg::presetWords,       Exit::usage,  "presets {option}",                       "it takes {text}",                                       "see 'tarsel presets --help'"},
    {Msg::presetsDamaged,    Exit::input,  "{file} is no sound file of presets",     "{system}",                                              "correct or remove it, or import another one"},
    {Msg::presetsNotWritten, Exit::output, "can't change {file}",                    "{text}",                                                "{text}"},
    {Msg::presetLeavesOut,   Exit::done,   "the preset {name} has no {text}",        "that of the inputs is left out",                        ""},
    {Msg::presetCommandLeft, Exit::done,   "the preset {name} has a command for afterwards", "it was not run",                               "give it as --post to run it: {file}"},
    {Msg::presetsInvalid,    Exit::module, "not all presets of {file} can be used", "{text} of them are faulty, or need what is not installed", "load their plug-ins with --plugins, or remove them"},
    // encoders
    {Msg::codecUnknown,      Exit::module, "{option}",                               "there is no codec or encoder {name}",                   "{hint}'tarsel modules' lists the encoders"},
    {Msg::codecMissing,      Exit::module, "{option} {name}",                        "the encoder {text} is not installed",                   "load the plug-in that has it with --plugins"},
    {Msg::codecNoneSet,      Exit::usage,  "{option} none",                          "what is left out has no settings",                      "leave them out, or name a codec"},
    {Msg::codecFormat,       Exit::usage,  "{option} {name}",                        "{file} holds {text}",                                   "give the output another extension, or leave the option out"},
    {Msg::codecMuxer,        Exit::usage,  "{option} {name}",                        "{text}, which writes {file}, does not take it",         "give the output another extension, or use one of: {text}"},
    {Msg::codecPreset,       Exit::usage,  "{option} {name}",                        "the preset {name} does not go with it",                 "use one of {text}, or leave --preset out"},
    {Msg::codecsApart,       Exit::usage,  "-o {file}",                              "no installed preset joins {text}",                      "'tarsel presets show NAME' shows what a preset joins"},
    {Msg::muxerMissing,      Exit::module, "-o {file}",                              "the multiplexer {text} is not installed",               "load the plug-in that has it with --plugins"},
    {Msg::encoderRaw,        Exit::usage,  "{option}",                               "the streams of {file} are raw, and no encoder has a quality to set", "leave it out, or choose an encoder with --vcodec, --acodec or --preset"},
    {Msg::encoderNoTwoPass,  Exit::usage,  "--two-pass",                             "the encoder {name} works in one pass",                  "leave it out, or choose another encoder with --vcodec"},
    {Msg::encoderNoStream,   Exit::usage,  "{option}",                               "the output has no {text}",                              "leave it out"},
    {Msg::bitrateWrong,      Exit::usage,  "{option}",                               "{name} is no bit rate",                                 "write 800k, 5M, or a number of bits a second"},
    {Msg::outputNoModule,    Exit::module, "can't write {file}",                     "this installation can't write any output",              "install the engine again"},
    {Msg::aviNoModule,       Exit::module, "can't write {file}",                     "this installation has no AVI output",                   "choose another format"},
    // captions
    {Msg::captionsForms,   Exit::usage, "{option}",                              "{option} asks for another form",                               "give one of them"},
    {Msg::captionsOneFile, Exit::usage, "{option}",                              "{file} is a second file, and the form holds the captions of one", "write each by itself"},
    {Msg::captionsNoForm,    Exit::usage, "-o {file}",                       "nothing says what to write",                                   "give --srt, --vtt, --scc or --json, or a name that ends so"},
    {Msg::captionsNotListed, Exit::usage, "can't list {file}",               "subtitles have no lines of captions",                          "give --srt, --vtt, --scc or --json"},
    {Msg::captionsRateUnlikely, Exit::done, "{file}",                        "the numbers of its frames suggest {text} a second, not {text}", "its times may be wrong"},
    {Msg::captionsLost,    Exit::done,  "{file}",                                "the times of {text} of its subtitles can't be read",           "they are left out"},
    {Msg::captionsLetters, Exit::done,  "captions can't show all letters",       "there are none for {name}",                                    "each became '?'"},
    {Msg::captionsCut,     Exit::done,  "captions hold four rows of 32 letters", "{text} of them are longer",                                    "their ends are left out"},
    {Msg::captionsLate,    Exit::done,  "captions take a frame for two letters", "there is too little time before {text} of them",               "they come up to {text} late"},
    // subtitles
    {Msg::subtitlesOtherFile,       Exit::input, "--subtitles: can't read {file}",                     "it is no subtitle file",                                "give a .srt or a .sub file of text"},
    {Msg::subtitlesNoText,          Exit::input, "--subtitles: can't read {file}",                     "it is no text",                                         "give a SubRip (.srt) or MicroDVD (.sub) file"},
    {Msg::subtitlesNone,            Exit::input, "--subtitles: {file} has no subtitles",               "nothing in it has the times of one",                    "--accept-partial goes without"},
    {Msg::subtitlesLost,            Exit::input, "--subtitles: {file} is damaged",                     "the times of {text} of {text} subtitles can't be read", "--accept-partial leaves these out"},
    {Msg::subtitlesNotInEncoding,   Exit::input, "--subtitles: {file} is in another encoding",         "line {text} is not valid",                              "name the right one with --subtitle-style encoding="},
    {Msg::subtitlesInOtherEncoding, Exit::input, "--subtitles: {file} is in another encoding",         "line {text} is not valid",                              "try --subtitle-style encoding={text}"},
    {Msg::subtitlesEncodingUnknown, Exit::input, "--subtitles: can't find out the encoding of {file}", "it is not UTF-8",                                       "name it, as in --subtitle-style encoding=windows-1252"},
    {Msg::noSuchFont,               Exit::usage, "{option}: there is no font {name}",                  "it is neither a file nor an installed family",          "{hint}'fc-list' lists the families"},
    {Msg::noSuchAlign,              Exit::usage, "{option}: there is no place {name}",                 "only the nine of the picture have names",               "use {text}"},
    {Msg::noMargin,                 Exit::usage, "{option}: {name} is no margin",                      "it is no length within the picture",                    "use pixels, or a part of the picture as 5%, less than half of it"},
    {Msg::noSwitch,                 Exit::usage, "{option}",                                           "{name} is neither on nor off",                          "use on or off"},
    // outputs
    {Msg::outputMissing,       Exit::usage,  "no output",                          "the result has no place to go to",                             "give its name with -o FILE"},
    {Msg::outputNameEmpty,     Exit::usage,  "{option}",                           "the name of the output is empty",                              "give a name"},
    {Msg::outputExists,        Exit::output, "can't write {file}",                 "it exists",                                                    "use -y to overwrite it"},
    {Msg::outputKept,          Exit::done,   "left {file} as it is",               "it exists, and -n keeps what exists",                          ""},
    {Msg::outputIsInput,       Exit::output, "can't write {file}",                 "it is also an input",                                          "give the output another name"},
    {Msg::outputIsOutput,      Exit::output, "can't write {file}",                 "it is also the output of the job",                             "give one of them another name"},
    {Msg::outputTwice,         Exit::usage,  "can't write {file}",                 "two files of this job would have this name",                   "{text}"},
    {Msg::outputIsFolder,      Exit::output, "can't write {file}",                 "this is a folder",                                             "give the name of a file in it"},
    {Msg::outputBackslash,     Exit::output, "can't write {file}",                 "a backslash can't stand in the name of the folder",            "choose another folder"},
    {Msg::outputFolderInTheWay, Exit::output, "can't write {file}",                "a folder of this name is in the way",                          "move it away, or choose another name"},
    {Msg::outputFolderNone,    Exit::output, "can't write {file}",                 "{file} is no folder",                                          "check the name"},
    {Msg::outputFolderClosed,  Exit::output, "can't write {file}",                 "the folder {file} may not be written",                         "change its permissions, or choose another folder"},
    {Msg::outputFolderAbsent,  Exit::output, "can't write {file}",                 "the folder {file} does not exist",                             "make the folder first"},
    {Msg::outputFolderGone,    Exit::output, "can't write {file}",                 "its folder was removed while the job ran",                     "run it again"},
    {Msg::outputFormatUnknown, Exit::usage,  "-o {file}",                          "no output has the extension {name}",                           "write .avi, .png, .wav or a raw format such as .yuv, or give --format; 'tarsel formats' lists all{text}"},
    {Msg::outputFormatMissing, Exit::usage,  "-o {file}",                          "no extension says what to write",                              "name its format with --format, 'tarsel formats' lists all"},
    {Msg::outputNamesFolder,   Exit::output, "can't write {file}",                 "this is a folder",                                             "give the name of a file in it, such as {name}"},
    {Msg::formatUnknown,       Exit::usage,  "--format",                           "there is no format {name}",                                    "'tarsel formats' lists all{text}"},
    {Msg::outputNameSays,      Exit::usage,  "--pixel {text}",                     "{file} says {text}",                                           "use the extension {text}, or .raw for any format"},
    {Msg::outputNameOpen,      Exit::usage,  "-o {file}",                          ".{text} does not say the order of the bytes",                  "use {text}, or --format raw with --pixel"},
    {Msg::outputHoldsOne,      Exit::usage,  "can't write {file}",                 "it holds one {text}, and the inputs have {text}",              "number the files, as in -o {name}"},
    {Msg::outputTakesOne,      Exit::usage,  "can't write {file}",                 "this output takes one {text}, and the inputs have {text}",     "run the job for each"},
    {Msg::numberWrong,         Exit::usage,  "-o {file}",                          "{name} is no place for one number",                            "use %d or %04d once, and %% for a percent sign"},
    {Msg::numberNotStored,     Exit::usage,  "--save-task",                        "a task can't number names as {file} does",                     "give -o a name without a number"},
    {Msg::pictureNumbered,     Exit::usage,  "-o {file}",                          "it numbers pictures, and one is written",                      "give a name without %d"},
    {Msg::outputSystem,        Exit::output, "can't write {file}",                 "{text}",                                                       "{text}"},
    {Msg::outputRefused,       Exit::output, "can't write {file}",                 "{system}",                                                     "choose another name or format"},
    {Msg::outputNoStream,      Exit::output, "can't write {file}",                 "it takes no further {text}",                                   "give fewer inputs, or another format"},
    {Msg::outputChannels,      Exit::output, "can't write {file}",                 "it takes {text} channels, the input has {text}",               "give --channels"},
    {Msg::outputNoSpace,       Exit::output, "can't write {file}",                 "it needs {text}, the disk has {text} free",                    "free some space, or choose another disk"},
    {Msg::outputNotPlaced,     Exit::output, "can't write {file}",                 "{system}",                                                     "what was there before is unchanged"},
    {Msg::outputTorn,          Exit::output, "can't write {file}",                 "{system}, and the files that it replaces could not all be put back", "'tarsel recover {text}' finishes it when the reason is gone"},
    {Msg::outputNotSynced,     Exit::output, "can't write {file}",                 "the disk did not take it ({system})",                          "check the disk; what was there before is unchanged"},
    {Msg::logNotWritten,       Exit::output, "can't write the log {file}",         "{text}",                                                       "{text}"},
    {Msg::logIsOther,          Exit::output, "can't write the log {file}",         "{file} is another file of this command",                       "give the log another name"},
    {Msg::progressNoStream,    Exit::usage,  "{option}",                           "there is no descriptor {text} that can be written to",         "open one, as in 3>FILE, or give a file"},
    {Msg::progressOverOther,   Exit::output, "--progress: can't write {file}",     "the job reads or writes it",                                   "give the objects a file of their own"},
    {Msg::progressLost,        Exit::done,   "--progress: objects were lost",      "{text}: {text}",                                               ""},
    {Msg::standardOutput,      Exit::output, "can't write to the standard output", "{text}",                                                       "{text}"},
    // work folders and what ended runs left in them
    {Msg::setCompleted,       Exit::done,   "completed what an ended run had begun", "{text} in {file} are the new ones",                       ""},
    {Msg::setRestored,        Exit::done,   "took back what an ended run had begun", "{text} in {file} are the old ones",                       ""},
    {Msg::leftRemoved,        Exit::done,   "removed what an ended run left",        "{text}, {text}",                                          ""},
    {Msg::workInUse,          Exit::done,   "left {file} alone",                     "the run that writes there is at work",                    ""},
    {Msg::workNotOurs,        Exit::failed, "left {file} alone",                     "it belongs to another user, or others may write into it", "its owner can recover it"},
    {Msg::workElsewhere,      Exit::failed, "left {file} alone",                     "a run on the host {name} may be at work there",           "when that run has ended, 'tarsel recover {text}' removes it"},
    {Msg::workOwnerless,      Exit::failed, "left {file} alone",                     "it does not say which run it belongs to",                 "when no run is at work there, 'tarsel recover {text}' removes it"},
    {Msg::manifestUnreadable, Exit::failed, "left {file} alone",                     "its manifest is damaged",                                 "look for files to keep in it, then remove it"},
    {Msg::setInTheWay,        Exit::failed, "can't finish {file}",                   "{file} exists and is not of that run",                    "move it away, then use 'tarsel recover {text}'"},
    {Msg::workStays,          Exit::failed, "can't remove {file}",                   "{system}",                                                "remove it by hand, or try 'tarsel recover' later"},
    {Msg::recoverNoFolder,    Exit::usage,  "can't recover {file}",                  "{system}",                                                "give the folder that the outputs are in"},
    {Msg::recoverUnfinished,  Exit::failed, "can't recover all of {file}",           "{text} stayed",                                           "do what the lines before say"},
    {Msg::staleNoAge,         Exit::usage,  "can't use --stale {name}",              "this is no age",                                          "use 90s, 90m, 12h, 30d or never"},
    // outputs that are streams
    {Msg::streamIsSocket,    Exit::output, "can't write {file}",               "it is a socket, which can't be opened like a file", "use -o - and pipe it into a program that connects"},
    {Msg::planAndTask,       Exit::usage,  "--save-task {file}",               "the plan of --dry-run goes there too", "give the task file a name"},
    {Msg::streamClosed,      Exit::output, "can't write {file}",               "the standard output is closed",     "redirect it to a file or a pipe"},
    {Msg::streamToTerminal,  Exit::usage,  "can't write {file}",               "the standard output is a terminal", "redirect it to a file or a pipe"},
    {Msg::streamNeedsFormat, Exit::usage,  "-o -",                             "no extension says what to write",   "name it, with --format wav or --format raw"},
    {Msg::streamOfFiles,     Exit::usage,  "can't write {file}",               "{text} can't be a stream",          "raw pictures and WAV can, with --format raw or --format wav"},
    {Msg::streamOfChannels,  Exit::usage,  "--split-channels",                 "{file} takes one stream",           "give -o the name of a file"},
    {Msg::streamReaderGone,  Exit::output, "can't write {file}",               "the reader has closed the pipe",    "it has a part of the output"},
    {Msg::streamShort,       Exit::check,  "{file} is not what was asked for", "it took {text} of {text} bytes",    "do not use what it has"},
    // plug-ins; most are warnings, and the reason ends a sentence that begins with the file
    {Msg::pluginsNoFolder,  Exit::module, "no plug-ins were loaded from {file}",                      "{text}",                                "check its name and permissions"},
    {Msg::pluginsAbsent,    Exit::module, "no plug-ins were loaded from {file}",                      "no file '*_plugin.so' was found there", "check the folder's name"},
    {Msg::pluginsUnsafe,    Exit::module, "{text} plug-ins of {file} were not loaded",                "each {system}",                         "keep plug-ins where only you and root may write, or use --allow-unsafe-plugins"},
    {Msg::pluginUnreadable, Exit::module, "the plug-in {file} was not loaded",                        "it {system}",                           "check the file and its permissions, or remove it"},
    {Msg::pluginUnsafe,     Exit::module, "the plug-in {file} was not loaded",                        "it {system}",                           "keep plug-ins where only you and root may write, or use --allow-unsafe-plugins"},
    {Msg::pluginInvalid,    Exit::module, "the plug-in {file} was not loaded",                        "it {system}",                           "replace it by a whole one for this machine, or remove it"},
    {Msg::pluginUnresolved, Exit::module, "the plug-in {file} was not loaded",                        "it {system}",                           "install what it needs, put it next to the plug-in, or remove the plug-in"},
    {Msg::pluginUnfit,      Exit::module, "the plug-in {file} was not loaded",                        "it {system}",                           "get a version of it that was built for this engine, or remove it"},
    {Msg::pluginForeign,    Exit::module, "the plug-in {file} was not loaded",                        "it {system}",                           "get one built for this version of the engine, or add the library that has it"},
    {Msg::pluginFailed,     Exit::module, "the plug-in {file} was not loaded",                        "it {system}",                           "ask its maker, or remove it"},
    {Msg::pluginEndedAll,   Exit::module, "the plug-in {file} ended the program while it was loaded", "{text}",                                "remove it, or get another version of it"},
    // batches
    {Msg::childNotStarted,     Exit::failed, "can't start {file}",                    "{text}",                                                    "{text}"},
    {Msg::batchRuns,           Exit::failed, "can't run {file}",                      "process {text} on {text} runs it",                          "wait for it, or stop that one"},
    {Msg::batchUnreadable,     Exit::input,  "{file} is no list of tasks",            "{system}",                                                  "check the name, or make a list with 'tarsel batch LIST new'"},
    {Msg::batchExists,         Exit::output, "can't make {file}",                     "it exists",                                                 "give -y to empty it, or another name"},
    {Msg::batchNotWritten,     Exit::output, "can't write the list {file}",           "{text}",                                                    "{text}"},
    {Msg::batchNoTask,         Exit::usage,  "{file} has no task {name}",             "it has {text}",                                             "'tarsel batch LIST list' shows their numbers and names"},
    {Msg::batchIdShort,        Exit::usage,  "{file} has no task {name}",             "a name of a task has at least 8 digits",                    "'tarsel batch LIST list' shows all"},
    {Msg::batchIdOpen,         Exit::usage,  "{name} is not one task",                "several tasks of {file} begin so",                          "give more digits"},
    {Msg::batchTaskDamaged,    Exit::input,  "{file} is damaged",                     "{system}",                                                  "remove the task and add it again"},
    {Msg::batchOutputTwice,    Exit::usage,  "can't add {file}",                      "task {text} writes it",                                     "give another name, or remove that task"},
    {Msg::batchOutputStream,   Exit::usage,  "can't add {file}",                      "the standard output is none of a batch",                    "give -o the name of a file"},
    {Msg::batchNoFiles,        Exit::input,  "--files {name}",                        "there is no such file",                                     "check the pattern; in quotes, so that the shell leaves it as it is"},
    {Msg::batchFilesAndInputs, Exit::usage,  "--files",                               "INPUTs contradict it",                                      "give one of both"},
    {Msg::batchPatternNeeded,  Exit::usage,  "-o {name}",                             "all outputs would have one name",                           "write {text} where the name of the input is to stand"},
    {Msg::batchPatternKey,     Exit::usage,  "-o {name}",                             "{name} stands for nothing",                                 "use {text}"},
    {Msg::batchWords,          Exit::usage,  "{option}",                              "it has too few or too many words",                          "see 'tarsel batch LIST {text} --help'"},
    {Msg::batchPlace,          Exit::usage,  "{name} is no place in the list",        "it has {text}",                                             "give a number from 1 on"},
    {Msg::batchJobSaved,       Exit::usage,  "{option}",                              "it has no meaning for a task that is added",                "leave it out"},
    {Msg::batchWaits,          Exit::done,   "{file}",                                "task {text} makes it, so this task is planned when it runs", ""},
    {Msg::batchTaskElsewhere,  Exit::done,   "{file}",                                "process {text} on {text} runs the task",                    "it is waited for"},
    {Msg::batchInputFailed,    Exit::failed, "can't make {file}",                     "its input comes from task {text}, which is not done",       "run the batch again when that is solved"},
    {Msg::batchTaskKilled,     Exit::failed, "can't make {file}",                     "signal {text} ended the process of the task",               "see what 'tarsel --log stderr batch LIST run --task {text}' says"},
    {Msg::batchTaskTimeout,    Exit::failed, "can't make {file}",                     "it took longer than --timeout {text}",                      "give it more time"},
    {Msg::batchTaskFailed,     Exit::failed, "can't make {file}",                     "the process of the task ended with status {text}",          "see what 'tarsel batch LIST run --task {text}' says"},
    {Msg::batchTasksFailed,    Exit::failed, "{file} is not done",                    "{text} of {text} tasks failed",                             "the next run does what is left"},
    {Msg::batchTasksUnsound,   Exit::failed, "{file} can't be run as it is",          "{text} of {text} tasks are unsound",                        "correct or remove them"},
    {Msg::batchStopped,        Exit::interrupted, "stopped",                          "{text} of {text} tasks of {file} are done",                 "the next run does what is left"},
    {Msg::batchNotNoted,       Exit::done,   "{file}",                                "the journal can't be written ({text})",                     "the next run looks at the outputs again"},
    {Msg::batchEmpty,          Exit::input,  "can't run {file}",                      "it has no tasks",                                           "add some with 'tarsel batch LIST add'"},
    // watched folders
    {Msg::watchNoFolder,       Exit::input,  "can't watch {file}",                 "{text}",                                              "{text}"},
    {Msg::watchFolderMissing,  Exit::usage,  "--preset {name}",                    "no folder follows the colon",                         "write NAME:FOLDER, or NAME alone"},
    {Msg::watchOutputInside,   Exit::usage,  "can't write to {file}",              "it is in the watched folder, where outputs would be new inputs", "choose an output folder elsewhere"},
    {Msg::watchSameOutputs,    Exit::usage,  "can't write to {file}",              "two presets would write files of the same names there", "give one of them another folder"},
    {Msg::watchFolderIsOther,  Exit::usage,  "{option}",                           "{file} is the watched folder or one that outputs go to", "choose another folder"},
    {Msg::watchTwice,          Exit::failed, "can't keep what was done in {file}", "another 'tarsel watch' uses it",                      "stop that one, or give another file with --state"},
    {Msg::watchBegins,         Exit::done,   "watching {file}",                    "each file is taken when it is complete",             ""},
    {Msg::watchEnds,           Exit::done,   "done with {file}",                   "files: {text}",                                       ""},
    {Msg::watchMade,           Exit::done,   "made of {name}",                     "{name}{text}",                                        ""},
    {Msg::watchLeft,           Exit::done,   "left {name}",                        "{text}",                                              ""},
    {Msg::watchFailed,         Exit::done,   "failed with {name}",                 "{text}",                                              ""},
    {Msg::watchWaits,          Exit::done,   "waiting with {name}",                "{text}",                                              ""},
    {Msg::watchNotMade,        Exit::done,   "nothing made of {name}",             "{text}",                                              ""},
    {Msg::watchOutputOfOther,  Exit::output, "can't write {file}",                 "it was made of {name}, which has the same name but for the extension", "move it away, or rename the input"},
    {Msg::watchChanged,        Exit::input,  "can't put {file} away",              "it has changed or is being written",                  "it is looked at again"},
    {Msg::watchRunCrashed,     Exit::failed, "the transcode was ended",            "signal {text} ended its process",                     "report it, with the input, if nobody sent that"},
    {Msg::watchRunSilent,      Exit::failed, "the transcode failed",               "its process said no more than status {text}",         "run it by hand with 'tarsel transcode'"},
    {Msg::watchSomeFailed,     Exit::failed, "not all of {file} was made",         "files without their outputs: {text}, files done: {text}", "see the lines before"},
    {Msg::watchStopped,        Exit::failed, "stopped",                            "files done: {text}, failed: {text}",                  "what had begun is made again the next time"},
    {Msg::reportKindUnknown,   Exit::usage,  "--report {file}",                    "its extension says no kind of report",                "write .html or .json"},
    // how a run ends
    {Msg::warningsCount,     Exit::failed, "can't make {file}",                        "with --strict a warning is a failure, and the job had {text}", "change what it warns of, or leave out --strict"},
    {Msg::linkFailed,        Exit::failed, "can't connect {file} to the output",       "its format does not fit the output's",                         "choose another format with --format or --pixel"},
    {Msg::jobFailed,         Exit::failed, "can't make {file}",                        "{system}",                                                     "choose another format or other options; --log FILE keeps the details"},
    {Msg::runOutOfMemory,    Exit::failed, "can't make {file}",                        "out of memory",                                                "free some memory, or use smaller pictures"},
    {Msg::runHasNoThread,    Exit::failed, "can't make {file}",                        "no thread could be started",                                   "end other programs, or raise the limits (ulimit -u, ulimit -v)"},
    {Msg::toolHasNoThread,   Exit::failed, "can't start",                              "no thread could be started",                                   "end other programs, or raise the limits (ulimit -u, ulimit -v)"},
    {Msg::runBroken,         Exit::failed, "can't make {file}",                        "a fault of this program",                                      "please report it with the file that --log FILE writes"},
    {Msg::inputShrank,       Exit::input,  "can't use {file}",                         "it became shorter while it was read, {text} of {text} bytes are left", "--accept-partial takes what is there"},
    {Msg::inputShrankTaken,  Exit::done,   "{file} became shorter while it was read",  "the job was run again with the {text} of {text} bytes that are left", ""},
    {Msg::inputChanged,      Exit::input,  "can't use {file}",                   "it changed while it was read",                         "run it again when nobody writes it"},
    {Msg::outputUnreadable,  Exit::check,  "{file} failed its check",                  "it can't be read back",                                        "it was discarded, run it again"},
    {Msg::outputDiffers,     Exit::check,  "{file} failed its check",                  "it has {text} {text} in place of {text}",                      "it was discarded, run it again"},
    {Msg::stopping,          Exit::done,   "stopping",                                 "",                                                             "a second signal ends it at once"},
    {Msg::stopped,           Exit::interrupted, "stopped",                             "a signal ended the command",                                   "run it again for its result"},
    {Msg::stoppedWithNothing, Exit::interrupted, "stopped",                            "a signal ended the job",                                       "no output was written"},
    {Msg::stoppedWithPart,   Exit::interrupted, "stopped",                             "a signal ended the job",                                       "{file} has a part of the output"},
    {Msg::stoppedBeforePost, Exit::failed, "stopped before the command of --post ran", "{file} is complete",                                           "run the command yourself if you want it"},
    {Msg::stoppedInPost,     Exit::failed, "stopped in the command of --post",         "it got the signal and has ended",                              "{file} is complete"},
    {Msg::postRuns,          Exit::done,   "the command of --post is running",         "",                                                             ""},
    {Msg::postNotRun,        Exit::failed, "--post",                                   "the command can't be run",                                     "check it; {file} is complete"},
    {Msg::postFailed,        Exit::failed, "--post",                                   "the command ended with status {text}",                         "check it; {file} is complete"},
    {Msg::taskFailed,        Exit::failed, "can't make the task file {file}",          "this job can't be stored",                                     "leave out --save-task, or choose other options"},
    {Msg::doneUnsaid,        Exit::done,   "done",                                     "there was no memory to say more",                              ""},
    {Msg::engineWarns,       Exit::done,   "{system}",                                 "",                                                             ""},
    {Msg::outOfMemory,       Exit::failed, "out of memory",                            "the job needs more of it than there is",                       "use smaller pictures, or end other programs"},
    {Msg::pathFailed,        Exit::output, "can't use {file}",                         "{text}",                                                       "{text}"},
    {Msg::systemFailed,      Exit::failed, "the system refuses a call",                "{text}",                                                       "{text}"},
    {Msg::engineFailed,      Exit::failed, "the command failed",                       "a fault of this program",                                      "please report it with the file that --log FILE writes"},
};
// clang-format on

constexpr bool inOrder() {
    for (size_t i = 0; i < std::size(kMessages); ++i)
        if (kMessages[i].id != static_cast<Msg>(i)) return false;
    return std::size(kMessages) == static_cast<size_t>(Msg::count);
}
static_assert(inOrder());

// " Did you mean 'a'?" within a sentence.
std::string hint(std::string_view suggested) {
    return suggested.empty() ? "" : "d" + std::string(suggested.substr(2)) + " ";
}

std::string shown(std::string_view placeholder, std::string_view value) {
    if (placeholder == "file" || placeholder == "name") return inQuotes(value);
    if (placeholder == "hint") return hint(value);
    return placeholder == "system" ? inLine(std::string(value)) : std::string(value);
}

using Values = std::initializer_list<std::string_view>;

// `text` with its placeholders filled from `value` on.
std::string filled(std::string_view text, Values::iterator& value, Values::iterator end) {
    std::string line;
    for (size_t at = 0; at < text.size();) {
        const size_t open = text.find('{', at);
        line += text.substr(at, open - at);
        if (open == std::string_view::npos) break;
        const size_t close = text.find('}', open);
        assert(value != end);
        line += shown(text.substr(open + 1, close - open - 1), value == end ? "" : *value++);
        at = close + 1;
    }
    return line;
}

}  // namespace

std::span<const Message> messages() { return kMessages; }

std::string lineOf(Msg id, Values values) {
    const Message& row = kMessages[static_cast<size_t>(id)];
    auto value = values.begin();
    std::string line = filled(row.what, value, values.end());
    if (*row.why) line += ": " + filled(row.why, value, values.end());
    if (*row.remedy) line += "; " + filled(row.remedy, value, values.end());
    assert(value == values.end());
    return line;
}

Failure failure(Msg id, Values values) {
    return {kMessages[static_cast<size_t>(id)].exit, lineOf(id, values)};
}

Failure systemFailure(Msg id, std::string_view file, int error) {
    const SystemCause cause = causeOf(error);
    return failure(id, {file, cause.why, cause.remedy});
}

Failure writeFailure(std::string_view file, std::string_view sentence) {
    if (const auto cause = causeIn(sentence))
        return failure(Msg::outputSystem, {file, cause->why, cause->remedy});
    return failure(Msg::outputRefused, {file, sentence});
}
