package com.korvane.sysmgt.tarnova.agent.e2e;

import com.korvane.sysmgt.tarnova.agent.TarnovaAgent;
import com.korvane.sysmgt.tarnova.agent.cli.Inventory;
import com.korvane.sysmgt.tarnova.agent.cli.JsonWriter;
import java.io.IOException;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.stream.Collectors;
import java.util.stream.Stream;

/**
 * Runs in the child JVM: calls the entry points that its arguments name, in order, and prints
 * one "key=value" line for each step that has a result.
 *
 * <pre>
 *   debug, hwinfo, exit      getDebugFileReady, getHwInfoReady, getReadyToExit
 *   version                  version=getAgentVersionInv()
 *   status                   status=getAgentNumInv()
 *   inventories              inventories=the lengths of the eight inventories (null: "null")
 *   json                     json=the agent's JSON document on one line: the whole lifecycle
 *                            (debug, hwinfo, the inventories, version, status, exit)
 *   blink:SLOT:STATE         BlinkCmd(SLOT, STATE)
 *   sleep:MILLIS             waits
 *   children                 children=N zombies=Z, the child processes of this JVM
 * </pre>
 */
public final class Scenario {
    private Scenario() {
    }

    public static void main(String[] args) throws Exception {
        TarnovaAgent agent = new TarnovaAgent();
        for (String step : args) {
            String[] parts = step.split(":");
            switch (parts[0]) {
                case "debug":
                    agent.getDebugFileReady();
                    break;
                case "hwinfo":
                    agent.getHwInfoReady();
                    break;
                case "exit":
                    agent.getReadyToExit();
                    break;
                case "version":
                    System.out.println("version=" + agent.getAgentVersionInv());
                    break;
                case "status":
                    System.out.println("status=" + agent.getAgentNumInv());
                    break;
                case "inventories":
                    System.out.println("inventories=" + inventoryLengths(agent));
                    break;
                case "json":
                    // JSON needs no line ends: strings carry theirs escaped.
                    System.out.println("json="
                        + JsonWriter.write(Inventory.collect(agent)).replace("\n", ""));
                    break;
                case "blink":
                    agent.BlinkCmd(Long.parseLong(parts[1]), Integer.parseInt(parts[2]));
                    break;
                case "sleep":
                    Thread.sleep(Long.parseLong(parts[1]));
                    break;
                case "children":
                    System.out.println("children=" + children());
                    break;
                default:
                    System.err.println("unknown step " + step);
                    System.exit(3);
            }
        }
    }

    private static String inventoryLengths(TarnovaAgent agent) {
        return Stream.of(agent.getBusNumInv(), agent.getSlotNumInv(), agent.getSystemNumInv(),
                agent.getAdapterNumInv(), agent.getSystemNameInv(), agent.getAdapterNameInv(),
                agent.getAdapterPCIIDInv(), agent.getAdapterDriverInv())
            .map(array -> array == null ? "null" : String.valueOf(array.length))
            .collect(Collectors.joining(","));
    }

    /** "N zombies=Z": every process whose parent is this JVM, and those of them that ended. */
    private static String children() throws IOException {
        String self = String.valueOf(ProcessHandle.current().pid());
        int children = 0;
        int zombies = 0;
        try (Stream<Path> entries = Files.list(Path.of("/proc"))) {
            for (Path process : (Iterable<Path>) entries::iterator) {
                if (!process.getFileName().toString().matches("\\d+")) {
                    continue;
                }
                String stat;
                try {
                    stat = Files.readString(process.resolve("stat"));
                } catch (IOException gone) {
                    continue;
                }
                // pid (comm) state ppid ...; comm may hold blanks and parentheses.
                String[] fields = stat.substring(stat.lastIndexOf(')') + 2).split(" ");
                if (fields[1].equals(self)) {
                    children++;
                    zombies += fields[0].equals("Z") ? 1 : 0;
                }
            }
        }
        return children + " zombies=" + zombies;
    }
}
