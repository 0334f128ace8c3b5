// A checking fake JNI environment for the fuzz targets. It has only the JNI functions the
// library calls, each checking its arguments as a checking VM would: it aborts on invalid
// modified UTF-8, a region outside an array the library made, a field of another type, a dead
// local reference, and any call but the few permitted while an exception is pending. Java field
// reads, strings and arrays passed in are drawn from the fuzz input.
#pragma once

#include <android/log.h>
#include <fuzzer/FuzzedDataProvider.h>
#include <nativehelper/jni.h>

#include <cstring>
#include <memory>
#include <set>
#include <string>
#include <tuple>
#include <vector>

// A failed check is a finding: name it, then abort so that libFuzzer keeps the input.
#define FUZZ_CHECK(cond)                                                                       \
    ((cond) ? void()                                                                           \
            : (fprintf(stderr, "fuzz check failed: %s at %s:%d\n", #cond, __FILE__, __LINE__), \
               __builtin_trap()))

namespace fuzz {

enum class Kind { Class, Instance, String, ByteArray, IntArray, Any };

struct Object {
    Kind kind;
    std::string cls;        // of a class or an instance
    std::string data = {};  // a string's modified UTF-8, an array's elements
    bool fromJava = false;  // an array passed in: a bad region raises, as the VM does
    bool deleted = false;   // its local reference was deleted
};

struct Field {
    std::string cls, name, signature;
    auto key() const { return std::tie(cls, name, signature); }
    bool operator<(const Field& o) const { return key() < o.key(); }
};
struct Native : Field {
    void* fn;
};

inline JNIEnv gJni;
inline FuzzedDataProvider* gInput;
inline std::vector<std::unique_ptr<Object>> gObjects;  // of the current call
inline std::string gThrown;                            // the pending exception's class
inline std::set<Field> gFields;       // for the process: their addresses are the field IDs
inline std::vector<jint> gContexts;   // what mNativeContext may hold
inline std::vector<Native> gNatives;  // as the classes registered them

// Well-formed modified UTF-8: sequences of one to three bytes, no zero byte, C0 80 for U+0000.
inline bool isModifiedUtf8(const std::string& s) {
    for (size_t i = 0; i < s.size();) {
        const auto lead = static_cast<uint8_t>(s[i]);
        const size_t extra = "0000000033331123"[lead >> 4] - '0';  // by its top four bits
        if (lead == 0 || extra == 3 || i + extra >= s.size()) return false;
        uint32_t value = lead & (extra == 0 ? 0x7F : 0x3F >> extra);
        for (size_t k = 1; k <= extra; ++k) {
            if ((s[i + k] & 0xC0) != 0x80) return false;
            value = value << 6 | (s[i + k] & 0x3F);
        }
        const uint32_t least[] = {0, 0x80, 0x800};  // shorter forms are overlong; C0 80 is U+0000
        if (value < least[extra] && !(extra == 1 && value == 0)) return false;
        i += 1 + extra;
    }
    return true;
}

// While an exception is pending, JNI permits only the exception functions and DeleteLocalRef.
inline void enter(JNIEnv* e) {
    FUZZ_CHECK(e == &gJni && gThrown.empty());
}

inline Object* make(JNIEnv* e, Kind kind, std::string cls = "") {
    enter(e);
    return gObjects.emplace_back(new Object{kind, std::move(cls)}).get();
}

// The object behind a live local reference of the current call, of `kind` (Any: of any kind):
// anything else is misuse.
inline Object* live(const void* ref, Kind kind) {
    Object* o = nullptr;
    for (const auto& p : gObjects)
        if (p.get() == ref) o = p.get();
    FUZZ_CHECK(o != nullptr && !o->deleted && (kind == Kind::Any || o->kind == kind));
    return o;
}

// A Java string from the input, any length, any characters (U+0000 and U+0080..U+00FF among
// them, in two bytes), as the VM hands it out in modified UTF-8.
inline jstring javaString() {
    Object* s = make(&gJni, Kind::String);
    const size_t n = gInput->ConsumeIntegralInRange<size_t>(0, 300);
    const std::string pattern = gInput->ConsumeBytesAsString(16) + "x";
    for (size_t i = 0; i < n; ++i) {
        auto c = static_cast<uint8_t>(pattern[i % pattern.size()]);
        if (c == 0 || c >= 0x80) s->data += char(0xC0 | c >> 6), c = 0x80 | (c & 0x3F);
        s->data += char(c);
    }
    return reinterpret_cast<jstring>(s);
}

// The field that `id` names, on an object of its class, of signature `sig` ("L": any reference).
inline const Field& field(JNIEnv* e, jobject instance, jfieldID id, const std::string& sig) {
    enter(e);
    const auto* f = reinterpret_cast<const Field*>(id);
    FUZZ_CHECK(f != nullptr && f->cls == live(instance, Kind::Instance)->cls);
    FUZZ_CHECK(f->signature == sig || (sig == "L" && strchr("L[", f->signature[0]) != nullptr));
    return *f;
}

// Every array the library makes is bounded by a record field: anything near this size means
// a size went wrong before the call.
inline Object* newArray(JNIEnv* e, Kind kind, jsize n) {
    FUZZ_CHECK(n >= 0 && n <= (1 << 24));
    Object* a = make(e, kind);
    a->data.resize((kind == Kind::ByteArray ? 1 : 4) * size_t(n));
    return a;
}

// A region outside an array the library made is its own fault; outside one passed in, the VM
// raises ArrayIndexOutOfBoundsException.
template <typename A, typename T>
void setRegion(JNIEnv* e, A array, jsize start, jsize n, const T* from) {
    enter(e);
    Object* a = live(array, sizeof(T) == 1 ? Kind::ByteArray : Kind::IntArray);
    if (start < 0 || n < 0 || (jlong{start} + n) * sizeof(T) > a->data.size()) {
        FUZZ_CHECK(a->fromJava);
        gThrown = "java/lang/ArrayIndexOutOfBoundsException";
    } else if (n != 0) {
        memcpy(&a->data[start * sizeof(T)], from, n * sizeof(T));
    }
}

inline JNIEnv* jni() {
    __android_log_set_logger([](const struct __android_logger_data*, const char*) {});
    static JNINativeInterface t;
    t.FindClass = [](JNIEnv* e, const char* name) { return jclass(make(e, Kind::Class, name)); };
    t.ThrowNew = [](JNIEnv* e, jclass cls, const char*) {
        enter(e);  // never over a pending exception
        return gThrown = live(cls, Kind::Class)->cls, JNI_OK;
    };
    t.ExceptionCheck = [](JNIEnv*) -> jboolean { return !gThrown.empty(); };
    t.ExceptionClear = [](JNIEnv*) { gThrown.clear(); };
    t.DeleteLocalRef = [](JNIEnv*, jobject ref) {
        if (ref != nullptr) live(ref, Kind::Any)->deleted = true;
    };
    t.GetFieldID = [](JNIEnv* e, jclass cls, const char* name, const char* sig) {
        enter(e);
        return jfieldID(&*gFields.insert({live(cls, Kind::Class)->cls, name, sig}).first);
    };
    t.GetIntField = [](JNIEnv* e, jobject o, jfieldID id) {
        if (field(e, o, id, "I").name != "mNativeContext") return gInput->ConsumeIntegral<jint>();
        // With three contexts: the first six times in eight, each other once.
        const auto pick = gInput->ConsumeIntegralInRange<size_t>(0, 4 + gContexts.size());
        return gContexts[pick < 6 ? 0 : pick - 5];
    };
    t.GetLongField = [](JNIEnv* e, jobject o, jfieldID id) {
        return field(e, o, id, "J"), gInput->ConsumeIntegral<jlong>();
    };
    // One in eight strings read is null.
    t.GetObjectField = [](JNIEnv* e, jobject o, jfieldID id) {
        field(e, o, id, "Ljava/lang/String;");
        return gInput->ConsumeIntegralInRange(0, 7) == 7 ? nullptr : jobject(javaString());
    };
    t.SetIntField = [](JNIEnv* e, jobject o, jfieldID id, jint) { field(e, o, id, "I"); };
    t.SetLongField = [](JNIEnv* e, jobject o, jfieldID id, jlong) { field(e, o, id, "J"); };
    t.SetObjectField = [](JNIEnv* e, jobject o, jfieldID id, jobject v) {
        const std::string& sig = field(e, o, id, "L").signature;
        if (v == nullptr) return;
        const Kind k = sig == "[B" ? Kind::ByteArray : sig == "[I" ? Kind::IntArray : Kind::String;
        FUZZ_CHECK(k != Kind::String || sig == "Ljava/lang/String;");
        live(v, k);
    };
    t.NewString = [](JNIEnv* e, const jchar* c, jsize n) {
        FUZZ_CHECK(n >= 0 && (n == 0 || c != nullptr));
        Object* s = make(e, Kind::String);
        for (jsize i = 0; i < n; ++i) s->data += char(c[i]);  // ASan checks every element
        return jstring(s);
    };
    // AddressSanitizer bounds the walk to the zero byte.
    t.NewStringUTF = [](JNIEnv* e, const char* utf) {
        Object* s = make(e, Kind::String);
        FUZZ_CHECK(isModifiedUtf8(s->data = utf));
        return jstring(s);
    };
    t.GetStringUTFChars = [](JNIEnv* e, jstring s, jboolean*) {
        enter(e);
        return live(s, Kind::String)->data.c_str();
    };
    t.ReleaseStringUTFChars = [](JNIEnv*, jstring s, const char* chars) {
        FUZZ_CHECK(live(s, Kind::String)->data.c_str() == chars);
    };
    t.NewByteArray = [](JNIEnv* e, jsize n) { return jbyteArray(newArray(e, Kind::ByteArray, n)); };
    t.NewIntArray = [](JNIEnv* e, jsize n) { return jintArray(newArray(e, Kind::IntArray, n)); };
    t.SetByteArrayRegion = setRegion<jbyteArray, jbyte>;
    t.SetIntArrayRegion = setRegion<jintArray, jint>;
    t.RegisterNatives = [](JNIEnv* e, jclass cls, const JNINativeMethod* m, jint n) {
        enter(e);
        const std::string c = live(cls, Kind::Class)->cls;
        for (jint i = 0; i < n; ++i)
            gNatives.push_back({{c, m[i].name, m[i].signature}, m[i].fnPtr});
        return JNI_OK;
    };
    gJni.functions = &t;
    return &gJni;
}

// Forgets the last call; Java reads then draw from `input`.
inline void reset(FuzzedDataProvider* input) {
    gObjects.clear();
    gThrown.clear();
    gInput = input;
}

}  // namespace fuzz
