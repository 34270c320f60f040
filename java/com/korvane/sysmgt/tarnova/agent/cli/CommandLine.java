package com.korvane.sysmgt.tarnova.agent.cli;

import static com.korvane.sysmgt.tarnova.agent.cli.AgentStatus.*;

import com.korvane.sysmgt.tarnova.agent.TarnovaAgent;
import java.io.IOException;
import java.io.PrintStream;
import java.nio.charset.StandardCharsets;
import java.nio.file.Path;
import java.util.function.Function;
import java.util.function.Supplier;

/** The agent's command line: report (default), --json, --prometheus, or --blink SLOT STATE. */
public final class CommandLine {

    static final String USAGE = String.join("\n",
        "usage: TarnovaAgent [--json | --prometheus [--output FILE] | --blink SLOT STATE]",
        "  (no option)         collect the slot hardware and print a readable report",
        "  --json              collect the slot hardware and print one JSON document",
        "  --prometheus        collect the slot hardware and print it as Prometheus metrics",
        "    --output FILE     replace FILE with them at once instead (for the node exporter's",
        "                      text-file collector, which must never read half a file)",
        "  --blink SLOT STATE  collect the slot hardware and set the blink state of a slot's",
        "                      attention LED",
        "");

    private enum Mode { REPORT, JSON, PROMETHEUS, BLINK, HELP }

    private final Mode mode;
    private final long slot;
    private final int state;
    private Path output;

    private CommandLine(Mode mode, long slot, int state) {
        this.mode = mode;
        this.slot = slot;
        this.state = state;
    }

    /** @throws IllegalArgumentException with the reason when the arguments are not usable */
    static CommandLine parse(String[] args) {
        if (args.length == 0) {
            return new CommandLine(Mode.REPORT, 0, 0);
        }
        switch (args[0]) {
            case "--json":
                expectCount(args, 1);
                return new CommandLine(Mode.JSON, 0, 0);
            case "--prometheus":
                if (args.length != 1 && !(args.length == 3 && args[1].equals("--output"))) {
                    throw new IllegalArgumentException("--prometheus takes only --output FILE");
                }
                CommandLine metrics = new CommandLine(Mode.PROMETHEUS, 0, 0);
                metrics.output = args.length == 3 ? Path.of(args[2]) : null;
                return metrics;
            case "--blink":
                expectCount(args, 3);
                return new CommandLine(Mode.BLINK,
                    number(args[1], "SLOT is not a 64-bit decimal integer", Long::parseLong),
                    number(args[2], "STATE is not a 32-bit decimal integer", Integer::parseInt));
            case "--help":
            case "-h":
                expectCount(args, 1);
                return new CommandLine(Mode.HELP, 0, 0);
            default:
                throw new IllegalArgumentException("unknown option: " + args[0]);
        }
    }

    private static void expectCount(String[] args, int count) {
        if (args.length != count) {
            throw new IllegalArgumentException(args[0] + " takes "
                + (count == 1 ? "no argument" : (count - 1) + " arguments"));
        }
    }

    private static <T> T number(String text, String complaint, Function<String, T> parser) {
        try {
            return parser.apply(text);
        } catch (NumberFormatException e) {
            throw new IllegalArgumentException(complaint + ": " + text);
        }
    }

    /** The lifecycle around one blink, so that it is logged and traced as every call is. */
    private static void blink(TarnovaAgent agent, long slot, int state) {
        agent.getDebugFileReady();
        try {
            agent.getHwInfoReady();
            agent.BlinkCmd(slot, state);
        } finally {
            agent.getReadyToExit();
        }
    }

    /** Runs the command line against the agent that supplier creates; returns the exit code. */
    public static int run(String[] args, Supplier<TarnovaAgent> agents, PrintStream out,
                          PrintStream err) {
        CommandLine command;
        try {
            command = parse(args);
        } catch (IllegalArgumentException e) {
            err.println("TarnovaAgent: " + e.getMessage());
            err.print(USAGE);
            return EXIT_USAGE;
        }
        switch (command.mode) {
            case HELP:
                out.print(USAGE);
                return EXIT_OK;
            case BLINK:
                blink(agents.get(), command.slot, command.state);
                return EXIT_OK;
            default:
                Inventory inventory;
                long acquired = System.currentTimeMillis();
                try {
                    inventory = Inventory.collect(agents.get());
                } catch (IllegalArgumentException e) {
                    err.println("TarnovaAgent: unusable inventory: " + e.getMessage());
                    return EXIT_FAILED;
                }
                if (command.mode == Mode.PROMETHEUS) {
                    return metrics(PrometheusWriter.write(Machine.of(inventory), acquired, err),
                        command.output, out, err);
                }
                out.print(command.mode == Mode.JSON ? JsonWriter.write(inventory)
                                                    : ReportFormatter.format(inventory));
                out.flush();
                return out.checkError() ? EXIT_FAILED : EXIT_OK;
        }
    }

    /** The metrics, UTF-8 as the format wants, on standard output or replacing a file. */
    private static int metrics(String text, Path output, PrintStream out, PrintStream err) {
        byte[] bytes = text.getBytes(StandardCharsets.UTF_8);
        if (output == null) {
            out.write(bytes, 0, bytes.length);
            out.flush();
            return out.checkError() ? EXIT_FAILED : EXIT_OK;
        }
        try {
            AtomicFile.replace(output, bytes);
            return EXIT_OK;
        } catch (IOException e) {
            err.println("TarnovaAgent: cannot write " + output + ": " + AtomicFile.reason(e));
            return EXIT_FAILED;
        }
    }
}
