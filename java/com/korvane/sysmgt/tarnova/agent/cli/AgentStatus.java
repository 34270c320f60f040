package com.korvane.sysmgt.tarnova.agent.cli;

import java.nio.file.Path;
import java.util.Map;

/**
 * What a run of the agent ends with: the exit codes of the command line, the prerequisite
 * status codes in words, and why no slot topology was found.
 */
public final class AgentStatus {
    /** A slot topology was found (or a blink was accepted, or help or the version shown). */
    public static final int EXIT_OK = 0;
    /** An inventory could not be read, output could not be written, or a blink failed. */
    public static final int EXIT_FAILED = 1;
    /** The arguments are not usable: an unknown option, a missing or out-of-range value. */
    public static final int EXIT_USAGE = 2;
    /** The agent ran but found no slot topology; standard error says why. */
    public static final int EXIT_NO_TOPOLOGY = 3;

    /** The hardware log, relative to the install folder that the agent runs in. */
    public static final String HARDWARE_LOG = "../log/velhslot.slotmgr.hwinfo.log";

    private static final Map<Long, String> MEANINGS = Map.of(
        0L, "all prerequisites met",
        4L, "no PCI architecture file, and the slot driver is not loaded or not running",
        6L, "slot driver version below 1.0.0 or unreadable",
        7L, "the slot driver gave no ASL table",
        8L, "distribution vendor not supported",
        9L, "distribution product not supported",
        10L, "kernel version below 2.4.19");

    private AgentStatus() {
    }

    /** The prerequisite status code in words. */
    public static String meaning(long status) {
        return MEANINGS.getOrDefault(status, "unknown status");
    }

    /**
     * Why an acquisition found no topology, from the status: the driver's codes say it; with
     * the prerequisites met the table itself could not be read; the distribution and kernel
     * codes end the check before the driver is looked at, so they say nothing about it.
     */
    public static String whyNoTopology(long status) {
        if (status == 4 || status == 6 || status == 7) {
            return meaning(status);
        }
        if (status == 0) {
            return "the slot table could not be read";
        }
        return "no slot table could be read (" + meaning(status) + ")";
    }

    /** The hardware log of an agent that runs in the current folder, as an absolute path. */
    public static Path hardwareLog() {
        return Path.of(HARDWARE_LOG).toAbsolutePath().normalize();
    }
}
