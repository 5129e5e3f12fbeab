#ifndef ORVA_PLATFORM_OLIB_OLIB_SZLIST_H_
#define ORVA_PLATFORM_OLIB_OLIB_SZLIST_H_

#include <cstdint>
#include <memory>

// A list of zero-ended texts kept one after another in one allocation.
// Callers may read nItem directly; items are read with OLIBCSzListGet.
struct OLIBSZLIST {
  uint32_t cbData;  // bytes reserved in data
  uint32_t nItem;   // number of items
  uint32_t cbUsed;  // bytes of data in use
  char data[];      // the items, each followed by its zero byte
};

// A new, empty list with `size` bytes of room for item text. Returns null
// when out of memory (last error set). Release it with OLIBCSzListFree.
OLIBSZLIST* OLIBCSzListAlloc(uint32_t size);

// Releases a list; a null list is ignored.
void OLIBCSzListFree(OLIBSZLIST* list);

// Splits `text` at every byte found in `separators` and appends each piece,
// empty pieces included, to *list in text order. The list grows as needed
// and *list may then point to a new allocation (the old one is released).
// Returns 0 on success; -1 when an argument is null or memory runs out, with
// the last error set and *list still valid.
int OLIBCStrSep(const char* text, const char* separators, OLIBSZLIST** list);

// The zero-ended text of item `index` (from 0); "" when the list is null or
// the index is out of range. The text lives as long as the list.
const char* OLIBCSzListGet(const OLIBSZLIST* list, uint32_t index);

struct OLIBSzListDeleter {
  void operator()(OLIBSZLIST* list) const { OLIBCSzListFree(list); }
};
using OLIBSzListPtr = std::unique_ptr<OLIBSZLIST, OLIBSzListDeleter>;

#endif  // ORVA_PLATFORM_OLIB_OLIB_SZLIST_H_
