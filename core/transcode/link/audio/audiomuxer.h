// Computes which input channels feed which output channel, from the layouts of the two codecs.
#pragma once

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvAudioEncoder;
class QvDecodePipe;

class QV_API AudioMuxer {
  public:
    // A matrix (may be null) needs one entry an output channel; without it the pass-through connections of
    // the two codecs are used. A negative stream is the first selected audio stream of the decoder. 0, or -1
    // with an error in the log.
    int init(QvDecodePipe* decoder, QvAudioEncoder* encoder, int outChannels, const AnyVector* matrix,
             int stream);

    // An output channel that does not exist is an error in the log and changes nothing.
    void connect(int inChannel, int outChannel);
    void disconnect(int inChannel, int outChannel);
    bool isConnected(int inChannel, int outChannel) const;
    AnyVector connectedTo(int outChannel) const;  // input channel numbers
    int nrOutChannels() const { return outChannels_; }
    void setPassthrough();
    // Copies the matrix: per output channel a vector of dictionaries with "channel".
    void store(AnyVector& matrix) const { matrix = matrix_; }

  private:
    int decStream_ = -1;
    int inChannels_ = 0;
    int outChannels_ = 0;
    AnyVector matrix_;
    QvDecodePipe* decoder_ = nullptr;
    QvAudioEncoder* encoder_ = nullptr;
    Any decCodec_;
    Any encName_;
};
