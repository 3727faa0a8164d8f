#pragma once

// While an object lives, the calling thread's allocations with `new` fail, all after the first
// `allowed` ones. For programs that link Memory.cpp.
class ShortMemory {
  public:
    explicit ShortMemory(int allowed);
    ~ShortMemory();
    ShortMemory(const ShortMemory&) = delete;
    ShortMemory& operator=(const ShortMemory&) = delete;
};
