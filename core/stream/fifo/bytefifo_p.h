// The ring of bytes of FIFOs and memory outputs.
//
//     0 ........ start .................................. end
//     | headroom | ring proper                            |
//                       read --data--> write
//
// A block that would run over the end is handed out in one piece: its part before the end stands at the end
// of the headroom. A written block is moved from there when it is committed, one to be read is copied there
// first.
#pragma once

#include <memory>

struct bytefifo {
    unsigned char* base;  // owned
    unsigned bytes;       // allocated
    unsigned unit;        // 1
    unsigned start;       // first index of the ring proper; the headroom's size
    unsigned read;        // may lie in the headroom after a read request over the end
    unsigned write;       // start to end
    unsigned end;
    unsigned requested;  // where the latest write request's block is; 0 if it was refused

    // Null if `size` is below `chunk`, or there is no memory. The largest block has chunk - 1 bytes.
    static std::unique_ptr<bytefifo> make(unsigned size, unsigned chunk);
    ~bytefifo();
    bytefifo(const bytefifo&) = delete;
    bytefifo& operator=(const bytefifo&) = delete;

    unsigned room() const {
        if (write < read) return read - write;
        return end - write + (read > start ? read - start : 0);
    }
    unsigned data() const { return write >= read ? write - read : end - start - read + write; }

    // Where writer and reader are one thread, the writer goes back to the start of a ring that has been
    // drained: the same memory stays in the cache, and nothing has to be moved over the end.
    void rewindIfEmpty() {
        if (read == write) read = write = start;
    }

    unsigned char* requestWrite(unsigned n);
    // More than the room of the block is cut to it; without a block nothing is committed.
    unsigned confirmWrite(unsigned n);
    // Takes what there is room for. Filling the last byte makes the ring read as empty.
    unsigned copyIn(const unsigned char* p, unsigned n);

    unsigned char* requestRead(unsigned n);
    unsigned confirmRead(unsigned n);
    unsigned copyOut(unsigned char* p, unsigned n);  // all or nothing

  private:
    bytefifo() = default;
    unsigned blockRoom() const;
};
