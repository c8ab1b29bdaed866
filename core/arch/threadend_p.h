// What is done with a pointer of a thread when that thread ends.
//
// A thread_local object with a destructor would do as well, but its first use takes memory, and where there
// is none the C library ends the process.
#pragma once

class ThreadEnd {
  public:
    // For objects of static life. `action` gets the pointer of the thread that ends; it must not throw.
    explicit ThreadEnd(void (*action)(void*));
    ThreadEnd(const ThreadEnd&) = delete;
    ThreadEnd& operator=(const ThreadEnd&) = delete;

    // The calling thread's pointer, null for none. Not called for the thread of main().
    // False: no memory, and the former one stays.
    bool set(void* pointer) const;

  private:
    unsigned key_ = 0;
    bool made_ = false;
};
