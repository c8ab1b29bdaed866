// The makers of the built-in codecs, one line for each module that exists.
//
// A module lives in builtin/KIND/NAME.{h,cpp}, which defines its maker: it returns a new codec without a
// module, which the caller owns. A new module is that unit, a line here, and the maker in its row.
#pragma once

class QvCodec;

QvCodec* newMeminput();
QvCodec* newRawdec();
QvCodec* newTestgen();
QvCodec* newSubimport();
QvCodec* newWavdec();
QvCodec* newAumixdec();
QvCodec* newMvmetadec();
QvCodec* newP2dec();
QvCodec* newSccdec();
QvCodec* newFilesink();
QvCodec* newNullsink();
QvCodec* newDummyaenc();
QvCodec* newRawmux();
QvCodec* newRawvenc();
QvCodec* newRawaenc();
QvCodec* newRawavimux();
QvCodec* newNullmux();
QvCodec* newMemmux();
QvCodec* newMemsink();
QvCodec* newVprocess();
QvCodec* newMvprocess();
QvCodec* newAprocess();
QvCodec* newEncpipe();
QvCodec* newScaler();
QvCodec* newDeinterlace();
QvCodec* newFlipper();
QvCodec* newLogo();
QvCodec* newAnimatedlogo();
QvCodec* newCropper();
QvCodec* newBrightness();
QvCodec* newVideofade();
QvCodec* newRawdump();
QvCodec* newUserdata();
QvCodec* newTimecode();
QvCodec* newSubtitle();
QvCodec* newFrconvert();
QvCodec* newBobber();
QvCodec* newSrconvert();
QvCodec* newChconvert();
QvCodec* newAquant();
QvCodec* newAvol();
QvCodec* newAdelay();
QvCodec* newDynamics();
QvCodec* newAudiolevel();
QvCodec* newPanning();
QvCodec* newNormalizer();
