// The value kept in a Java object's `int mNativeContext` for its android::DVB object.
//
// On a 32-bit build the field holds the object's address, as on the device. A 64-bit address
// does not fit in a Java int, so 64-bit builds hand out a non-zero 32-bit token instead, from
// a table of bound objects; a token that is no longer bound resolves to nothing. Everything
// outside this file sees only these three functions, so the rest of the library is the same
// code on both widths.
#pragma once

#include <DVB.h>
#include <nativehelper/jni.h>

namespace dvbjni {

// The context value for `dvb`, binding it if it is not bound yet; 0 when no more objects can
// be bound. Called with the DVB source file's lock held, as is contextRelease().
jint contextBind(android::DVB* dvb);

// Undoes one contextBind() of `dvb`; the value stops resolving after its last binding.
void contextRelease(android::DVB* dvb);

// The DVB object that `context` stands for, or null. Takes no lock.
android::DVB* contextObject(jint context);

}  // namespace dvbjni
