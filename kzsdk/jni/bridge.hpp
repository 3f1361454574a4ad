/// @file
/// Binds the Java class com.orvanta.android.kzsdk.Fingerprint to workers.
#pragma once

#include <jni.h>

/// Finds the class and its members and binds its five native methods. Negative on failure: then an
/// exception is pending and nothing is kept.
int register_com_orvanta_android_kzsdk_Fingerprint(JNIEnv* env) noexcept;
