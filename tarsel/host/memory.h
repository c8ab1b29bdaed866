// Whether the process is refused memory: what fails then fails for that reason, whatever it says itself.
#pragma once

// From here on refusals of the language's allocations are counted. Once, at the start of the program.
void countMemoryRefusals();

// Sees those of its lifetime.
class MemoryWatch {
  public:
    MemoryWatch();
    explicit MemoryWatch(unsigned before) : before_(before) {}  // 0: since the start of the program
    bool ranOut() const;

  private:
    unsigned before_;
};
