#include "platform/olib/olib_szlist.h"

#include <cstdlib>
#include <cstring>

#include "platform/olib/olib_error.h"

namespace {

// Appends one item of `length` bytes, growing the list when needed.
bool Append(OLIBSZLIST** list, const char* item, size_t length) {
  OLIBSZLIST* current = *list;
  uint64_t needed = static_cast<uint64_t>(current->cbUsed) + length + 1;
  if (needed > UINT32_MAX) return false;
  if (needed > current->cbData) {
    uint64_t capacity = current->cbData > 0 ? current->cbData : 64;
    while (capacity < needed) capacity *= 2;
    if (capacity > UINT32_MAX) capacity = UINT32_MAX;
    auto* grown = static_cast<OLIBSZLIST*>(
        std::realloc(current, sizeof(OLIBSZLIST) + capacity));
    if (grown == nullptr) return false;
    grown->cbData = static_cast<uint32_t>(capacity);
    current = grown;
    *list = grown;
  }
  std::memcpy(current->data + current->cbUsed, item, length);
  current->data[current->cbUsed + length] = '\0';
  current->cbUsed += static_cast<uint32_t>(length + 1);
  current->nItem += 1;
  return true;
}

}  // namespace

OLIBSZLIST* OLIBCSzListAlloc(uint32_t size) {
  auto* list = static_cast<OLIBSZLIST*>(std::malloc(sizeof(OLIBSZLIST) + size));
  if (list == nullptr) {
    OLIB_SET_ERROR(OLIB_ERR_OUT_OF_MEMORY);
    return nullptr;
  }
  list->cbData = size;
  list->nItem = 0;
  list->cbUsed = 0;
  return list;
}

void OLIBCSzListFree(OLIBSZLIST* list) { std::free(list); }

int OLIBCStrSep(const char* text, const char* separators, OLIBSZLIST** list) {
  if (text == nullptr || separators == nullptr || list == nullptr ||
      *list == nullptr) {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return -1;
  }
  const char* piece = text;
  for (;;) {
    size_t length = std::strcspn(piece, separators);
    if (!Append(list, piece, length)) {
      OLIB_SET_ERROR(OLIB_ERR_OUT_OF_MEMORY);
      return -1;
    }
    if (piece[length] == '\0') return 0;
    piece += length + 1;
  }
}

const char* OLIBCSzListGet(const OLIBSZLIST* list, uint32_t index) {
  if (list == nullptr || index >= list->nItem) return "";
  const char* item = list->data;
  for (uint32_t i = 0; i < index; ++i) item += std::strlen(item) + 1;
  return item;
}
