// What the fuzz targets share: a checking fake JNI environment; a module class's natives,
// registered against a fake module and called with arguments from the input; and an oracle
// that holds every value set in a Java object against the record member it came from.
//
// The environment has only the JNI functions the library calls, each checking its arguments
// as a checking VM would: it aborts on invalid modified UTF-8, an array region out of range, a
// field of another type, any call but the few permitted while an exception is pending.
#pragma once

#include <Record.h>
#include <android/log.h>
#include <fuzzer/FuzzedDataProvider.h>
#include <nativehelper/jni.h>
#include <sanitizer/asan_interface.h>

#include <cstring>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <typeinfo>

// A failed check is a finding: name it, then abort so that libFuzzer keeps the input.
#define FUZZ_CHECK(cond)                                                                    \
    do {                                                                                    \
        if (!(cond)) {                                                                      \
            fprintf(stderr, "fuzz check failed: %s at %s:%d\n", #cond, __FILE__, __LINE__); \
            __builtin_trap();                                                               \
        }                                                                                   \
    } while (0)

namespace fuzz {

// The interface headers pin every record member with DVB_RECORD_FIELD. Read here, the same
// lines tell the oracle each member's place, width and sign, apart from the library's maps.
struct Member {
    uint32_t offset, width, unit;  // unit: of an array's element
    bool isSigned;
    std::string type;  // of the element
};
inline std::map<std::string, std::map<std::string, Member>> gRecords;  // by record, by name
inline std::map<std::string, std::string> gRecordNames;                // by type

template <typename R, typename T>
bool pin(const char* record, const char* name, size_t offset) {
    using E = std::remove_all_extents_t<T>;
    gRecordNames[typeid(R).name()] = record;
    gRecords[record][name] = {uint32_t(offset), sizeof(T), sizeof(E), std::is_signed_v<E>,
                              typeid(E).name()};
    return true;
}

}  // namespace fuzz

#undef DVB_RECORD_FIELD
#define DVB_RECORD_FIELD(R, m, offset) \
    inline const bool kPinned_##R##_##m = ::fuzz::pin<R, decltype(R::m)>(#R, #m, offsetof(R, m))

#include <DVB.h>

#include "Context.h"
#include "Service.h"
#include "Ycc.h"

namespace fuzz {

// What a module's text field must become in Java, worked out apart from the library: the bytes
// up to the first zero byte or the field's end (at most 4096), as modified UTF-8 (C0 80 is its
// one overlong form), each byte that starts no well-formed sequence turned into U+FFFD.
struct Text {
    size_t length = 0;
    bool wellFormed = true;
    std::u16string chars;
};

inline Text expectedText(const uint8_t* field, size_t width) {
    Text t;
    while (t.length < std::min<size_t>(width, 4096) && field[t.length] != 0) ++t.length;
    for (size_t i = 0; i < t.length;) {
        const uint8_t lead = field[i];
        const size_t extra = lead >= 0xC0 && lead < 0xE0 ? 1 : lead >= 0xE0 && lead < 0xF0 ? 2 : 0;
        uint32_t value = extra == 0 ? lead : lead & (extra == 1 ? 0x1F : 0x0F);
        bool ok = lead < 0x80 || (extra != 0 && i + extra < t.length);
        for (size_t k = 1; ok && k <= extra; ++k) {
            ok = (field[i + k] & 0xC0) == 0x80;
            value = value << 6 | (field[i + k] & 0x3F);
        }
        const uint32_t least = extra == 2 ? 0x800 : extra == 1 ? 0x80 : 0;
        ok = ok && (value >= least || (extra == 1 && value == 0));
        t.chars.push_back(ok ? static_cast<char16_t>(value) : u'\uFFFD');
        t.wellFormed = t.wellFormed && ok;
        i += ok ? 1 + extra : 1;
    }
    return t;
}

// ---- the environment ----------------------------------------------------------------------

enum class Kind { Class, Instance, String, ByteArray, IntArray };

struct Object;
struct Value {
    char type;  // 'I', 'J' or 'L' (any reference, null included)
    jlong n;
    const Object* ref;
};

struct Object {
    Kind kind;
    std::string cls;                        // of a class or an instance
    std::u16string chars = {};              // of a string
    std::string data = {};                  // an array's elements
    const void* from = nullptr;             // where they were copied from
    std::map<std::string, Value> set = {};  // the fields the library set
    bool deleted = false;                   // its local reference was deleted
};

// An out-record of the fake module: where the library holds it, and what Java must see of it.
struct Written {
    std::string record;
    const void* at;
    std::shared_ptr<const void> seen;
};

// What one call made and saw.
struct Call {
    FuzzedDataProvider* input;  // what Java field reads and the fake module draw from
    std::vector<std::unique_ptr<Object>> objects;
    std::set<const Object*> live;
    std::string thrown;  // the pending exception, as "class: message"
    std::vector<Written> written;
    int ops;          // of the module
    jlong want;       // the result the call owes
    bool nullString;  // a string field was read, as null
};
inline Call now;

struct Native {
    std::string cls, name, signature;
    void* fn;  // none for a field
};
inline JNIEnv gJni;
inline JNINativeInterface gTable;
inline std::deque<Native> gFields;  // for the process: their addresses are the field IDs
inline std::vector<Native> gNatives;
inline jint gContext;

// While an exception is pending, JNI permits only the exception functions and DeleteLocalRef.
inline void enter(JNIEnv* e) {
    FUZZ_CHECK(e == &gJni && now.thrown.empty());
}

inline Object* make(JNIEnv* e, Kind kind, const char* cls = "") {
    enter(e);
    Object* o = now.objects.emplace_back(new Object{kind, cls}).get();
    now.live.insert(o);
    return o;
}

// The object behind a live local reference (of `kind`): anything else is misuse.
inline Object* live(const void* ref, std::optional<Kind> kind = std::nullopt) {
    auto* o = static_cast<Object*>(const_cast<void*>(ref));
    FUZZ_CHECK(now.live.count(o) != 0 && !o->deleted && (!kind || o->kind == *kind));
    return o;
}

// The name of a field of `instance` whose signature `sig` fits ("L": any reference).
inline const std::string& field(JNIEnv* e, jobject instance, jfieldID id, const std::string& sig) {
    enter(e);
    const auto* f = reinterpret_cast<const Native*>(id);
    FUZZ_CHECK(f != nullptr && f->cls == live(instance, Kind::Instance)->cls);
    FUZZ_CHECK(f->signature == sig || (sig == "L" && strchr("L[", f->signature[0]) != nullptr));
    return f->name;
}

// A read of a Java field: a DVB object's context, else a number drawn from the input, or a
// null string (the JVM tests vary the strings the library reads).
inline jlong read(JNIEnv* e, jobject instance, jfieldID id, char sig) {
    const std::string s = sig == 'L' ? "Ljava/lang/String;" : std::string(1, sig);
    if (field(e, instance, id, s) == "mNativeContext") return gContext;
    if (sig == 'L') return now.nullString = true, 0;
    return sig == 'I' ? now.input->ConsumeIntegral<jint>() : now.input->ConsumeIntegral<jlong>();
}

inline void set(JNIEnv* e, jobject instance, jfieldID id, Value v) {
    const Kind k = v.ref != nullptr ? v.ref->kind : Kind::Class;
    const char* sig = k == Kind::String ? "Ljava/lang/String;" : k == Kind::ByteArray ? "[B" : "[I";
    if (v.ref == nullptr) sig = v.type == 'I' ? "I" : v.type == 'J' ? "J" : "L";
    FUZZ_CHECK(k != Kind::Instance);
    live(instance)->set[field(e, instance, id, sig)] = v;
}

// Every array the library makes is bounded by a record field: anything near this size means a
// size went wrong before the call.
inline Object* newArray(JNIEnv* e, Kind kind, jsize n) {
    FUZZ_CHECK(n >= 0 && n <= (1 << 24));
    Object* a = make(e, kind);
    a->data.resize(kind == Kind::ByteArray ? n : 4 * size_t(n));
    return a;
}

// A region outside the array is misuse here: the library never relies on the VM's
// ArrayIndexOutOfBoundsException on these paths.
template <typename A, typename T>
void setRegion(JNIEnv* e, A array, jsize start, jsize n, const T* from) {
    enter(e);
    Object* a = live(array, sizeof(T) == 1 ? Kind::ByteArray : Kind::IntArray);
    FUZZ_CHECK(start >= 0 && n >= 0 && (jlong{start} + n) * sizeof(T) <= a->data.size());
    if (n != 0) memcpy(&a->data[start * sizeof(T)], from, n * sizeof(T));
    a->from = from;
}

inline jstring newString(JNIEnv* e, const std::u16string& chars) {
    Object* s = make(e, Kind::String);
    s->chars = chars;
    return reinterpret_cast<jstring>(s);
}

// AddressSanitizer bounds the walk to the zero byte.
inline jstring newStringUtf(JNIEnv* e, const char* utf) {
    const Text text = expectedText(reinterpret_cast<const uint8_t*>(utf), strlen(utf));
    FUZZ_CHECK(text.length == strlen(utf) && text.wellFormed);
    return newString(e, text.chars);
}

inline jint throwNew(JNIEnv* e, jclass cls, const char* message) {
    enter(e);  // never over a pending exception
    now.thrown = live(cls, Kind::Class)->cls + ": " + (message != nullptr ? message : "");
    return JNI_OK;
}

inline jfieldID fieldId(JNIEnv* e, jclass cls, const char* name, const char* sig) {
    enter(e);
    Native f{live(cls, Kind::Class)->cls, name, sig, nullptr};
    auto it = std::find_if(gFields.begin(), gFields.end(), [&](const Native& g) {
        return g.cls == f.cls && g.name == name && g.signature == sig;
    });
    return reinterpret_cast<jfieldID>(&*(it != gFields.end() ? it : gFields.insert(it, f)));
}

inline jint registerNatives(JNIEnv* e, jclass cls, const JNINativeMethod* m, jint n) {
    enter(e);
    for (const JNINativeMethod* end = m + n; m != end; ++m) {
        gNatives.push_back({live(cls)->cls, m->name, m->signature, m->fnPtr});
    }
    return JNI_OK;
}

inline JNIEnv* jni() {
    if (gJni.functions != nullptr) return &gJni;
    __android_log_set_logger([](const struct __android_logger_data*, const char*) {});
    JNINativeInterface& t = gTable;
    t.FindClass = [](JNIEnv* e, const char* name) { return jclass(make(e, Kind::Class, name)); };
    t.ThrowNew = throwNew;
    t.ExceptionCheck = [](JNIEnv*) -> jboolean { return !now.thrown.empty(); };
    t.DeleteLocalRef = [](JNIEnv*, jobject ref) {
        if (ref != nullptr) live(ref)->deleted = true;
    };
    t.GetFieldID = fieldId;
    t.GetIntField = [](JNIEnv* e, jobject o, jfieldID id) { return jint(read(e, o, id, 'I')); };
    t.GetLongField = [](JNIEnv* e, jobject o, jfieldID id) { return read(e, o, id, 'J'); };
    t.GetObjectField = [](JNIEnv* e, jobject o, jfieldID id) {
        return jobject(read(e, o, id, 'L'));
    };
    t.SetIntField = [](JNIEnv* e, jobject o, jfieldID id, jint v) { set(e, o, id, {'I', v, {}}); };
    t.SetLongField = [](JNIEnv* e, jobject o, jfieldID id, jlong v) {
        set(e, o, id, {'J', v, {}});
    };
    t.SetObjectField = [](JNIEnv* e, jobject o, jfieldID id, jobject v) {
        set(e, o, id, {'L', 0, v ? live(v) : nullptr});
    };
    t.NewString = [](JNIEnv* e, const jchar* c, jsize n) {
        return newString(e, {(const char16_t*)c, size_t(n)});
    };
    t.NewStringUTF = newStringUtf;
    t.NewByteArray = [](JNIEnv* e, jsize n) { return jbyteArray(newArray(e, Kind::ByteArray, n)); };
    t.NewIntArray = [](JNIEnv* e, jsize n) { return jintArray(newArray(e, Kind::IntArray, n)); };
    t.SetByteArrayRegion = setRegion<jbyteArray, jbyte>;
    t.SetIntArrayRegion = setRegion<jintArray, jint>;
    t.RegisterNatives = registerNatives;
    gJni.functions = &gTable;
    return &gJni;
}

// Forgets the last call; Java field reads and the fake module then draw from `input`.
inline void reset(FuzzedDataProvider* input) {
    now = Call{};
    now.input = input;
}

inline jobject newObject(const char* cls) {
    return reinterpret_cast<jobject>(make(&gJni, Kind::Instance, cls));
}

// ---- the fake module ----------------------------------------------------------------------

inline int32_t op() {
    return ++now.ops, 0;
}

// Fills an out-record from the input, its first byte repeated to the end (long unended text
// costs one byte), and records it; the copy returned takes the library's documented changes.
template <typename T>
T& fill(T* rec) {
    FuzzedDataProvider& in = *now.input;
    auto bytes = in.ConsumeBytes<uint8_t>(
            in.ConsumeIntegralInRange<size_t>(0, std::min<size_t>(sizeof *rec, 400)));
    bytes.resize(sizeof *rec, bytes.empty() ? 0 : bytes[0]);
    memcpy(static_cast<void*>(rec), bytes.data(), sizeof *rec);
    auto copy = std::make_shared<T>(*rec);
    now.written.push_back({gRecordNames[typeid(T).name()], rec, copy});
    return op(), *copy;
}

// Copies of the exported caches that the fake module keeps by the documented rules; each
// cache must equal its copy after every call. Every input starts with all of them zero.
struct Shadow {
    void* cache;
    std::shared_ptr<void> copy;
    size_t size;
};
inline std::vector<Shadow> shadows;

template <typename T, size_t N>
T* shadow(T (&cache)[N]) {
    auto s =
            std::find_if(shadows.begin(), shadows.end(), [&](auto& s) { return s.cache == cache; });
    if (s == shadows.end()) {
        s = shadows.insert(s, {cache, std::shared_ptr<T[]>(new T[N]()), sizeof cache});
    }
    return static_cast<T*>(s->copy.get());
}

inline void zeroCaches() {
    for (const Shadow& s : shadows) memset(s.cache, 0, s.size), memset(s.copy.get(), 0, s.size);
}

// ---- the oracle ---------------------------------------------------------------------------

// What a module class's Java objects take from records: how many fields each class sets; the
// record it reads where that has another name; Java fields named other than their members
// ("Class.field"); strings that are null when empty; byte arrays of a whole field rather than
// of its text.
struct Mapping {
    std::map<std::string, size_t> counts;
    std::map<std::string, std::string> records = {}, renamed = {};
    std::set<std::string> nullable = {}, whole = {};
};

// The member of `record` behind Java field `name`: the member of that name, one of a nested
// record, or for "name<k>" element k of the array member `name`.
inline std::optional<Member> memberOf(const std::string& record, const std::string& name) {
    auto& members = gRecords[record];
    const size_t digits = name.find_last_not_of("0123456789") + 1;
    if (members.count(name) != 0) return members[name];
    for (auto& [_, m] : members) {
        const std::string& nested = gRecordNames[m.type];
        if (!nested.empty() && m.width == m.unit && gRecords[nested].count(name) != 0) {
            Member inner = gRecords[nested][name];
            return inner.offset += m.offset, inner;
        }
    }
    if (digits == name.size() || members.count(name.substr(0, digits)) == 0) return std::nullopt;
    Member element = members[name.substr(0, digits)];
    element.offset += std::stoi(name.substr(digits)) * element.unit;
    return element.width = element.unit, element;
}

// Every field set in `out` (but `skip`) as the record at `rec` holds it, by `map`; each array
// copied from `at`, where the library held the record.
inline void expectFields(jobject out, const std::string& cls, const void* rec, const void* at,
                         const Mapping& map, const std::set<std::string>& skip = {}) {
    const std::string record = map.records.count(cls) != 0 ? map.records.at(cls) : cls;
    for (const auto& [name, v] : live(out, Kind::Instance)->set) {
        const std::string key = cls + "." + name;
        const auto m = memberOf(record, map.renamed.count(key) != 0 ? map.renamed.at(key) : name);
        FUZZ_CHECK(m.has_value() || skip.count(name) != 0);
        if (skip.count(name) != 0) continue;
        const auto* p = static_cast<const uint8_t*>(rec) + m->offset;
        uint64_t raw = 0;
        memcpy(&raw, p, std::min<size_t>(m->width, 8));  // little-endian records, as this host is
        const unsigned shift = 64 - 8 * std::min<unsigned>(m->width, 8);
        const int64_t n = m->isSigned ? static_cast<int64_t>(raw << shift) >> shift : raw;
        const Object* a = v.ref;
        const size_t length =
                map.whole.count(key) != 0 ? m->width : strnlen((const char*)p, m->width);
        if (v.type != 'L') {
            FUZZ_CHECK(m->width <= (v.type == 'I' ? 4u : 8u) &&
                       v.n == (v.type == 'I' ? jint(n) : n));
        } else if (map.nullable.count(key) != 0 && p[0] == 0) {
            FUZZ_CHECK(a == nullptr);
        } else if (a == nullptr || a->kind == Kind::String) {
            FUZZ_CHECK(a != nullptr && a->chars == expectedText(p, m->width).chars);
        } else if (a->kind == Kind::IntArray) {
            FUZZ_CHECK(m->unit == 4 && a->data.size() == m->width);
            for (size_t i = 0; i < a->data.size(); i += 4) {  // entries of y, cr, cb, t
                jint argb;
                FUZZ_CHECK((memcpy(&argb, &a->data[i], 4),
                            argb == dvbjni::yccToArgb(p[i], p[i + 1], p[i + 2], p[i + 3])));
            }
        } else {
            FUZZ_CHECK(a->data.size() == length &&
                       a->data.compare(0, length, (const char*)p, length) == 0);
            FUZZ_CHECK(length == 0 || a->from == static_cast<const uint8_t*>(at) + m->offset);
        }
    }
}

// ---- the natives --------------------------------------------------------------------------

// A native that reads the entry of a buffer that its int arguments name, and no other byte of
// the buffer; `check` replaces the mapping's.
struct Reader {
    const char* native;
    std::vector<jint> rooms;  // of each int argument, in order
    std::function<const void*(const jint*)> entry;
    size_t entrySize;
    const void* buffer;
    size_t bufferSize;
    void (*check)(jobject out, const void* entry);
};

template <typename B, typename F>
Reader reader(const B& buffer, const char* native, std::vector<jint> rooms, F entry,
              void (*check)(jobject, const void*) = nullptr) {
    using T = std::remove_pointer_t<decltype(entry(nullptr))>;
    return {native, std::move(rooms), entry, sizeof(T), &buffer, sizeof buffer, check};
}

// A reader of one entry of a cache that the fake module keeps a shadow of.
template <auto& cache>
Reader cacheReader(const char* native) {
    shadow(cache);
    return reader(cache, native, {std::size(cache)}, [](const jint* i) { return &cache[*i]; });
}

// A module class's natives (but `skip`), registered with `reg` against one DVB object with the
// fake module that `install` puts in place, bound as a Java object of the class is bound.
struct Target {
    Mapping map;
    std::vector<Reader> readers;
    bool indexFirst;  // its readers check the index before the object
    std::vector<Native> natives;

    Target(int (*reg)(JNIEnv*), std::function<void(android::DVB&)> install, Mapping map,
           std::vector<Reader> readers, bool indexFirst, const char* skip = "")
        : map(std::move(map)), readers(std::move(readers)), indexFirst(indexFirst) {
        FUZZ_CHECK(reg(jni()) == 0 && now.thrown.empty());
        struct Installer : dvbsvc::Backend {
            std::function<void(android::DVB&)> install;
            void createModules(android::DVB& dvb) override { install(dvb); }
        } installer;
        installer.install = std::move(install);
        dvbsvc::setBackend(&installer);
        android::sp<android::DVB> dvb = new android::DVB();
        dvbsvc::setBackend(nullptr);
        dvb->incStrong(&gJni);  // held for the process, as a bound Java object holds it
        gContext = dvbjni::contextBind(dvb.get());
        FUZZ_CHECK(gContext != 0);
        std::copy_if(gNatives.begin(), gNatives.end(), std::back_inserter(natives),
                     [&](const Native& n) { return n.name != skip; });
    }
};

// The natives take at most six arguments after `this`, each a jint, jlong, jboolean or a
// reference: on the x86-64 and AArch64 calling conventions each travels in a register of its
// own, of which the callee reads the width it declared. So any native can be called with six
// 64-bit words, and its result read as a jlong and cut to its declared type.
using AnyNative = jlong (*)(JNIEnv*, jobject, jlong, jlong, jlong, jlong, jlong, jlong);
__attribute__((no_sanitize("function"))) inline jlong call(const Native& n, jobject thiz,
                                                           const jlong* a) {
    const jlong r =
            reinterpret_cast<AnyNative>(n.fn)(&gJni, thiz, a[0], a[1], a[2], a[3], a[4], a[5]);
    return n.signature.back() == 'I' ? jint(r) : r;
}

// The refusals owed, any one of them: of a null object (any where several are) before the
// first index outside its room, or after it where `indexFirst`.
inline std::vector<std::string> owed(const std::vector<std::pair<jobject, std::string>>& objects,
                                     const std::vector<jint>& ints, const Reader* r,
                                     bool indexFirst) {
    std::vector<std::string> nulls, index;
    for (const auto& [o, cls] : objects) {
        if (o == nullptr) nulls.push_back("java/lang/NullPointerException: " + cls + " is null");
    }
    for (size_t k = 0; r != nullptr && k < r->rooms.size() && index.empty(); ++k) {
        if (ints[k] < 0 || ints[k] >= r->rooms[k]) {
            index.push_back("java/lang/IndexOutOfBoundsException: Index " +
                            std::to_string(ints[k]) + " out of bounds for length " +
                            std::to_string(r->rooms[k]));
        }
    }
    return (indexFirst && !index.empty()) || nulls.empty() ? index : nulls;
}

// One call of the native `name`, or of one the input picks, with arguments from the input:
// ints near a buffer's room (1 to 200 entries) or any, longs any, objects new or, one time in
// eight, null. Then every cache against its shadow, and the refusal the library owes, or the
// result and every value set in the argument objects against the record it came from.
inline void callOne(FuzzedDataProvider& fdp, const Target& t, const char* name = nullptr) {
    reset(&fdp);
    const Native* n = nullptr;
    for (const Native& m : t.natives) n = name != nullptr && m.name == name ? &m : n;
    if (n == nullptr) n = &t.natives[fdp.ConsumeIntegralInRange<size_t>(0, t.natives.size() - 1)];
    const Reader* r = nullptr;
    for (const Reader& x : t.readers) r = n->name == x.native ? &x : r;
    jlong args[6] = {};
    std::vector<jint> ints;
    std::vector<std::pair<jobject, std::string>> objects;  // with the simple name of the class
    for (size_t i = 1, k = 0; n->signature[i] != ')'; ++i, ++k) {
        const int mode = fdp.ConsumeIntegralInRange(0, 3);
        if (n->signature[i] == 'I') {
            ints.push_back(mode == 0 ? fdp.ConsumeIntegral<jint>()
                                     : fdp.ConsumeIntegralInRange(-1, mode == 1 ? 201 : 17));
            args[k] = ints.back();
        } else if (n->signature[i] == 'L') {
            const size_t end = n->signature.find(';', i);
            const std::string cls = n->signature.substr(i + 1, end - i - 1);
            jobject o = mode == 0 && fdp.ConsumeBool() ? nullptr : newObject(cls.c_str());
            objects.push_back({o, cls.substr(cls.find_last_of("/$") + 1)});
            args[k] = reinterpret_cast<jlong>(o);
            i = end;
        } else {
            args[k] = n->signature[i] == 'Z' ? mode == 0 : fdp.ConsumeIntegral<jlong>();
        }
    }
    const std::vector<std::string> refusals = owed(objects, ints, r, t.indexFirst);

    // A reader may touch no byte of its buffer but the entry: AddressSanitizer poisons the rest
    // (exactly after the entry; up to 7 bytes before it may stay readable).
    const void* entry = r != nullptr && refusals.empty() ? r->entry(ints.data()) : nullptr;
    const auto* b = static_cast<const char*>(r != nullptr ? r->buffer : nullptr);
    const auto* e = static_cast<const char*>(entry);
    if (entry != nullptr) {
        ASAN_POISON_MEMORY_REGION(b, e - b);
        ASAN_POISON_MEMORY_REGION(e + r->entrySize, b + r->bufferSize - e - r->entrySize);
    } else if (r != nullptr) {
        ASAN_POISON_MEMORY_REGION(b, r->bufferSize);
    }
    const jlong result = call(*n, newObject(n->cls.c_str()), args);
    if (r != nullptr) ASAN_UNPOISON_MEMORY_REGION(b, r->bufferSize);
    for (const Shadow& s : shadows) FUZZ_CHECK(memcmp(s.cache, s.copy.get(), s.size) == 0);

    if (!refusals.empty() || !now.thrown.empty()) {
        FUZZ_CHECK(result == -1);
        for (const auto& [o, cls] : objects) FUZZ_CHECK(o == nullptr || live(o)->set.empty());
        // Else a string read as null may be refused where a value is needed.
        const bool npe = now.thrown.rfind("java/lang/NullPointerException:", 0) == 0;
        FUZZ_CHECK(refusals.empty() ||
                   (now.ops == 0 && std::count(refusals.begin(), refusals.end(), now.thrown)));
        FUZZ_CHECK(!refusals.empty() || (now.nullString && npe));
        return;
    }
    FUZZ_CHECK(result == now.want);
    std::map<std::string, size_t> seen;  // objects of each class so far
    for (const auto& [o, cls] : objects) {
        // A reader's entry; else the k-th record of the class's type that the module wrote;
        // else nothing, as the library only reads the object.
        const std::string record = t.map.records.count(cls) != 0 ? t.map.records.at(cls) : cls;
        const Written* w = nullptr;
        size_t k = seen[cls]++;
        for (const Written& x : now.written) w = !w && x.record == record && k-- == 0 ? &x : w;
        if (r != nullptr && r->check != nullptr) {
            r->check(o, entry);
        } else if (r != nullptr || w != nullptr) {
            FUZZ_CHECK(live(o)->set.size() == t.map.counts.at(cls));
            expectFields(o, cls, w != nullptr ? w->seen.get() : entry, w != nullptr ? w->at : entry,
                         t.map);
        } else {
            FUZZ_CHECK(live(o)->set.empty());
        }
    }
}

}  // namespace fuzz
