package com.korvane.sysmgt.tarnova.agent.bench;

import com.korvane.sysmgt.tarnova.agent.TarnovaAgent;
import java.io.File;
import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.Map;
import java.util.TreeMap;
import java.util.concurrent.TimeUnit;
import java.util.stream.Collectors;
import java.util.stream.Stream;

/**
 * Soak: one agent life in this JVM with N acquisitions, each followed by the eight inventories
 * and the status check. Prints one "key=value" line per figure:
 *
 * <pre>
 *   acquisitions  N
 *   rss_kb        resident memory at the start, after the 100th acquisition (the last when
 *                 fewer) and after the last, and the growth between the last two
 *   fds           descriptors open after the first acquisition and after the last
 *   fds_left      descriptors open after the last acquisition but not after the first, and
 *                 those open after the agent's exit but not before its start (their targets)
 *   children      processes of this JVM left after the agent's exit
 *   ms_per_acquisition
 * </pre>
 *
 * Exits 1 when a descriptor or a child is left over.
 */
public final class Soak {
    private static final int SETTLED = 100;
    private static final long CHILD_WAIT_MILLIS = 5_000;

    private Soak() {
    }

    public static void main(String[] args) throws Exception {
        int count = args.length > 0 ? Integer.parseInt(args[0]) : 1000;
        TarnovaAgent agent = new TarnovaAgent();
        // The JVM opens a descriptor of its own the first time it reads a file this way.
        long startRss = residentKb();
        Map<String, String> beforeStart = descriptors();
        agent.getDebugFileReady();
        Map<String, String> first = null;
        long settledRss = 0;
        long start = System.nanoTime();
        for (int i = 1; i <= count; i++) {
            acquire(agent);
            if (i == 1) {
                first = descriptors();
            }
            if (i == Math.min(SETTLED, count)) {
                settledRss = residentKb();
            }
        }
        long elapsed = System.nanoTime() - start;
        long lastRss = residentKb();
        Map<String, String> last = descriptors();
        agent.getReadyToExit();
        Map<String, String> afterExit = descriptors();
        long children = childrenAfterWait();

        String leftInLoop = leftOver(first, last);
        String leftByLife = leftOver(beforeStart, afterExit);
        System.out.println("acquisitions=" + count);
        System.out.println("rss_kb=" + startRss + " " + settledRss + " " + lastRss + " growth="
            + (lastRss - settledRss));
        System.out.println("fds=" + first.size() + " " + last.size());
        System.out.println("fds_left=[" + leftInLoop + "] [" + leftByLife + "]");
        System.out.println("children=" + children);
        System.out.printf("ms_per_acquisition=%.2f%n", elapsed / 1e6 / count);
        boolean clean = leftInLoop.isEmpty() && leftByLife.isEmpty() && children == 0;
        System.exit(clean ? 0 : 1);
    }

    /** One acquisition with everything the agent asks after it. */
    private static void acquire(TarnovaAgent agent) {
        agent.getHwInfoReady();
        agent.getSystemNumInv();
        agent.getSystemNameInv();
        agent.getBusNumInv();
        agent.getSlotNumInv();
        agent.getAdapterNumInv();
        agent.getAdapterNameInv();
        agent.getAdapterPCIIDInv();
        agent.getAdapterDriverInv();
        agent.getAgentNumInv();
    }

    /** This process's open descriptors: number to target. */
    private static Map<String, String> descriptors() throws IOException {
        Map<String, String> open = new TreeMap<>();
        File[] entries = new File("/proc/self/fd").listFiles();
        for (File entry : entries == null ? new File[0] : entries) {
            try {
                open.put(entry.getName(), Files.readSymbolicLink(entry.toPath()).toString());
            } catch (IOException closedMeanwhile) {
                // the listing's own descriptor
            }
        }
        return open;
    }

    private static String leftOver(Map<String, String> before, Map<String, String> after) {
        return after.entrySet().stream()
            .filter(entry -> !entry.getValue().equals(before.get(entry.getKey())))
            .map(entry -> entry.getKey() + "->" + entry.getValue())
            .collect(Collectors.joining(" "));
    }

    private static long residentKb() throws IOException {
        try (Stream<String> lines = Files.lines(Path.of("/proc/self/status"))) {
            return lines.filter(line -> line.startsWith("VmRSS:"))
                .mapToLong(line -> Long.parseLong(line.replaceAll("[^0-9]", "")))
                .findFirst().orElse(-1);
        }
    }

    /** Children that are still ending (the exit's stop request) get a few seconds. */
    private static long childrenAfterWait() throws InterruptedException {
        long deadline = System.nanoTime() + TimeUnit.MILLISECONDS.toNanos(CHILD_WAIT_MILLIS);
        long children = ProcessHandle.current().children().count();
        while (children > 0 && System.nanoTime() < deadline) {
            Thread.sleep(50);
            children = ProcessHandle.current().children().count();
        }
        return children;
    }
}
