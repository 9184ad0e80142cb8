#include "vlservice/platform/uchar_alloc.h"

unsigned char* ExportedUCharAlloc::alloc(std::size_t size) { return new unsigned char[size]; }

void ExportedUCharAlloc::operator()(unsigned char* block) const { delete[] block; }
