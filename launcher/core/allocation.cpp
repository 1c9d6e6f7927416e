// The launcher's allocation functions. The launcher is built without exceptions, so the C++
// library's throwing operator new (and the unwinding machinery it drags into a static link) is of
// no use to it: allocation is plain malloc/free, and a failed allocation yields null like every
// other failure of the launcher.
#include <stdlib.h>

#include <new>

void* operator new(size_t size) { return malloc(size == 0 ? 1 : size); }
void* operator new[](size_t size) { return malloc(size == 0 ? 1 : size); }
void operator delete(void* block) noexcept { free(block); }
void operator delete[](void* block) noexcept { free(block); }
void operator delete(void* block, size_t) noexcept { free(block); }
void operator delete[](void* block, size_t) noexcept { free(block); }
