package com.korvane.sysmgt.tarnova.agent.cli;

import static com.korvane.sysmgt.tarnova.agent.cli.AgentStatus.*;

import com.korvane.sysmgt.tarnova.agent.TarnovaAgent;
import java.io.IOException;
import java.io.PrintStream;
import java.io.RandomAccessFile;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.Path;
import java.util.ArrayList;
import java.util.Collections;
import java.util.List;
import java.util.function.Supplier;

/**
 * The agent's command line: the slot report (default), --tables, --json, --prometheus,
 * --blink SLOT STATE, --version and --help. Results go to standard output, warnings and errors
 * to standard error.
 */
public final class CommandLine {
    /** The version of this agent class and its command line. */
    public static final String VERSION = "4.20";
    /** The largest value of the driver's unsigned 32-bit slot and state fields. */
    static final long MAX_U32 = 0xFFFFFFFFL;

    static final String USAGE = String.join("\n",
        "usage: tarnova-agent [--tables | --json | --prometheus [--output FILE]",
        "                     | --blink SLOT STATE | --version | --help]",
        "  (no option)         collect the slot hardware and print a report: each chassis and",
        "                      drawer with its slots in label order, the card in each slot, and",
        "                      the on-board devices",
        "  --tables            the four inventories as raw tables",
        "  --json              the four inventories as one JSON document",
        "  --prometheus        the slots, busses and status as Prometheus metrics",
        "    --output FILE     replace FILE (an absolute path) with them in one step, for the",
        "                      node exporter's text-file collector, which must never read half",
        "                      a file",
        "  --blink SLOT STATE  set the blink state of a slot's attention LED through the slot",
        "                      driver; SLOT is a slot ID as the report shows it, STATE the",
        "                      driver's value (0 to 4294967295)",
        "  --version           the versions of the agent and of its library",
        "  --help              this text",
        "exit status: 0 done (a slot topology was found, the blink accepted), 1 an inventory could",
        "not be read or the blink failed, 2 a usage error, 3 no slot topology was found",
        "");

    private enum Mode { REPORT, TABLES, JSON, PROMETHEUS, BLINK, VERSION, HELP }

    private final Mode mode;
    private final long slot;
    private final long state;
    private Path output;

    private CommandLine(Mode mode, long slot, long state) {
        this.mode = mode;
        this.slot = slot;
        this.state = state;
    }

    /** @throws IllegalArgumentException with the reason when the arguments are not usable */
    static CommandLine parse(String[] args) {
        if (args.length == 0) {
            return new CommandLine(Mode.REPORT, 0, 0);
        }
        Mode mode;
        switch (args[0]) {
            case "--tables":
                mode = Mode.TABLES;
                break;
            case "--json":
                mode = Mode.JSON;
                break;
            case "--prometheus":
                if (args.length != 1 && !(args.length == 3 && args[1].equals("--output"))) {
                    throw new IllegalArgumentException("--prometheus takes only --output FILE");
                }
                CommandLine metrics = new CommandLine(Mode.PROMETHEUS, 0, 0);
                metrics.output = args.length == 3 ? Path.of(args[2]) : null;
                // The launcher runs the agent in its install folder, not where it was started.
                if (metrics.output != null && !metrics.output.isAbsolute()) {
                    throw new IllegalArgumentException(
                        "--output takes an absolute path: " + args[2]);
                }
                return metrics;
            case "--blink":
                expectCount(args, 3);
                return new CommandLine(Mode.BLINK, unsigned32(args[1], "SLOT"),
                    unsigned32(args[2], "STATE"));
            case "--version":
                mode = Mode.VERSION;
                break;
            case "--help":
            case "-h":
                mode = Mode.HELP;
                break;
            default:
                throw new IllegalArgumentException("unknown option: " + args[0]);
        }
        expectCount(args, 1);
        return new CommandLine(mode, 0, 0);
    }

    private static void expectCount(String[] args, int count) {
        if (args.length != count) {
            throw new IllegalArgumentException(args[0] + " takes "
                + (count == 1 ? "no argument" : (count - 1) + " arguments"));
        }
    }

    /** A decimal that fits the driver's unsigned 32 bits: 0 to 4294967295. */
    private static long unsigned32(String text, String name) {
        long value = -1;
        if (text.matches("[0-9]{1,10}")) {
            value = Long.parseLong(text);
        }
        if (value < 0 || value > MAX_U32) {
            throw new IllegalArgumentException(
                name + " is not a decimal number from 0 to " + MAX_U32 + ": " + text);
        }
        return value;
    }

    /** Runs the command line against the agent that supplier creates; returns the exit code. */
    public static int run(String[] args, Supplier<TarnovaAgent> agents, PrintStream out,
                          PrintStream err) {
        CommandLine command;
        try {
            command = parse(args);
        } catch (IllegalArgumentException e) {
            err.println("tarnova-agent: " + e.getMessage());
            err.print(USAGE);
            return EXIT_USAGE;
        }
        int exit;
        switch (command.mode) {
            case HELP:
                out.print(USAGE);
                exit = EXIT_OK;
                break;
            case VERSION:
                out.println("tarnova-agent " + VERSION + ", library libvelhlib "
                    + agents.get().getAgentVersionInv());
                exit = EXIT_OK;
                break;
            case BLINK:
                exit = command.blink(agents.get(), err);
                break;
            default:
                exit = command.report(agents.get(), out, err);
        }
        out.flush();
        return out.checkError() ? EXIT_FAILED : exit;
    }

    private int report(TarnovaAgent agent, PrintStream out, PrintStream err) {
        Inventory inventory;
        long acquired = System.currentTimeMillis();
        try {
            inventory = Inventory.collect(agent);
        } catch (IllegalArgumentException | OutOfMemoryError e) {
            err.println("tarnova-agent: an inventory could not be read: " + e.getMessage());
            return EXIT_FAILED;
        }
        Machine machine = Machine.of(inventory);
        switch (mode) {
            case JSON:
                out.print(JsonWriter.write(inventory));
                break;
            case TABLES:
                out.print(ReportFormatter.format(inventory));
                break;
            case PROMETHEUS:
                if (!metrics(PrometheusWriter.write(machine, acquired, err), out, err)) {
                    return EXIT_FAILED;
                }
                break;
            default:
                out.print(SlotReport.format(machine));
        }
        if (!machine.topologyFound()) {
            err.println("tarnova-agent: no slot topology found: "
                + whyNoTopology(machine.status()) + "; the hardware log is " + hardwareLog());
            return EXIT_NO_TOPOLOGY;
        }
        return EXIT_OK;
    }

    /** The metrics, UTF-8 as the format wants, on standard output or replacing the output file. */
    private boolean metrics(String text, PrintStream out, PrintStream err) {
        byte[] bytes = text.getBytes(StandardCharsets.UTF_8);
        if (output == null) {
            out.write(bytes, 0, bytes.length);
            return true;
        }
        try {
            AtomicFile.replace(output, bytes);
            return true;
        } catch (IOException e) {
            err.println("tarnova-agent: cannot write " + output + ": " + AtomicFile.reason(e));
            return false;
        }
    }

    /**
     * Blinks a slot that the slot inventory lists, within the lifecycle that logs and traces
     * it; a failed request shows as the library's error lines that the call added to the
     * hardware log, which it writes whatever the debug level.
     */
    private int blink(TarnovaAgent agent, PrintStream err) {
        agent.getDebugFileReady();
        try {
            agent.getHwInfoReady();
            InventoryTable slots;
            try {
                slots = new InventoryTable("slots", InventoryTable.SLOT_FIELDS,
                    agent.getSlotNumInv());
            } catch (IllegalArgumentException | OutOfMemoryError e) {
                err.println("tarnova-agent: the slot inventory could not be read: "
                    + e.getMessage());
                return EXIT_FAILED;
            }
            List<Long> ids = new ArrayList<>();
            for (int row = 0; row < slots.size(); row++) {
                ids.add(slots.value(row, "SlotID"));
            }
            if (!ids.contains(slot)) {
                Collections.sort(ids);
                err.println("tarnova-agent: no slot has the ID " + slot + (ids.isEmpty()
                    ? " (no slot topology found)" : "; the slot IDs are " + ids));
                return EXIT_USAGE;
            }
            Path log = hardwareLog();
            long before = sizeOf(log);
            agent.BlinkCmd(slot, (int) state);
            String failure = blinkErrors(log, before);
            if (!failure.isEmpty()) {
                err.println("tarnova-agent: the blink of slot ID " + slot + " failed: " + failure
                    + " (hardware log " + log + ")");
                return EXIT_FAILED;
            }
            return EXIT_OK;
        } finally {
            agent.getReadyToExit();
        }
    }

    private static long sizeOf(Path file) {
        try {
            return Files.exists(file) ? Files.size(file) : 0;
        } catch (IOException e) {
            return 0;
        }
    }

    /** The blink's error lines that the log gained past offset, each without its heading. */
    static String blinkErrors(Path log, long offset) {
        String added;
        try (RandomAccessFile file = new RandomAccessFile(log.toFile(), "r")) {
            long length = file.length();
            byte[] bytes = new byte[(int) Math.max(0, Math.min(length - offset, 1 << 20))];
            file.seek(Math.min(offset, length));
            file.readFully(bytes);
            added = new String(bytes, StandardCharsets.UTF_8);
        } catch (IOException e) {
            return "";
        }
        String heading = "HwSetBlinkState():";
        List<String> errors = new ArrayList<>();
        for (String line : added.split("\n")) {
            int at = line.indexOf(heading);
            if (at >= 0) {
                errors.add(line.substring(at + heading.length()).trim().replaceAll(" {2,}", " "));
            }
        }
        return String.join("; ", errors);
    }
}
