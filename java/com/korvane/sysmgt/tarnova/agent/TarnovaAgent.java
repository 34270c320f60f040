package com.korvane.sysmgt.tarnova.agent;

import com.korvane.sysmgt.tarnova.agent.cli.CommandLine;

/** The hot-plug PCI slot management agent: the Java half of libvelhlib. */
public class TarnovaAgent {
    static {
        System.loadLibrary("velhlib");
    }

    public native void getDebugFileReady();
    public native void getHwInfoReady();
    public native String getAgentVersionInv();
    public native long getAgentNumInv();
    public native void BlinkCmd(long slot, int state);
    public native void getReadyToExit();
    public native long[][] getBusNumInv();
    public native long[][] getSlotNumInv();
    public native long[][] getSystemNumInv();
    public native long[][] getAdapterNumInv();
    public native String[] getSystemNameInv();
    public native String[] getAdapterNameInv();
    public native String[] getAdapterPCIIDInv();
    public native String[] getAdapterDriverInv();

    /** Prints the inventory (a report, or JSON with --json), or blinks a slot's LED. */
    public static void main(String[] args) {
        System.exit(CommandLine.run(args, TarnovaAgent::new, System.out, System.err));
    }
}
