// The platform's core library: error facility, services, string lists and hashes, files, programs.
//
// For all operations, unless a declaration says otherwise:
// - Errors: an operation that returns int returns a negative value on failure. The reason is then in the error
// facility.
// - Strings are NUL-terminated UTF-8. Pointers passed in must not be null; the operation copies what it keeps.
// - Ownership: an object that an operation returns belongs to the caller, who releases it with the matching Free.
// - Thread safety: operations may be called from several threads at once on different objects. One object must not be
//   used by two threads at once. The error facility is per thread.
#ifndef VORN_PLATFORM_CORE_H
#define VORN_PLATFORM_CORE_H

#include <stdint.h>

// The configuration context: holds the configuration lock for the lifetime of the object. No other thread or process
// can change the platform's configuration meanwhile, so a read followed by a write loses no change.
// - Objects nest within a thread, also with ID-map records (see VORNNFSIDMapGet). Destroy an object in the thread that
//   constructed it.
// - The lock is released while a service operation or a program runs, and taken again afterwards. Write everything that
//   a request changes before its service action.
// - Errors: the constructor never fails. If the lock cannot be taken, the operations that need it fail with the reason.
class VornConf {
 public:
  VornConf();
  ~VornConf();
  VornConf(const VornConf&) = delete;
  VornConf& operator=(const VornConf&) = delete;
};

extern "C" {

// ---------------------------------------------------------------------------------------------
// The error facility describes the last failed operation of the calling thread. Its content is unspecified after an
// operation that succeeded: read it directly after the failure.

// Returns the error code: an errno(3) value, or a code of the platform, from 0x1000 on.
int KLIBCErrGet(void);

// Return the source file and the line where the platform detected the failure. The file name is never null; it belongs
// to the platform and is valid until the next failed operation of the thread.
const char* KLIBCErrorGetFile(void);
int KLIBCErrorGetLine(void);

// ---------------------------------------------------------------------------------------------
// Services. `service` is the appliance's name of the service, such as "nfsd".

// Returns a non-zero value if the service is enabled, that is, started at boot. Returns a negative value if the state
// cannot be determined; callers treat this as enabled.
int KLIBServiceIsEnabled(const char* service);

// Each returns after the service has reached its new state: 0 on success, any other value on failure. Start also
// enables the service for the next boot, and stop disables it. `flags` is reserved and must be 0.
int KLIBServiceStart(const char* service, int flags);
int KLIBServiceStop(const char* service, int flags);
int KLIBServiceRestart(const char* service);

// Makes a running service read its configuration again without interrupting its clients.
int KLIBServiceReload(const char* service);

// ---------------------------------------------------------------------------------------------
// String lists. An operation that takes `list**` may move the list and stores the new address: do not keep the old one.

typedef struct KLIBSZLIST {
  int32_t count;  // the number of items, which callers read; the members behind it are the platform's
} KLIBSZLIST;

// Returns an empty list with memory for `capacity` items, or null on failure. A list grows as needed. Release it with
// KLIBCSzListFree, which accepts null.
KLIBSZLIST* KLIBCSzListAlloc(int capacity);
void KLIBCSzListFree(KLIBSZLIST* list);

// Returns item `index`, from 0 on, or null if there is no such item. The string is valid until the list changes.
const char* KLIBCSzListGet(const KLIBSZLIST* list, int index);

// Appends a copy of `text`.
int KLIBCSzListPush(KLIBSZLIST** list, const char* text);

// Inserts a copy of `text` before item `index`. An index equal to the count appends.
int KLIBCSzListInsert(KLIBSZLIST** list, int index, const char* text);

// Returns the index of the first item that equals `text` byte for byte, or a negative value if there is none. Repeated
// searches of an unchanged list take constant time on average.
int KLIBCSzListFind(const KLIBSZLIST* list, const char* text);

// Sorts the items; the sort is stable. The only option, 16, compares the strings byte for byte.
enum { KLIBSZLIST_SORT_TEXT = 16 };
int KLIBCSzListSortItems(KLIBSZLIST* list, int option);

// ---------------------------------------------------------------------------------------------
// String hashes. Keys and values are strings; keys are compared byte for byte and keep the order in which they were
// first set. An operation that takes `hash**` may move the hash and stores the new address: do not keep the old one.

typedef struct KLIBSZHASH KLIBSZHASH;

// Returns an empty hash with memory for `capacity` keys, or null on failure. A hash grows as needed. Release it with
// KLIBCSzHashFree, which accepts null.
KLIBSZHASH* KLIBCSzHashAlloc(int capacity);
void KLIBCSzHashFree(KLIBSZHASH* hash);

// Appends all keys to the list, in the order of the hash.
int KLIBCSzHashEnumKey(const KLIBSZHASH* hash, KLIBSZLIST** keys);

// Returns the value of `key`, or null if the hash does not contain the key. The string is valid until the hash changes.
const char* KLIBCSzHashGetValue(const KLIBSZHASH* hash, const char* key);

// Sets the value of `key`. An existing value is replaced.
int KLIBCSzHashSetValue(KLIBSZHASH** hash, const char* key, const char* value);

// Removes `key` and returns the number of removed keys: 1, or 0 if the hash does not contain the key.
int KLIBCSzHashRemoveKey(KLIBSZHASH* hash, const char* key);

// ---------------------------------------------------------------------------------------------
// Files, strings, programs. Absolute paths are resolved below the platform's root directory.

// Copies the value of `key` in `section` of an INI file into the buffer of `size` bytes. A krb5.conf(5) is read with
// its own syntax. Returns the length of the value in bytes. A value that does not fit with its NUL, or that
// is not UTF-8, is an error; it is never changed.
int KLIBCFileGetSectionValue(const char* path, const char* section, const char* key, char* buffer, int size);

// Converts `text` to upper case by Unicode's full case mapping and stores it in the buffer of `size` bytes. Returns the
// length in bytes. Text that is not valid UTF-8, or does not fit with its NUL, is an error.
int KLIBCUnicodeUTF8StrUpper(const char* text, char* buffer, int size);

// Returns a non-zero value if a file of any type exists at `path`. The path of a file that was uploaded with the call
// (call.h) is one of this system; every other path is below the root.
int KLIBCFileExist(const char* path);

// Runs `program` with up to four arguments and waits until it ends. The first null argument ends the list. No shell is
// used, standard input is empty, and the output goes to the log. Returns 0 if the program exited with status 0, and a
// negative value if it could not be started, exited with another status, was ended by a signal (signal(7)), or took
// more than 60 seconds.
int KLIBCExec(const char* program, const char* a1, const char* a2, const char* a3, const char* a4);

// Returns the absolute path of a share (see share.h). The string belongs to the handle and is valid until it is freed.
const char* KLIBSharePathGet(const struct VORNSHARE* share);

}  // extern "C"

#endif  // VORN_PLATFORM_CORE_H
