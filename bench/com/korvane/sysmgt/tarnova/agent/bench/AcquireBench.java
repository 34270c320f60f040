package com.korvane.sysmgt.tarnova.agent.bench;

import com.korvane.sysmgt.tarnova.agent.TarnovaAgent;
import java.lang.management.ManagementFactory;
import java.lang.management.ThreadMXBean;
import java.util.Arrays;

/**
 * Times the library in one JVM: after WARMUP acquisitions, ROUNDS acquisitions (getHwInfoReady,
 * timed around the native call) each followed by the eight inventory exports (timed together).
 * Prints the medians in milliseconds (acquisition also as the calling thread's processor time)
 * and the number of adapters and slots the last acquisition reported.
 *
 * <p>java -cp tarnova-agent.jar:velh-acquire.jar com.korvane.sysmgt.tarnova.agent.bench.AcquireBench
 * WARMUP ROUNDS
 */
public final class AcquireBench {
    private AcquireBench() {}

    private static double median(long[] nanos) {
        long[] sorted = nanos.clone();
        Arrays.sort(sorted);
        int n = sorted.length;
        double middle = n % 2 == 1 ? sorted[n / 2] : (sorted[n / 2 - 1] + sorted[n / 2]) / 2.0;
        return middle / 1e6;
    }

    private static int exportAll(TarnovaAgent agent) {
        int elements = agent.getBusNumInv().length + agent.getSlotNumInv().length
                + agent.getSystemNumInv().length + agent.getSystemNameInv().length
                + agent.getAdapterNameInv().length + agent.getAdapterPCIIDInv().length
                + agent.getAdapterDriverInv().length;
        return elements + agent.getAdapterNumInv().length;
    }

    public static void main(String[] args) {
        int warmup = Integer.parseInt(args[0]);
        int rounds = Integer.parseInt(args[1]);
        TarnovaAgent agent = new TarnovaAgent();
        for (int i = 0; i < warmup; i++) {
            agent.getHwInfoReady();
            exportAll(agent);
        }
        ThreadMXBean threads = ManagementFactory.getThreadMXBean();
        long[] acquire = new long[rounds];
        long[] processor = new long[rounds];
        long[] exports = new long[rounds];
        for (int i = 0; i < rounds; i++) {
            long cpuStart = threads.getCurrentThreadCpuTime();
            long start = System.nanoTime();
            agent.getHwInfoReady();
            long acquired = System.nanoTime();
            processor[i] = threads.getCurrentThreadCpuTime() - cpuStart;
            exportAll(agent);
            exports[i] = System.nanoTime() - acquired;
            acquire[i] = acquired - start;
        }
        System.out.printf("acquire %.3f%n", median(acquire));
        System.out.printf("acquire_cpu %.3f%n", median(processor));
        System.out.printf("exports %.3f%n", median(exports));
        System.out.printf("adapters %d%n", agent.getAdapterNumInv().length);
        System.out.printf("slots %d%n", agent.getSlotNumInv().length);
        agent.getReadyToExit();
    }
}
