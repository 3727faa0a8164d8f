// The utility library: the last error, texts in fixed buffers, string lists and string hashes.
#pragma once

// --- Last error ---------------------------------------------------------------------------------
// Each thread has its own record of the last failure: a code and the source file and line that
// raised it. A success does not clear it.

// The code; 0 when nothing has failed on this thread yet.
int QLIBCErrGet();

// Where the last failure was raised. The argument is accepted for its callers' habit of passing the
// code along and is not used. The text lives until this thread's next failure; empty, and line 0,
// when nothing has failed yet.
const char* QLIBCErrorGetFile(int code = 0);
int QLIBCErrorGetLine(int code = 0);

// Records a failure for this thread. `file` is copied, cut to 255 bytes; null counts as empty.
void QLIBCErrSetEx(int code, const char* file, int line);

// --- Texts --------------------------------------------------------------------------------------

// Replaces every occurrence of `from` in the zero-terminated text of `buffer`, which holds `size`
// bytes. What was put in is not searched again. `flags` is reserved and must be 0. Returns the
// number of replacements; negative, with the buffer unchanged, when the result and its terminating
// zero would not fit, or an argument is null or `from` empty.
int QLIBCStrReplace(char* buffer, const char* from, const char* to, int flags, int size);

// Writes `text` into `buffer` (of `size` bytes) as one word for a POSIX shell, zero-terminated: the
// shell reads it back as the one unchanged word. Single quotes where they fit the buffer, else a
// backslash before each special byte, else (a text with line ends) double quotes. A buffer of twice
// the length of `text` plus two bytes is enough for every text but the empty one, whose two quotes
// and zero need three bytes. Returns 0; negative, with an empty buffer where it has room for that,
// when the word would not fit (errno is ERANGE) or an argument is null or the size not positive
// (EINVAL).
int QLIBCEncShParam(const char* text, char* buffer, int size);

// --- String list --------------------------------------------------------------------------------

// A growable list of texts. `count` is the number of texts in it; only the functions below and the
// platform's own libraries write to it.
struct QLIBC_SZLIST {
    int count;
};

// An empty list with room for `capacity` texts before it first grows; null when memory is short or
// the capacity is negative. The caller frees it with QLIBCSzListFree.
QLIBC_SZLIST* QLIBCSzListAlloc(int capacity);

// The text at `index`, owned by the list; null when the index is outside it.
const char* QLIBCSzListGet(const QLIBC_SZLIST* list, int index);

// Appends a copy of `text`. Returns the new count, negative on failure.
int QLIBCSzListPush(QLIBC_SZLIST* list, const char* text);

// Releases the list; null is ignored.
void QLIBCSzListFree(QLIBC_SZLIST* list);

// --- String hash --------------------------------------------------------------------------------

// A table from text to text. It may move when it grows, hence the address in SetValue.
struct QLIBC_SZHASH;

// An empty table with room for `size` entries before it first grows; null when memory is short or
// the size is not positive. The caller frees it with QLIBCSzHashFree.
QLIBC_SZHASH* QLIBCSzHashAlloc(int size);

// Sets the value of `key`, replacing an earlier one. Both texts are copied. Returns 0, negative on
// failure; `*hash` is valid either way.
int QLIBCSzHashSetValue(QLIBC_SZHASH** hash, const char* key, const char* value);

// The value of `key`, owned by the table and valid until the key is set again; null when absent.
const char* QLIBCSzHashGetValue(const QLIBC_SZHASH* hash, const char* key);

// Releases the table; null is ignored.
void QLIBCSzHashFree(QLIBC_SZHASH* hash);
