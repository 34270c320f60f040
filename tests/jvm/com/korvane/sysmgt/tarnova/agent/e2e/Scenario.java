package com.korvane.sysmgt.tarnova.agent.e2e;

import com.korvane.sysmgt.tarnova.agent.TarnovaAgent;
import com.korvane.sysmgt.tarnova.agent.cli.*;
import java.util.stream.*;

/**
 * Runs in the child JVM: calls the entry points its arguments name, in order (debug, hwinfo,
 * exit; blink:SLOT:STATE) and prints "key=value" for those with a result: version, status,
 * inventories (the lengths of the eight), json (the agent's document on one line, from a whole
 * lifecycle of its own), doc (the document of the last acquisition) and children (after 1.5 s, the child processes of this JVM, zombies
 * included: long enough for the monitor stand-ins to have run and ended).
 */
final class Scenario {
    public static void main(String[] args) throws Exception {
        TarnovaAgent agent = new TarnovaAgent();
        for (String step : args) {
            String[] parts = step.split(":");
            switch (parts[0]) {
                case "debug" -> agent.getDebugFileReady();
                case "hwinfo" -> agent.getHwInfoReady();
                case "exit" -> agent.getReadyToExit();
                case "version" -> System.out.println("version=" + agent.getAgentVersionInv());
                case "status" -> System.out.println("status=" + agent.getAgentNumInv());
                case "inventories" -> System.out.println("inventories=" + Stream.of(
                        agent.getBusNumInv(), agent.getSlotNumInv(), agent.getSystemNumInv(),
                        agent.getAdapterNumInv(), agent.getSystemNameInv(),
                        agent.getAdapterNameInv(), agent.getAdapterPCIIDInv(),
                        agent.getAdapterDriverInv())
                    .map(array -> array == null ? "null" : String.valueOf(array.length))
                    .collect(Collectors.joining(",")));
                // JSON needs no line ends: strings carry theirs escaped.
                case "json" -> System.out.println(
                    "json=" + JsonWriter.write(Inventory.collect(agent)).replace("\n", ""));
                case "doc" -> System.out.println(
                    "doc=" + JsonWriter.write(Inventory.read(agent)).replace("\n", ""));
                case "blink" -> agent.BlinkCmd(Long.parseLong(parts[1]), Integer.parseInt(parts[2]));
                case "children" -> {
                    Thread.sleep(1500);
                    System.out.println("children=" + ProcessHandle.current().children().count());
                }
                default -> throw new IllegalArgumentException(step);
            }
        }
    }
}
