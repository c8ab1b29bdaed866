// The results of `int` operations. The numbers are fixed: applications and stored states rely on them.
#pragma once

namespace QvStatus {

constexpr int ok = 0;
constexpr int failed = -1;  // general failure, with a text in the object that failed
constexpr int pluginNotLoaded = -2;
constexpr int outOfMemory = -3;
constexpr int endOfStream = -4;
constexpr int invalidParam = -5;       // unknown parameter while exceptions are off, or a value it can't take
constexpr int noStream = -6;           // no stream possible
constexpr int postProcessFailed = -8;  // post-process of a watched file
constexpr int cannotParse = -9;        // no file, or its contents can't be parsed
constexpr int notSupported = -10;      // an operation that the stream does not have
constexpr int notLegal = -11;          // task not legal
constexpr int invalidArgument = -12;
constexpr int invalidStructure = -13;
constexpr int noSegment = -15;     // no input segment open
constexpr int warning = -16;       // the run continues
constexpr int notCreated = -17;    // a part of a run could not be made
constexpr int illegalState = -18;  // illegal state, or not opened
constexpr int needsInput = -19;    // the pipe needs input
constexpr int notEnoughViews = -20;

}  // namespace QvStatus
