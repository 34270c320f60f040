#include <jni.h>

#include "com_korvane_sysmgt_tarnova_agent_TarnovaAgent.h"

#define JNI_EXPORT extern "C" __attribute__((visibility("default")))

JNI_EXPORT jstring JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getAgentVersionInv(JNIEnv* env, jobject) {
    return env->NewStringUTF("4.20");
}
