// Tracked memory: the one way in which the client's own code obtains and frees heap blocks, so that no call
// site can forget to tell the allocation tracker. Any thread. Running out of memory ends the process, as it
// does in GLib. All blocks are malloc's: g_malloc and the platform's strings are too.
#pragma once

#include <glib.h>

#include <cstdlib>
#include <memory>
#include <type_traits>

#include "tavro_memcheck.h"

// A tracked copy of a text; null for null.
#define TAVRO_STRDUP(text) tavro_memory_copy_text(text, __LINE__, __FILE__)

// A tracked record of zeroes.
#define TAVRO_ZALLOC(Type) tavro_memory_new_record<Type>(__LINE__, __FILE__)

// Take charge of a block that the platform, EFL or GLib allocated with malloc; returns it. Null stays null.
#define TAVRO_ADOPT(block) tavro_memory_adopt(block, __LINE__, __FILE__)

// Free a tracked block and set the variable or field that held it to null. Null is skipped.
#define TAVRO_FREE(lvalue) tavro_memory_free(lvalue, __LINE__, __FILE__)

template <typename T>
T *tavro_memory_adopt(T *block, int line, const char *file) {
  if (block) tavro_mem_insert(block, line, file);
  return block;
}

inline char *tavro_memory_copy_text(const char *text, int line, const char *file) {
  return tavro_memory_adopt(g_strdup(text), line, file);
}

template <typename T>
T *tavro_memory_new_record(int line, const char *file) {
  static_assert(std::is_trivially_destructible_v<T>, "a record is freed without running a destructor");
  return tavro_memory_adopt(static_cast<T *>(g_malloc0(sizeof(T))), line, file);
}

template <typename T>
void tavro_memory_free(T *&block, int line, const char *file) {
  if (!block) return;
  tavro_mem_remove(block, line, file);
  std::free(block);
  block = nullptr;
}

struct TavroBlockDeleter {
  void operator()(void *block) const {
    tavro_mem_remove(block, __LINE__, __FILE__);
    std::free(block);
  }
};

// Owner of a tracked text; hand it one from TAVRO_STRDUP or TAVRO_ADOPT.
using TavroText = std::unique_ptr<char, TavroBlockDeleter>;
