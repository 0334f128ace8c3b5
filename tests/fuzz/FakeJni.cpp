#include "FakeJni.h"

#include <android/log.h>

#include <cstring>

#include "Context.h"
#include "Service.h"

namespace fakejni {

namespace {

// Decodes a zero-free modified UTF-8 string, rejecting it as a checking VM does: four-byte
// forms, overlong forms (but C0 80, the encoding of U+0000), stray continuation bytes and
// cut-off sequences. Surrogates encoded one by one are allowed.
bool decodeStrict(const uint8_t* s, size_t n, std::u16string* out) {
    for (size_t i = 0; i < n;) {
        uint8_t c = s[i];
        auto tail = [&](size_t k) { return i + k < n && (s[i + k] & 0xC0) == 0x80; };
        if (c < 0x80) {
            out->push_back(c);
            i += 1;
        } else if ((c >> 5) == 0x6 && tail(1)) {
            char16_t v = static_cast<char16_t>(((c & 0x1F) << 6) | (s[i + 1] & 0x3F));
            if (v < 0x80 && !(c == 0xC0 && s[i + 1] == 0x80)) return false;
            out->push_back(v);
            i += 2;
        } else if ((c >> 4) == 0xE && tail(1) && tail(2)) {
            char16_t v = static_cast<char16_t>(((c & 0x0F) << 12) | ((s[i + 1] & 0x3F) << 6) |
                                               (s[i + 2] & 0x3F));
            if (v < 0x800) return false;
            out->push_back(v);
            i += 3;
        } else {
            return false;
        }
    }
    return true;
}

bool signatureFits(const std::string& signature, const Object* value) {
    if (value == nullptr) return signature[0] == 'L' || signature[0] == '[';
    switch (value->kind) {
        case Kind::String:
            return signature == "Ljava/lang/String;";
        case Kind::ByteArray:
            return signature == "[B";
        case Kind::IntArray:
            return signature == "[I";
        default:
            return false;
    }
}

// ---- the table ---------------------------------------------------------------------------

jclass FindClass(JNIEnv* e, const char* name) {
    Env& env = Env::of(e);
    env.requireNoPending();
    FUZZ_CHECK(name != nullptr);
    Object* cls = env.make(Kind::Class);
    cls->className = name;
    return reinterpret_cast<jclass>(cls);
}

jint ThrowNew(JNIEnv* e, jclass cls, const char* message) {
    Env& env = Env::of(e);
    env.throwNew(env.live(cls, Kind::Class), message);
    return JNI_OK;
}

jthrowable ExceptionOccurred(JNIEnv* e) {
    Env& env = Env::of(e);
    if (!env.pending()) return nullptr;
    Object* t = env.make(Kind::Instance);
    t->className = env.exceptionClass();
    return reinterpret_cast<jthrowable>(t);
}

void ExceptionClear(JNIEnv* e) {
    Env::of(e).clearException();
}

jboolean ExceptionCheck(JNIEnv* e) {
    return Env::of(e).pending() ? JNI_TRUE : JNI_FALSE;
}

void DeleteLocalRef(JNIEnv* e, jobject ref) {
    if (ref == nullptr) return;
    Env& env = Env::of(e);
    const Object* o = env.object(ref);
    FUZZ_CHECK(o != nullptr && !o->deleted);
    const_cast<Object*>(o)->deleted = true;
}

jfieldID GetFieldID(JNIEnv* e, jclass cls, const char* name, const char* signature) {
    Env& env = Env::of(e);
    env.requireNoPending();
    FUZZ_CHECK(name != nullptr && signature != nullptr);
    const Field* f = env.fieldId(env.live(cls, Kind::Class)->className, name, signature);
    return reinterpret_cast<jfieldID>(const_cast<Field*>(f));
}

// A DVB object's context, or the last int the harness set in an argument object (0 if none).
jint GetIntField(JNIEnv* e, jobject instance, jfieldID id) {
    Env& env = Env::of(e);
    env.requireNoPending();
    const auto* f = reinterpret_cast<const Field*>(id);
    FUZZ_CHECK(f != nullptr && f->signature == "I");
    FUZZ_CHECK(env.live(instance, Kind::Instance)->className == f->className);
    if (f->name == "mNativeContext") return env.context();
    const Value* v = env.value(instance, f->name.c_str());
    FUZZ_CHECK(v == nullptr || v->type == 'I');
    return v == nullptr ? 0 : v->i;
}

void SetIntField(JNIEnv* e, jobject instance, jfieldID id, jint value) {
    Env::of(e).set(instance, id, Value{'I', value, 0, nullptr});
}

void SetLongField(JNIEnv* e, jobject instance, jfieldID id, jlong value) {
    Env::of(e).set(instance, id, Value{'J', 0, value, nullptr});
}

void SetObjectField(JNIEnv* e, jobject instance, jfieldID id, jobject value) {
    Env& env = Env::of(e);
    const Object* o = nullptr;
    if (value != nullptr) {
        o = env.object(value);
        FUZZ_CHECK(o != nullptr && !o->deleted);
    }
    env.set(instance, id, Value{'L', 0, 0, o});
}

jstring NewString(JNIEnv* e, const jchar* chars, jsize length) {
    Env& env = Env::of(e);
    env.requireNoPending();
    FUZZ_CHECK(length >= 0 && (length == 0 || chars != nullptr));
    Object* s = env.make(Kind::String);
    s->chars.assign(reinterpret_cast<const char16_t*>(chars), static_cast<size_t>(length));
    return reinterpret_cast<jstring>(s);
}

jstring NewStringUTF(JNIEnv* e, const char* utf) {
    Env& env = Env::of(e);
    env.requireNoPending();
    FUZZ_CHECK(utf != nullptr);
    size_t length;
    if (env.inTextWindow(utf)) {
        const void* zero = memchr(utf, 0, static_cast<size_t>(env.textWindowEnd() - utf));
        FUZZ_CHECK(zero != nullptr);
        length = static_cast<size_t>(static_cast<const char*>(zero) - utf);
    } else {
        length = strlen(utf);  // a copy of the library's own: AddressSanitizer bounds it
    }
    Object* s = env.make(Kind::String);
    FUZZ_CHECK(decodeStrict(reinterpret_cast<const uint8_t*>(utf), length, &s->chars));
    return reinterpret_cast<jstring>(s);
}

// Every array the library makes is bounded by a record field; anything near this size means
// a size went wrong before the call.
constexpr jsize kMaxArray = 1 << 24;

jbyteArray NewByteArray(JNIEnv* e, jsize length) {
    Env& env = Env::of(e);
    env.requireNoPending();
    FUZZ_CHECK(length >= 0 && length <= kMaxArray);
    Object* a = env.make(Kind::ByteArray);
    a->bytes.resize(static_cast<size_t>(length));
    return reinterpret_cast<jbyteArray>(a);
}

jintArray NewIntArray(JNIEnv* e, jsize length) {
    Env& env = Env::of(e);
    env.requireNoPending();
    FUZZ_CHECK(length >= 0 && length <= kMaxArray);
    Object* a = env.make(Kind::IntArray);
    a->ints.resize(static_cast<size_t>(length));
    return reinterpret_cast<jintArray>(a);
}

// A region outside the array is misuse here: the library never relies on the VM's
// ArrayIndexOutOfBoundsException on these paths.
template <typename T>
void setRegion(Env& env, std::vector<T>& array, jsize start, jsize length, const T* source) {
    env.requireNoPending();
    auto size = static_cast<jlong>(array.size());
    FUZZ_CHECK(start >= 0 && length >= 0 && start + jlong{length} <= size);
    FUZZ_CHECK(length == 0 || source != nullptr);
    env.addCopy(source, static_cast<size_t>(length) * sizeof(T));
    if (length != 0) memcpy(&array[static_cast<size_t>(start)], source, length * sizeof(T));
}

void SetByteArrayRegion(JNIEnv* e, jbyteArray array, jsize start, jsize length,
                        const jbyte* source) {
    Env& env = Env::of(e);
    setRegion(env, env.live(array, Kind::ByteArray)->bytes, start, length, source);
}

void SetIntArrayRegion(JNIEnv* e, jintArray array, jsize start, jsize length, const jint* source) {
    Env& env = Env::of(e);
    setRegion(env, env.live(array, Kind::IntArray)->ints, start, length, source);
}

jint RegisterNatives(JNIEnv* e, jclass cls, const JNINativeMethod* methods, jint count) {
    Env& env = Env::of(e);
    env.requireNoPending();
    FUZZ_CHECK(count >= 0 && (count == 0 || methods != nullptr));
    env.registerNatives(env.live(cls, Kind::Class)->className, methods, count);
    return JNI_OK;
}

void quietLogger(const struct __android_logger_data*, const char*) {}

}  // namespace

Env::Env() {
    memset(&mTable, 0, sizeof mTable);
    mTable.FindClass = FindClass;
    mTable.ThrowNew = ThrowNew;
    mTable.ExceptionOccurred = ExceptionOccurred;
    mTable.ExceptionClear = ExceptionClear;
    mTable.ExceptionCheck = ExceptionCheck;
    mTable.DeleteLocalRef = DeleteLocalRef;
    mTable.GetFieldID = GetFieldID;
    mTable.GetIntField = GetIntField;
    mTable.SetIntField = SetIntField;
    mTable.SetLongField = SetLongField;
    mTable.SetObjectField = SetObjectField;
    mTable.NewString = NewString;
    mTable.NewStringUTF = NewStringUTF;
    mTable.NewByteArray = NewByteArray;
    mTable.NewIntArray = NewIntArray;
    mTable.SetByteArrayRegion = SetByteArrayRegion;
    mTable.SetIntArrayRegion = SetIntArrayRegion;
    mTable.RegisterNatives = RegisterNatives;
    mJni.functions = &mTable;
}

Env& Env::of(JNIEnv* e) {
    Env& one = env();
    FUZZ_CHECK(e == one.get());
    return one;
}

void Env::reset() {
    mObjects.clear();
    mLive.clear();
    mValues.clear();
    mSetCounts.clear();
    mCopies.clear();
    mPending = false;
    mExceptionClass.clear();
    mExceptionMessage.clear();
    mWindowBegin = mWindowEnd = nullptr;
}

Object* Env::make(Kind kind) {
    mObjects.push_back(std::make_unique<Object>());
    Object* o = mObjects.back().get();
    o->kind = kind;
    mLive.insert(o);
    return o;
}

jobject Env::newInstance(const char* className) {
    Object* o = make(Kind::Instance);
    o->className = className;
    return reinterpret_cast<jobject>(o);
}

void Env::setTextWindow(const void* begin, size_t size) {
    mWindowBegin = static_cast<const char*>(begin);
    mWindowEnd = mWindowBegin + size;
}

bool Env::inTextWindow(const char* p) const {
    return mWindowBegin != nullptr && p >= mWindowBegin && p < mWindowEnd;
}

const Object* Env::object(jobject ref) const {
    const auto* o = reinterpret_cast<const Object*>(ref);
    return mLive.count(o) != 0 ? o : nullptr;
}

Object* Env::live(jobject ref, Kind kind) const {
    const Object* o = object(ref);
    FUZZ_CHECK(o != nullptr && !o->deleted && o->kind == kind);
    return const_cast<Object*>(o);
}

const Field* Env::fieldId(const std::string& className, const char* name, const char* signature) {
    for (const Field& f : mFields) {
        if (f.className == className && f.name == name && f.signature == signature) return &f;
    }
    mFields.push_back({className, name, signature});
    return &mFields.back();
}

void Env::set(jobject instance, jfieldID id, Value v) {
    requireNoPending();
    const Object* o = live(instance, Kind::Instance);
    const auto* f = reinterpret_cast<const Field*>(id);
    FUZZ_CHECK(f != nullptr && f->className == o->className);
    if (v.type == 'L') {
        FUZZ_CHECK(signatureFits(f->signature, v.object));
    } else {
        FUZZ_CHECK(f->signature.size() == 1 && f->signature[0] == v.type);
    }
    mValues[{o, f}] = v;
    ++mSetCounts[o];
}

const Value* Env::value(jobject instance, const char* fieldName) const {
    const Object* o = object(instance);
    for (const auto& [key, v] : mValues) {
        if (key.first == o && key.second->name == fieldName) return &v;
    }
    return nullptr;
}

size_t Env::setCount(jobject instance) const {
    auto it = mSetCounts.find(object(instance));
    return it == mSetCounts.end() ? 0 : it->second;
}

// JNI allows only the exception functions and reference deletion while an exception is
// pending; the library promises no further call after a failure.
void Env::requireNoPending() const {
    FUZZ_CHECK(!mPending);
}

void Env::throwNew(const Object* cls, const char* message) {
    FUZZ_CHECK(!mPending);  // the library never throws over a pending exception
    mPending = true;
    mExceptionClass = cls->className;
    mExceptionMessage = message != nullptr ? message : "";
}

void Env::registerNatives(const std::string& className, const JNINativeMethod* methods, jint n) {
    for (jint i = 0; i < n; ++i) {
        mNatives.push_back({className, methods[i].name, methods[i].signature, methods[i].fnPtr});
    }
}

void* Env::native(const char* className, const char* name, const char* signature) const {
    for (const Native& n : mNatives) {
        if (n.className == className && n.name == name) {
            FUZZ_CHECK(n.signature == signature);
            return n.fn;
        }
    }
    FUZZ_CHECK(!"native not registered");
    return nullptr;
}

Env& env() {
    static Env* one = [] {
        __android_log_set_logger(quietLogger);
        return new Env();
    }();
    return *one;
}

namespace {

class Installer : public dvbsvc::Backend {
public:
    explicit Installer(void (*install)(android::DVB&)) : mInstall(install) {}
    void createModules(android::DVB& dvb) override { mInstall(dvb); }

private:
    void (*mInstall)(android::DVB&);
};

}  // namespace

jint bindDvb(void (*install)(android::DVB& dvb)) {
    Installer installer(install);
    dvbsvc::setBackend(&installer);
    android::sp<android::DVB> dvb = new android::DVB();
    dvbsvc::setBackend(nullptr);
    dvb->incStrong(&env());  // held for the process, as a bound Java object holds it
    jint context = dvbjni::contextBind(dvb.get());
    FUZZ_CHECK(context != 0);
    return context;
}

std::string indexMessage(int64_t index, int64_t length) {
    return "Index " + std::to_string(index) + " out of bounds for length " + std::to_string(length);
}

}  // namespace fakejni
