// Bufstream: a class as the implementation of a bufstream record.
#pragma once

#include "core/arch/api.h"
#include "core/stream/bufstream.h"

// Each function of the record calls the virtual operation of the same role. The last ones have bodies that
// fail an assertion: a record whose kernel calls them must have an implementation of them.
class QV_API Bufstream {
  public:
    Bufstream();
    Bufstream(const Bufstream&) = delete;
    Bufstream& operator=(const Bufstream&) = delete;

    // Fills the record; called by the maker of the object. 0 or a status.
    virtual int init();
    virtual unsigned usable() = 0;
    virtual unsigned char* request(unsigned n) = 0;
    virtual unsigned confirm(unsigned n) = 0;
    virtual unsigned copybytes(unsigned char* p, unsigned n) = 0;
    virtual unsigned chunksize() = 0;
    virtual unsigned auxinfo(unsigned offset, unsigned id, void* info, unsigned size);
    virtual unsigned split();
    virtual void done(int abort);
    virtual void free();
    virtual unsigned state();
    virtual ~Bufstream();

    bufstream* record() { return &m_bs; }

  private:
    bufstream m_bs;
};
