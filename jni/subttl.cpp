// The Java class android.DVB.Subttl: DVB subtitle decoding on the subtitle module, and the
// display data it leaves in the exported buffer Data, read one record at a time.
#include <DVB.h>
#include <android_runtime/AndroidRuntime.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/jni_macros.h>
#include <nativehelper/scoped_local_ref.h>

#include <cstring>
#include <type_traits>

#include "Fields.h"
#include "Module.h"
#include "Registration.h"
#include "Text.h"
#include "Ycc.h"

using android::DVB;
using android::sp;
using android::Subttl;
using dvbjni::requireModule;

// The display set of the last Subttl_GetData, written by the module in place. Readers of
// the library and of the service share it by this name; it is not guarded: Java serialises
// a Subttl_GetData and the reads that follow it.
DVB_EXPORT SUBTTL_Data Data;

namespace {

jfieldID gContext;          // Subttl.mNativeContext
dvbjni::StaticMutex sLock;  // created and destroyed with the library; never locked

// The subtitle module of the DVB object that thiz is bound to, or null.
sp<Subttl> getSubttl(JNIEnv* env, jobject thiz) {
    jint context;
    return dvbjni::moduleOf(dvbjni::boundDvb(env, thiz, gContext, &context), &DVB::mSubttl);
}

constexpr const char* kSettingsClass = "android/DVB/Subttl$SUBTTL_Settings";
constexpr const char* kDataClass = "android/DVB/Subttl$SUBTTL_Data_t";
constexpr const char* kPageClass = "android/DVB/Subttl$SUBTTL_Page_t";
constexpr const char* kRegionDefClass = "android/DVB/Subttl$SUBTTL_RegionDef";
constexpr const char* kRegionClass = "android/DVB/Subttl$SUBTTL_Region_t";
constexpr const char* kObjectDefClass = "android/DVB/Subttl$SUBTTL_ObjectDef";
constexpr const char* kDisplayClass = "android/DVB/Subttl$SUBTTL_Display";
constexpr const char* kClutClass = "android/DVB/Subttl$SUBTTL_Clut";

// The PID goes in twice; a language code longer than its field keeps its first four bytes.
const dvbjni::JavaField kSettingsFields[] = {
        JF_INT(SUBTTL_Settings, devId, "devId"),
        JF_INT(SUBTTL_Settings, pid, "pid"),
        JF_INT(SUBTTL_Settings, type, "type"),
        JF_LONG(SUBTTL_Settings, hstrm, "hstrm"),
        JF_TEXT(SUBTTL_Settings, langCode, "langCode", Text),
        JF_INT(SUBTTL_Settings, magazineNumber, "magazineNumber"),
        JF_INT(SUBTTL_Settings, pageNumber, "pageNumber"),
        JF_INT(SUBTTL_Settings, compositionPageId, "compositionPageId"),
        JF_INT(SUBTTL_Settings, ancillaryPageId, "ancillaryPageId"),
        JF_INT(SUBTTL_Settings, pidCopy, "pid"),
};

const dvbjni::JavaField kDataFields[] = {
        JF_INT(SUBTTL_Data, i_pts, "i_pts"),
        JF_INT(SUBTTL_Data, numPage, "numPage"),
        JF_INT(SUBTTL_Data, numRegions, "numRegions"),
        JF_INT(SUBTTL_Data, numCluts, "numCluts"),
};

const dvbjni::JavaField kPageFields[] = {
        JF_INT(SUBTTL_Page_t, i_id, "i_id"),
        JF_INT(SUBTTL_Page_t, i_timeout, "i_timeout"),
        JF_INT(SUBTTL_Page_t, i_state, "i_state"),
        JF_INT(SUBTTL_Page_t, i_version, "i_version"),
        JF_INT(SUBTTL_Page_t, i_region_defs, "i_region_defs"),
};

const dvbjni::JavaField kRegionDefFields[] = {
        JF_INT(SUBTTL_RegionDef, i_id, "i_id"),
        JF_INT(SUBTTL_RegionDef, i_x, "i_x"),
        JF_INT(SUBTTL_RegionDef, i_y, "i_y"),
};

// The nine integers come first and are written by the map; the pixels and the object count
// depend on the region's size and are set by Subttl_GetRegionData itself.
constexpr dvbjni::JavaField kRegionFields[] = {
        JF_INT(SUBTTL_Region_t, i_id, "i_id"),
        JF_INT(SUBTTL_Region_t, i_version, "i_version"),
        JF_INT(SUBTTL_Region_t, i_x, "i_x"),
        JF_INT(SUBTTL_Region_t, i_y, "i_y"),
        JF_INT(SUBTTL_Region_t, i_width, "i_width"),
        JF_INT(SUBTTL_Region_t, i_height, "i_height"),
        JF_INT(SUBTTL_Region_t, i_level_comp, "i_level_comp"),
        JF_INT(SUBTTL_Region_t, i_depth, "i_depth"),
        JF_INT(SUBTTL_Region_t, i_clut, "i_clut"),
        JF_TEXT(SUBTTL_Region_t, p_pixbuf, "p_pixbuf", AllBytes),
        JF_INT(SUBTTL_Region_t, i_object_defs, "i_object_defs"),
};
constexpr size_t kRegionWidth = 4;
constexpr size_t kRegionHeight = 5;
constexpr size_t kRegionInts = 9;
constexpr size_t kRegionPixbuf = 9;
constexpr size_t kRegionObjectDefs = 10;
static_assert(kRegionFields[kRegionWidth].offset == offsetof(SUBTTL_Region_t, i_width) &&
              kRegionFields[kRegionHeight].offset == offsetof(SUBTTL_Region_t, i_height) &&
              kRegionFields[kRegionPixbuf].offset == offsetof(SUBTTL_Region_t, p_pixbuf) &&
              kRegionFields[kRegionObjectDefs].offset == offsetof(SUBTTL_Region_t, i_object_defs));

const dvbjni::JavaField kObjectDefFields[] = {
        JF_INT(SUBTTL_ObjectDef, i_id, "i_id"),
        JF_INT(SUBTTL_ObjectDef, i_type, "i_type"),
        JF_INT(SUBTTL_ObjectDef, i_x, "i_x"),
        JF_INT(SUBTTL_ObjectDef, i_y, "i_y"),
        JF_INT(SUBTTL_ObjectDef, i_fg_pc, "i_fg_pc"),
        JF_INT(SUBTTL_ObjectDef, i_bg_pc, "i_bg_pc"),
        JF_TEXT(SUBTTL_ObjectDef, psz_text, "psz_text", AllBytes),
        JF_INT(SUBTTL_ObjectDef, i_text_length, "i_text_length"),
};

const dvbjni::JavaField kDisplayFields[] = {
        JF_INT(SUBTTL_Display, i_id, "i_id"),
        JF_INT(SUBTTL_Display, i_version, "i_version"),
        JF_INT(SUBTTL_Display, i_width, "i_width"),
        JF_INT(SUBTTL_Display, i_height, "i_height"),
        JF_INT(SUBTTL_Display, b_windowed, "b_windowed"),
        JF_INT(SUBTTL_Display, i_x, "i_x"),
        JF_INT(SUBTTL_Display, i_y, "i_y"),
        JF_INT(SUBTTL_Display, i_max_x, "i_max_x"),
        JF_INT(SUBTTL_Display, i_max_y, "i_max_y"),
};

// A colour table of the CLUT record: looked up with the map, converted by setColourTable.
// The generic writers have no int[] conversion, so only the two ids go through them.
template <typename T>
constexpr dvbjni::JavaField colourField(const char* name, size_t offset) {
    static_assert(std::is_same_v<std::remove_extent_t<T>, SUBTTL_ClutEntry>, "a CLUT table");
    return {name, "[I", static_cast<uint32_t>(offset), sizeof(T), dvbjni::Conv::AllBytes};
}
#define JF_COLOURS(member, javaName) \
    colourField<DVB_FIELD_TYPE(SUBTTL_Clut, member)>(javaName, offsetof(SUBTTL_Clut, member))

constexpr dvbjni::JavaField kClutFields[] = {
        JF_INT(SUBTTL_Clut, i_id, "i_id"),            // u8
        JF_INT(SUBTTL_Clut, i_version, "i_version"),  // u8
        JF_COLOURS(c_2b, "c_2b"),                     // 4 colours
        JF_COLOURS(c_4b, "c_4b"),                     // 16 colours
        JF_COLOURS(c_8b, "c_8b"),                     // 256 colours
};
constexpr size_t kClutIds = 2;
constexpr size_t kClut2b = 2;
constexpr size_t kClut4b = 3;
constexpr size_t kClut8b = 4;
static_assert(kClutFields[kClut2b].offset == offsetof(SUBTTL_Clut, c_2b) &&
              kClutFields[kClut4b].offset == offsetof(SUBTTL_Clut, c_4b) &&
              kClutFields[kClut8b].offset == offsetof(SUBTTL_Clut, c_8b));

// ---- decoder control ---------------------------------------------------------------------

jint Subttl_Init(JNIEnv* env, jobject thiz) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    return subttl == nullptr ? -1 : subttl->Init();
}

// The decoder handle, sign-extended; the module's own failure value passes unchanged.
jlong Subttl_Start(JNIEnv* env, jobject thiz, jobject settings) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    if (subttl == nullptr) return -1;
    SUBTTL_Settings rec{};
    if (!dvbjni::readFields(env, settings, kSettingsClass, kSettingsFields, &rec)) return -1;
    return subttl->Start(&rec);
}

jint Subttl_Stop(JNIEnv* env, jobject thiz, jlong handle) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    if (subttl == nullptr) return -1;
    subttl->Stop(dvbjni::lowHandle(handle));
    return 0;
}

// Clears the whole buffer, so that whatever the module leaves unwritten reads as zero.
jint Subttl_GetData(JNIEnv* env, jobject thiz, jlong handle, jobject data) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    if (subttl == nullptr || !dvbjni::requireObject(env, data, kDataClass)) return -1;
    memset(&Data, 0, sizeof Data);
    subttl->GetData(dvbjni::lowHandle(handle), &Data);
    return dvbjni::writeFields(env, data, kDataClass, kDataFields, &Data) ? 0 : -1;
}

// ---- readers of the display set: no module call, indexes bounded by the buffer's room ----
//
// An index within the room but at or above the delivered count reads the record as it is:
// zeros unless the module wrote it.

jint Subttl_GetPageData(JNIEnv* env, jobject thiz, jint page, jobject out) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    if (subttl == nullptr || !dvbjni::requireObject(env, out, kPageClass) ||
        !dvbjni::checkIndex(env, page, kSubttlPages)) {
        return -1;
    }
    return dvbjni::writeFields(env, out, kPageClass, kPageFields, &Data.page[page]) ? 0 : -1;
}

jint Subttl_GetRegionDefData(JNIEnv* env, jobject thiz, jint page, jint def, jobject out) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    if (subttl == nullptr || !dvbjni::requireObject(env, out, kRegionDefClass) ||
        !dvbjni::checkIndex(env, page, kSubttlPages) ||
        !dvbjni::checkIndex(env, def, kSubttlRegionDefs)) {
        return -1;
    }
    const SUBTTL_RegionDef& rec = Data.page[page].region_defs[def];
    return dvbjni::writeFields(env, out, kRegionDefClass, kRegionDefFields, &rec) ? 0 : -1;
}

// The pixels reach Java in one copy of width x height bytes. A negative size (the 32-bit
// product, as the device computes it) zeroes the Java size and leaves the pixels and the
// object count as they were. A size above the pixel buffer, as the 32-bit product or as the
// real one, delivers the rows that fit and tells Java that height; a negative width with a
// positive product fits no row.
jint Subttl_GetRegionData(JNIEnv* env, jobject thiz, jint region, jobject out) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    if (subttl == nullptr || !dvbjni::requireObject(env, out, kRegionClass) ||
        !dvbjni::checkIndex(env, region, kSubttlRegions)) {
        return -1;
    }
    const SUBTTL_Region_t& rec = Data.regions[region];
    dvbjni::FieldIds ids;
    if (!ids.lookup(env, kRegionClass, kRegionFields) ||
        !dvbjni::writeRecord(env, out, kRegionFields, ids, kRegionInts, &rec)) {
        return -1;
    }
    int32_t width = rec.i_width;
    int32_t height = rec.i_height;
    int32_t size =
            static_cast<int32_t>(static_cast<uint32_t>(width) * static_cast<uint32_t>(height));
    if (size < 0) {
        env->SetIntField(out, ids[kRegionWidth], 0);
        env->SetIntField(out, ids[kRegionHeight], 0);
        return 0;
    }
    // With opposite signs the real product is negative while the 32-bit one can wrap to any
    // positive value: both are bounded.
    if (size > kSubttlRegionPixels || static_cast<int64_t>(width) * height > kSubttlRegionPixels) {
        height = width > 0 ? kSubttlRegionPixels / width : 0;
        env->SetIntField(out, ids[kRegionHeight], height);
        size = width * height;
    }
    ScopedLocalRef<jbyteArray> pixbuf(
            env, dvbjni::newByteArray(env, rec.p_pixbuf, static_cast<size_t>(size)));
    if (pixbuf.get() == nullptr) return -1;
    env->SetObjectField(out, ids[kRegionPixbuf], pixbuf.get());
    env->SetIntField(out, ids[kRegionObjectDefs], rec.i_object_defs);
    return 0;
}

// psz_text always carries the field's 32 bytes, whatever i_text_length says.
jint Subttl_GetRegionObjectDefData(JNIEnv* env, jobject thiz, jint region, jint object,
                                   jobject out) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    if (subttl == nullptr || !dvbjni::requireObject(env, out, kObjectDefClass) ||
        !dvbjni::checkIndex(env, region, kSubttlRegions) ||
        !dvbjni::checkIndex(env, object, kSubttlObjectDefs)) {
        return -1;
    }
    const SUBTTL_ObjectDef& rec = Data.regions[region].object_defs[object];
    return dvbjni::writeFields(env, out, kObjectDefClass, kObjectDefFields, &rec) ? 0 : -1;
}

jint Subttl_GetDisplayData(JNIEnv* env, jobject thiz, jobject out) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    if (subttl == nullptr) return -1;
    return dvbjni::writeFields(env, out, kDisplayClass, kDisplayFields, &Data.display) ? 0 : -1;
}

// ---- colour look-up tables ---------------------------------------------------------------

// Converts one table into a new Java int[] of as many colours and sets `field` to it.
template <size_t N>
bool setColourTable(JNIEnv* env, jobject out, jfieldID field,
                    const SUBTTL_ClutEntry (&entries)[N]) {
    jint colours[N];
    for (size_t i = 0; i < N; ++i) {
        const SUBTTL_ClutEntry& e = entries[i];
        colours[i] = dvbjni::yccToArgb(e.y, e.cr, e.cb, e.t);
    }
    ScopedLocalRef<jintArray> array(env, env->NewIntArray(N));
    if (array.get() == nullptr) return false;
    env->SetIntArrayRegion(array.get(), 0, N, colours);
    env->SetObjectField(out, field, array.get());
    return true;
}

jint writeClut(JNIEnv* env, jobject out, const SUBTTL_Clut& clut) {
    dvbjni::FieldIds ids;
    bool done = ids.lookup(env, kClutClass, kClutFields) &&
                dvbjni::writeRecord(env, out, kClutFields, ids, kClutIds, &clut) &&
                setColourTable(env, out, ids[kClut2b], clut.c_2b) &&
                setColourTable(env, out, ids[kClut4b], clut.c_4b) &&
                setColourTable(env, out, ids[kClut8b], clut.c_8b);
    return done ? 0 : -1;
}

jint Subttl_GetClutData(JNIEnv* env, jobject thiz, jint clut, jobject out) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    if (subttl == nullptr || !dvbjni::requireObject(env, out, kClutClass) ||
        !dvbjni::checkIndex(env, clut, kSubttlCluts)) {
        return -1;
    }
    return writeClut(env, out, Data.cluts[clut]);
}

jint Subttl_GetDefaultClutData(JNIEnv* env, jobject thiz, jobject out) {
    sp<Subttl> subttl = requireModule(env, getSubttl(env, thiz));
    if (subttl == nullptr || !dvbjni::requireObject(env, out, kClutClass)) return -1;
    return writeClut(env, out, Data.defaultClut);
}

const JNINativeMethod gMethods[] = {
        MAKE_JNI_NATIVE_METHOD("Subttl_Init", "()I", Subttl_Init),
        MAKE_JNI_NATIVE_METHOD("Subttl_Start", "(Landroid/DVB/Subttl$SUBTTL_Settings;)J",
                               Subttl_Start),
        MAKE_JNI_NATIVE_METHOD("Subttl_Stop", "(J)I", Subttl_Stop),
        MAKE_JNI_NATIVE_METHOD("Subttl_GetData", "(JLandroid/DVB/Subttl$SUBTTL_Data_t;)I",
                               Subttl_GetData),
        MAKE_JNI_NATIVE_METHOD("Subttl_GetPageData", "(ILandroid/DVB/Subttl$SUBTTL_Page_t;)I",
                               Subttl_GetPageData),
        MAKE_JNI_NATIVE_METHOD("Subttl_GetRegionDefData",
                               "(IILandroid/DVB/Subttl$SUBTTL_RegionDef;)I",
                               Subttl_GetRegionDefData),
        MAKE_JNI_NATIVE_METHOD("Subttl_GetRegionData", "(ILandroid/DVB/Subttl$SUBTTL_Region_t;)I",
                               Subttl_GetRegionData),
        MAKE_JNI_NATIVE_METHOD("Subttl_GetRegionObjectDefData",
                               "(IILandroid/DVB/Subttl$SUBTTL_ObjectDef;)I",
                               Subttl_GetRegionObjectDefData),
        MAKE_JNI_NATIVE_METHOD("Subttl_GetClutData", "(ILandroid/DVB/Subttl$SUBTTL_Clut;)I",
                               Subttl_GetClutData),
        MAKE_JNI_NATIVE_METHOD("Subttl_GetDisplayData", "(Landroid/DVB/Subttl$SUBTTL_Display;)I",
                               Subttl_GetDisplayData),
        MAKE_JNI_NATIVE_METHOD("Subttl_GetDefaultClutData", "(Landroid/DVB/Subttl$SUBTTL_Clut;)I",
                               Subttl_GetDefaultClutData),
};
static_assert(NELEM(gMethods) == 11, "android.DVB.Subttl declares 11 natives");

}  // namespace

int Subttlcallback(void*, int, int) {
    return 0;
}

int register_android_dvb_Subttl(JNIEnv* env) {
    if (!dvbjni::findContextField(env, "android/DVB/Subttl", "Can't find android/DVB/Subttl",
                                  "Can't find Tuner.mNativeContext", &gContext)) {
        return -1;
    }
    return android::AndroidRuntime::registerNativeMethods(env, "android/DVB/Subttl", gMethods,
                                                          NELEM(gMethods));
}
