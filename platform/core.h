// The platform's core library: errors, services, string lists and hashes, files, programs.
//
// Results: an operation that returns int answers a negative value on failure unless it says
// otherwise; the reason is then in the error facility. Texts are NUL-terminated UTF-8. A pointer
// that a caller passes in stays the caller's, a text is copied. All operations may be called from
// several threads at once, on different objects.
#ifndef VORN_PLATFORM_CORE_H
#define VORN_PLATFORM_CORE_H

#include <stdint.h>

// The configuration context. While an object lives, nobody else, in this process or another,
// changes the platform's configuration, so that a read followed by a write loses nothing.
// Objects nest within a thread, and so does an ID-map record (see VORNNFSIDMapGet). The context
// does not keep others waiting while a service operation or a program runs: everything that a
// request writes must be written before its service action.
// If the context cannot be taken, the object lives all the same and the operations that need it
// fail with the reason in the error facility.
class VornConf {
 public:
  VornConf();
  ~VornConf();
  VornConf(const VornConf&) = delete;
  VornConf& operator=(const VornConf&) = delete;
};

extern "C" {

// ---------------------------------------------------------------------------------------------
// The error facility: what the last failing operation of this thread left behind. It is
// unspecified after a success, so it is read right after the failure.

// The code: an errno(3) value, or one of the platform's own, which begin at 0x1000.
int KLIBCErrGet(void);

// Where the platform noticed it: a source file's name, never null, and a line. The text is good
// until the thread's next failing operation.
const char* KLIBCErrorGetFile(void);
int KLIBCErrorGetLine(void);

// ---------------------------------------------------------------------------------------------
// Services, by the appliance's names ("nfsd").

// Non-zero when the service is set to run: it is started at boot. Negative when that cannot be
// found out; callers count this as enabled.
int KLIBServiceIsEnabled(const char* service);

// Each answers 0 on success and anything else on failure, once the service is in its new state.
// Start also enables and stop also disables the service for the next boot. `flags` is 0.
int KLIBServiceStart(const char* service, int flags);
int KLIBServiceStop(const char* service, int flags);
int KLIBServiceRestart(const char* service);

// Has a running service read its configuration again without interrupting its clients.
int KLIBServiceReload(const char* service);

// ---------------------------------------------------------------------------------------------
// String lists. An operation that takes `list**` may move the list and stores where it went.

typedef struct KLIBSZLIST {
  int32_t count;  // the number of items, read directly; the rest belongs to the platform
} KLIBSZLIST;

// An empty list with room for `capacity` items; it grows by itself. Null on failure.
// Release it with KLIBCSzListFree, which takes null as well.
KLIBSZLIST* KLIBCSzListAlloc(int capacity);
void KLIBCSzListFree(KLIBSZLIST* list);

// Item `index` (from 0), or null when there is none. Good until the list changes.
const char* KLIBCSzListGet(const KLIBSZLIST* list, int index);

// Appends a copy of `text`.
int KLIBCSzListPush(KLIBSZLIST** list, const char* text);

// Inserts a copy of `text` before item `index`; an index equal to the count appends.
int KLIBCSzListInsert(KLIBSZLIST** list, int index, const char* text);

// The index of the first item that equals `text` byte for byte; negative when there is none.
// Finding stays fast in a list of 100,000 items.
int KLIBCSzListFind(const KLIBSZLIST* list, const char* text);

// Sorts the items; equal items keep their order. Option 16, the only one: by text, byte for byte.
enum { KLIBSZLIST_SORT_TEXT = 16 };
int KLIBCSzListSortItems(KLIBSZLIST* list, int option);

// ---------------------------------------------------------------------------------------------
// String hashes: keys and values are texts, keys are compared byte for byte. They keep the order
// in which keys were first set. An operation that takes `hash**` may move the hash.

typedef struct KLIBSZHASH KLIBSZHASH;

// An empty hash with room for `capacity` keys; it grows by itself. Null on failure.
// Release it with KLIBCSzHashFree, which takes null as well.
KLIBSZHASH* KLIBCSzHashAlloc(int capacity);
void KLIBCSzHashFree(KLIBSZHASH* hash);

// Appends every key to the list.
int KLIBCSzHashEnumKey(const KLIBSZHASH* hash, KLIBSZLIST** keys);

// The value of `key`, or null when it has none. Good until the hash changes.
const char* KLIBCSzHashGetValue(const KLIBSZHASH* hash, const char* key);

// Sets the value of `key`, replacing the one it had.
int KLIBCSzHashSetValue(KLIBSZHASH** hash, const char* key, const char* value);

// Removes `key`. The number of keys removed: 0 when there was none.
int KLIBCSzHashRemoveKey(KLIBSZHASH* hash, const char* key);

// ---------------------------------------------------------------------------------------------
// Files, texts, programs. Absolute paths are taken below the platform's root directory.

// The value of `key` in `section` of a file of "[section]" and "key = value" lines; a krb5.conf(5)
// is read with its own syntax. A value that does not fit into `size` bytes with its NUL is a
// failure, never a cut. Non-negative: the value's length.
int KLIBCFileGetSectionValue(const char* path, const char* section, const char* key, char* buffer, int size);

// `text` in upper case, by Unicode's full case mapping. Text that is no UTF-8, or whose upper case
// does not fit into `size` bytes with its NUL, is a failure. Non-negative: the length in bytes.
int KLIBCUnicodeUTF8StrUpper(const char* text, char* buffer, int size);

// Non-zero when there is a file of any kind at `path`. A path that is below the root already, as an
// upload's, which the web server names, is taken as it is.
int KLIBCFileExist(const char* path);

// Runs `program` with up to four arguments (the first null ends them) and waits for it: no shell,
// an empty standard input, its output to the log. 0 when it exited with status 0; negative when it
// could not be run, exited with another status, was ended by a signal, or took longer than a minute.
int KLIBCExec(const char* program, const char* a1, const char* a2, const char* a3, const char* a4);

// The path of a share, from its handle (see share.h). It lives as long as the handle.
const char* KLIBSharePathGet(const struct VORNSHARE* share);

}  // extern "C"

#endif  // VORN_PLATFORM_CORE_H
