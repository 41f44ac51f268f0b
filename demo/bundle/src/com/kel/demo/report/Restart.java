package com.kel.demo.report;

import java.io.File;
import java.io.IOException;
import java.io.InputStream;
import java.nio.file.Files;
import java.util.ArrayList;
import java.util.List;
import java.util.Properties;

/**
 * A restart as the platform asks for one: the launcher is not a loop, so the
 * platform starts a new launcher the way the last one was started, with
 * "-restart" added, and then ends. The new launcher waits until this
 * platform's process has ended (the platform lock names it) before it starts
 * the next platform.
 */
final class Restart {
    /** The launcher's record of how it was started, in the configuration area. */
    static final String STARTUP_RECORD = "args.properties";
    /**
     * Set for the new launcher, and so for the platform it starts, to the
     * process id of the platform that asked for the restart: the demo restarts
     * once, not on every start of the recorded command line.
     */
    static final String RESTARTED_BY = "DEMO_RESTARTED_BY";

    private Restart() {
    }

    /**
     * Starts the launcher recorded in the configuration area with "-restart".
     * Its output (the next platform's, since the launcher writes only to its
     * log) goes to output, as this platform's own output will be gone.
     */
    static void request(File configurationArea, File output, Report report) throws IOException {
        // arg0 is the launcher's executable, arg1 ... its arguments, argc the
        // count, written in the properties syntax that Properties reads.
        Properties record = new Properties();
        File recordFile = new File(configurationArea, STARTUP_RECORD);
        try (InputStream in = Files.newInputStream(recordFile.toPath())) {
            record.load(in);
        }
        int argc;
        try {
            argc = Integer.parseInt(record.getProperty("argc", ""));
        } catch (NumberFormatException e) {
            throw new IOException(recordFile + " has no valid argc");
        }
        List<String> command = new ArrayList<>();
        for (int i = 0; i < argc; i++) {
            String arg = record.getProperty("arg" + i);
            if (arg == null) {
                throw new IOException(recordFile + " has no arg" + i);
            }
            command.add(arg);
        }
        if (command.isEmpty()) {
            throw new IOException(recordFile + " names no launcher");
        }
        command.add("-restart");

        ProcessBuilder builder = new ProcessBuilder(command).redirectErrorStream(true).redirectOutput(output);
        builder.environment().put(RESTARTED_BY, Long.toString(ProcessHandle.current().pid()));
        report.add("restart.requested", System.currentTimeMillis());
        Process launcher = builder.start();
        // Nothing to say on its standard input: it sees the end at once.
        launcher.getOutputStream().close();
        report.add("restart.launcher.pid", launcher.pid());
        report.addList("restart.command.", command);
    }
}
