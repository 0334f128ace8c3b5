// Registration of each module class's native methods, called in this order by JNI_OnLoad.
// Each returns the platform's registration result, or -1 with a RuntimeException pending
// when its class or the class's mNativeContext field is missing.
#pragma once

#include <nativehelper/jni.h>

#define DVB_EXPORT __attribute__((visibility("default")))

DVB_EXPORT int register_android_dvb_Scnm(JNIEnv* env);
DVB_EXPORT int register_android_dvb_Strm(JNIEnv* env);
DVB_EXPORT int register_android_dvb_Cfg(JNIEnv* env);
DVB_EXPORT int register_android_dvb_Subttl(JNIEnv* env);
DVB_EXPORT int register_android_dvb_Teltxt(JNIEnv* env);

// Module callbacks that the library exports for the service's use; nothing in the library calls
// or installs them.
DVB_EXPORT void Scnmnotify(int, int, int);
DVB_EXPORT int Strmcallback(void*, int, int);
DVB_EXPORT int Subttlcallback(void*, int, int);

namespace dvbjni {

// Finds `className` and its int field mNativeContext, storing the field ID in `*contextField`
// (also when the look-up fails). On failure raises RuntimeException with `classMessage` or
// `fieldMessage` and returns false.
bool findContextField(JNIEnv* env, const char* className, const char* classMessage,
                      const char* fieldMessage, jfieldID* contextField);

}  // namespace dvbjni
