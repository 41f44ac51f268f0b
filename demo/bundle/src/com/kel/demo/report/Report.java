package com.kel.demo.report;

import java.io.File;
import java.io.IOException;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.StandardCopyOption;
import java.util.List;

/**
 * What a platform reports about itself, so that a launch can be checked from
 * outside: one "name=value" line per fact, values unescaped, printed to
 * standard output as each fact is added and kept in report.properties of the
 * platform's own directory. Facts that do not exist (an unset variable, say)
 * have no line.
 */
final class Report {
    private final File file;
    private final StringBuilder text = new StringBuilder();

    Report(File file) {
        this.file = file;
    }

    synchronized void add(String name, Object value) {
        if (value == null) {
            return;
        }
        String line = name + "=" + value + "\n";
        text.append(line);
        System.out.print(line);
        System.out.flush();
    }

    /** One fact per element: prefix0, prefix1, ... */
    void addList(String prefix, List<String> values) {
        for (int i = 0; i < values.size(); i++) {
            add(prefix + i, values.get(i));
        }
    }

    /**
     * Writes the report so far. The file is replaced whole, so that a reader
     * never sees half a report, and it is saved again as facts are added: a
     * platform that fails later still leaves what it had found.
     */
    synchronized void save() throws IOException {
        File dir = file.getParentFile();
        if (!dir.isDirectory() && !dir.mkdirs()) {
            throw new IOException("cannot create " + dir);
        }
        File tmp = new File(dir, file.getName() + ".tmp");
        Files.write(tmp.toPath(), text.toString().getBytes(StandardCharsets.UTF_8));
        Files.move(tmp.toPath(), file.toPath(), StandardCopyOption.REPLACE_EXISTING, StandardCopyOption.ATOMIC_MOVE);
    }
}
