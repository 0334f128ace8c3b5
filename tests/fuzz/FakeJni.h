// A fake Java environment for the fuzz targets: a JNINativeInterface table with only the
// functions that the library's module-output paths call, each one checking its arguments as
// strictly as a checking VM would and aborting on misuse. Every other slot is null, so an
// unexpected call crashes at once.
//
// Objects are plain records owned by the environment: instances (with the fields the library
// set on them), strings (as UTF-16), byte and int arrays. reset() drops everything made for
// one fuzz input; field IDs and registered natives live for the whole process.
#pragma once

#include <DVB.h>
#include <nativehelper/jni.h>

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <deque>
#include <map>
#include <memory>
#include <string>
#include <unordered_set>
#include <utility>
#include <vector>

// A failed check is a finding: name it, then abort so that libFuzzer keeps the input.
#define FUZZ_CHECK(cond)                                                                    \
    do {                                                                                    \
        if (!(cond)) {                                                                      \
            fprintf(stderr, "fuzz check failed: %s at %s:%d\n", #cond, __FILE__, __LINE__); \
            __builtin_trap();                                                               \
        }                                                                                   \
    } while (0)

namespace fakejni {

enum class Kind { Class, Instance, String, ByteArray, IntArray };

struct Object {
    Kind kind;
    std::string className;  // of a class or an instance
    std::u16string chars;   // of a string
    std::vector<jbyte> bytes;
    std::vector<jint> ints;
    bool deleted = false;  // its local reference was deleted
};

struct Field {
    std::string className;
    std::string name;
    std::string signature;
};

// The last value the library set in one field of an instance.
struct Value {
    char type;  // 'I', 'J' or 'L' (any reference, null included)
    jint i;
    jlong j;
    const Object* object;
};

// One Set<Byte|Int>ArrayRegion: where the library copied from, and how many bytes.
struct Copy {
    const void* source;
    size_t bytes;
};

class Env {
public:
    Env();
    Env(const Env&) = delete;
    Env& operator=(const Env&) = delete;

    JNIEnv* get() { return &mJni; }

    // Forgets every object, value, copy and exception of the last input.
    void reset();

    // A Java object of `className` for the library to fill.
    jobject newInstance(const char* className);

    // What GetIntField answers for an mNativeContext field.
    void setContext(jint context) { mContext = context; }

    // NewStringUTF input that starts inside [begin, begin + size) must end inside it too.
    void setTextWindow(const void* begin, size_t size);

    // The library's view of its results.
    const Object* object(jobject ref) const;
    const Value* value(jobject instance, const char* fieldName) const;
    size_t setCount(jobject instance) const;
    const std::vector<Copy>& copies() const { return mCopies; }
    bool pending() const { return mPending; }
    const std::string& exceptionClass() const { return mExceptionClass; }
    const std::string& exceptionMessage() const { return mExceptionMessage; }

    // The function that RegisterNatives received for `className`.`name` with `signature`.
    void* native(const char* className, const char* name, const char* signature) const;

    // The table's functions, given the environment they were called on.
    static Env& of(JNIEnv* env);
    Object* live(jobject ref, Kind kind) const;
    Object* make(Kind kind);
    const Field* fieldId(const std::string& className, const char* name, const char* signature);
    void set(jobject instance, jfieldID field, Value v);
    void requireNoPending() const;
    void addCopy(const void* source, size_t bytes) { mCopies.push_back({source, bytes}); }
    void throwNew(const Object* cls, const char* message);
    void clearException() { mPending = false; }
    jint context() const { return mContext; }
    bool inTextWindow(const char* p) const;
    const char* textWindowEnd() const { return mWindowEnd; }
    void registerNatives(const std::string& className, const JNINativeMethod* methods, jint n);

private:
    JNIEnv mJni;
    JNINativeInterface mTable;
    std::vector<std::unique_ptr<Object>> mObjects;
    std::unordered_set<const Object*> mLive;
    std::deque<Field> mFields;  // stable addresses: they are the jfieldIDs
    std::map<std::pair<const Object*, const Field*>, Value> mValues;
    std::map<const Object*, size_t> mSetCounts;
    std::vector<Copy> mCopies;
    struct Native {
        std::string className, name, signature;
        void* fn;
    };
    std::vector<Native> mNatives;
    bool mPending = false;
    std::string mExceptionClass;
    std::string mExceptionMessage;
    jint mContext = 0;
    const char* mWindowBegin = nullptr;
    const char* mWindowEnd = nullptr;
};

// The one fake environment of the process; also silences the library's log lines.
Env& env();

// Makes a service object whose modules `install` puts in place, binds it as the library's
// DVB objects are bound, and returns its context value. The object lives for the process.
jint bindDvb(void (*install)(android::DVB& dvb));

// "Index i out of bounds for length n", as the library words it.
std::string indexMessage(int64_t index, int64_t length);

}  // namespace fakejni
