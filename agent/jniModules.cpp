// The fourteen entry points that the agent class declares as native methods. The library is built
// without C++ exceptions, so none can reach the JVM, and none raises a Java exception of its own.
#include <jni.h>

#include <cstdint>
#include <string>

#include "agent/inventory.h"
#include "agent/jnilog.h"
#include "agent/launch.h"
#include "com_korvane_sysmgt_tarnova_agent_TarnovaAgent.h"
#include "diag/hwdebug.h"
#include "hw/hwinfo.h"
#include "model/hwobjects.h"
#include "setup/linsetup.h"
#include "sources/linhw.h"

namespace {

// The monitor is started once per loaded library; a launch that failed is tried again.
bool slotwatchRunning = false;

}  // namespace

JNIEXPORT void JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getDebugFileReady(JNIEnv*, jobject) {
    if (JniLogOpen()) {
        JniLog("getDebugFileReady() ...... \n");
    }
}

JNIEXPORT void JNICALL Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getHwInfoReady(JNIEnv*,
                                                                                         jobject) {
    JniLog("\n************************ GetHwInfoReady begining \n");
    if (!slotwatchRunning && LaunchDetached("slotwatch", nullptr)) {
        JniLog("slotwatch is launched .... \n");
        slotwatchRunning = true;
    }
    GetHwInfo();
    JniLog("getHwInfoReady: GetHwInfo() done \n");
    CountInventories();
}

JNIEXPORT jstring JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getAgentVersionInv(JNIEnv* env, jobject) {
    const std::string version = NarrowForLog(AGENT_VERSION);
    JniLog("Agent Version=%s \n", version.c_str());
    return env->NewStringUTF(version.c_str());
}

JNIEXPORT jlong JNICALL Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getAgentNumInv(JNIEnv*,
                                                                                          jobject) {
    JniLog("getAgentNumInv: Begining \n");
    uint32_t status = 0;
    CheckPreRequisites(&status);
    JniLog("Agent Status=%x \n", static_cast<unsigned int>(status));
    return static_cast<jlong>(status);
}

JNIEXPORT void JNICALL Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_BlinkCmd(JNIEnv*, jobject,
                                                                                   jlong slot,
                                                                                   jint state) {
    const auto slot32 = static_cast<uint32_t>(slot);
    const auto state32 = static_cast<uint32_t>(state);
    HwSetBlinkState(slot32, state32);
    JniLog("BlinkCmd() slot=%d, state=%d \n", static_cast<int32_t>(slot32),
           static_cast<int32_t>(state32));
}

JNIEXPORT void JNICALL Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getReadyToExit(JNIEnv*,
                                                                                         jobject) {
    // Only a killall that was started may be reported as stopping the monitor.
    if (LaunchDetached("killall", "slotwatch")) {
        JniLog("slotwatch is stopped \n");
    }
    JniLog("***************************\n");
    JniLog("JNI: getReadyToExit() Done \n");
    JniLog("***************************\n\n\n");
    JniLogClose();
}

JNIEXPORT jobjectArray JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getBusNumInv(JNIEnv* env, jobject) {
    return BusNumInv(env);
}

JNIEXPORT jobjectArray JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getSlotNumInv(JNIEnv* env, jobject) {
    return SlotNumInv(env);
}

JNIEXPORT jobjectArray JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getSystemNumInv(JNIEnv* env, jobject) {
    return SystemNumInv(env);
}

JNIEXPORT jobjectArray JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getAdapterNumInv(JNIEnv* env, jobject) {
    return AdapterNumInv(env);
}

JNIEXPORT jobjectArray JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getSystemNameInv(JNIEnv* env, jobject) {
    return SystemNameInv(env);
}

JNIEXPORT jobjectArray JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getAdapterNameInv(JNIEnv* env, jobject) {
    return AdapterNameInv(env);
}

JNIEXPORT jobjectArray JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getAdapterPCIIDInv(JNIEnv* env, jobject) {
    return AdapterPciIdInv(env);
}

JNIEXPORT jobjectArray JNICALL
Java_com_korvane_sysmgt_tarnova_agent_TarnovaAgent_getAdapterDriverInv(JNIEnv* env, jobject) {
    return AdapterDriverInv(env);
}
