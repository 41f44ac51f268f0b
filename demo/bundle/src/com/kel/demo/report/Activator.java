package com.kel.demo.report;

import java.io.File;
import java.io.IOException;
import java.net.URL;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.StandardCopyOption;
import java.util.List;
import java.util.Map;
import java.util.TreeMap;

import org.eclipse.osgi.service.environment.EnvironmentInfo;
import org.osgi.framework.BundleActivator;
import org.osgi.framework.BundleContext;
import org.osgi.framework.ServiceReference;

/**
 * Reports what the platform was started with, so that a launch can be checked
 * from outside: the system properties the launcher sets, the areas the
 * framework runs in, the program arguments the framework left for the
 * application, the JVM's own argument vector, the environment variables the
 * launcher manages, and the platform's process id (which the platform lock
 * names).
 *
 * The report goes to standard output and to
 * &lt;configuration area&gt;/com.kel.demo.report/report.properties, one
 * "name=value" line per fact, values unescaped. Facts that do not exist (an
 * unset variable, say) have no line.
 */
public final class Activator implements BundleActivator {
    private static final String[] PROPERTIES = {
        "rcp.home", "rcp.data", "com.kel.rcp.install.id", "rcp.install.config", "rcp.osgi.install.area",
        "osgi.install.area", "osgi.configuration.area", "osgi.instance.area",
    };
    private static final String[] VARIABLES = {"JAVA_HOME", "JAVA_HIGH_ZIPFDS", "LD_LIBRARY_PATH"};

    @Override
    public void start(BundleContext context) throws IOException {
        StringBuilder report = new StringBuilder();
        for (String name : PROPERTIES) {
            line(report, "property." + name, context.getProperty(name));
        }
        for (Map.Entry<String, String> e : sorted(System.getProperties()).entrySet()) {
            if (e.getKey().startsWith("demo.")) {
                line(report, "property." + e.getKey(), e.getValue());
            }
        }
        for (String name : VARIABLES) {
            line(report, "env." + name, System.getenv(name));
        }
        for (Map.Entry<String, String> e : new TreeMap<>(System.getenv()).entrySet()) {
            if (e.getKey().startsWith("RCP_")) {
                line(report, "env." + e.getKey(), e.getValue());
            }
        }
        ServiceReference<EnvironmentInfo> ref = context.getServiceReference(EnvironmentInfo.class);
        if (ref != null) {
            EnvironmentInfo info = context.getService(ref);
            String[] appArgs = info.getNonFrameworkArgs();
            for (int i = 0; i < appArgs.length; i++) {
                line(report, "application.arg." + i, appArgs[i]);
            }
            context.ungetService(ref);
        }
        List<String> jvmArgs = ProcessHandle.current().info().arguments().map(List::of).orElse(List.of());
        for (int i = 0; i < jvmArgs.size(); i++) {
            line(report, "jvm.arg." + i, jvmArgs.get(i));
        }
        line(report, "process.pid", Long.toString(ProcessHandle.current().pid()));

        System.out.print(report);
        System.out.flush();
        writeReport(context, report.toString());
    }

    @Override
    public void stop(BundleContext context) {
    }

    private static Map<String, String> sorted(java.util.Properties props) {
        Map<String, String> out = new TreeMap<>();
        for (String name : props.stringPropertyNames()) {
            out.put(name, props.getProperty(name));
        }
        return out;
    }

    private static void line(StringBuilder report, String name, String value) {
        if (value != null) {
            report.append(name).append('=').append(value).append('\n');
        }
    }

    // Written beside the framework's own files in the configuration area, and
    // moved into place complete so that a reader never sees half a report.
    private static void writeReport(BundleContext context, String report) throws IOException {
        String area = context.getProperty("osgi.configuration.area");
        if (area == null) {
            return;
        }
        File dir = new File(new URL(area).getPath(), "com.kel.demo.report");
        if (!dir.isDirectory() && !dir.mkdirs()) {
            throw new IOException("cannot create " + dir);
        }
        File tmp = new File(dir, "report.properties.tmp");
        Files.write(tmp.toPath(), report.getBytes(StandardCharsets.UTF_8));
        Files.move(tmp.toPath(), new File(dir, "report.properties").toPath(), StandardCopyOption.REPLACE_EXISTING,
                StandardCopyOption.ATOMIC_MOVE);
    }
}
