package com.kel.demo.report;

import java.io.File;
import java.io.IOException;
import java.lang.management.ManagementFactory;
import java.nio.charset.StandardCharsets;
import java.nio.file.Files;
import java.nio.file.StandardCopyOption;
import java.util.Arrays;
import java.util.List;
import java.util.Map;
import java.util.TreeMap;

import org.eclipse.core.runtime.IProduct;
import org.eclipse.core.runtime.Platform;
import org.eclipse.equinox.app.IApplication;
import org.eclipse.equinox.app.IApplicationContext;
import org.osgi.framework.BundleContext;
import org.osgi.framework.FrameworkUtil;

/**
 * The demo's Eclipse application. plugin.xml declares it as
 * "com.kel.demo.application" (extension point
 * org.eclipse.core.runtime.applications), and the platform's application
 * container starts it because the launcher passes "-application" with that
 * id. It reports what the platform was started with, shows a window, asks
 * for a restart when its arguments hold "-demoRestart", and returns its exit
 * value, which the Equinox launcher hands to the JVM's exit.
 *
 * Everything it keeps goes to com.kel.demo.report/&lt;process id&gt;/ in the
 * configuration area: report.properties (see Report), the launcher's log of
 * this launch (rcplauncher.log), window.png and, after a restart,
 * restart.out. One directory per process, since a restarted platform shares
 * the area with its predecessor.
 */
public final class DemoApplication implements IApplication {
    /** The application argument that asks for one restart. */
    static final String RESTART_ARG = "-demoRestart";
    /**
     * How long a platform that asked for a restart goes on before it ends; the
     * new launcher waits for it meanwhile.
     */
    static final long RESTART_DELAY_MS = 2000;

    /** The system properties the launcher sets, and the areas of the framework. */
    private static final String[] PROPERTIES = {
        "rcp.home", "rcp.data", "com.kel.rcp.install.id", "rcp.install.config", "rcp.osgi.install.area",
        "osgi.install.area", "osgi.configuration.area", "osgi.instance.area",
    };
    /** Variables the launcher manages; those named RCP_* are reported too. */
    private static final String[] VARIABLES = {"JAVA_HOME", "JAVA_HIGH_ZIPFDS", "LD_LIBRARY_PATH"};

    @Override
    public Object start(IApplicationContext context) throws Exception {
        // Ends a splash screen, if the platform shows one.
        context.applicationRunning();
        long pid = ProcessHandle.current().pid();
        File configurationArea = new File(Platform.getConfigurationLocation().getURL().getPath());
        File dir = new File(configurationArea, "com.kel.demo.report/" + pid);
        Report report = new Report(new File(dir, "report.properties"));

        IProduct product = Platform.getProduct();
        String[] appArgs = (String[]) context.getArguments().get(IApplicationContext.APPLICATION_ARGS);
        List<String> arguments = Arrays.asList(appArgs == null ? new String[0] : appArgs);
        String workspace = new File(Platform.getInstanceLocation().getURL().getPath()).getPath();
        String installConfiguration = System.getProperty("rcp.install.config", "(not set)");
        reportPlatform(report, product, arguments, new File(workspace));
        report.save();
        // Every launch rewrites the launcher's log in the workspace, a
        // restart too: this launch's is kept beside the report.
        File log = new File(workspace, "logs/rcplauncher.log");
        if (log.isFile()) {
            Files.copy(log.toPath(), new File(dir, "rcplauncher.log").toPath(), StandardCopyOption.REPLACE_EXISTING);
        }

        String title = product != null ? product.getName() : "(no product)";
        String[][] rows = {
            {"Product", product != null ? product.getId() : "(none)"},
            {"Workspace", workspace},
            {"Install configuration", installConfiguration},
            {"Configuration area", configurationArea.getPath()},
            {"Platform process", Long.toString(pid)},
        };
        try {
            Window.show(report, title, rows, new File(dir, "window.png"));
        } catch (Exception | LinkageError e) {
            // No display, or no SWT for this system: the rest still runs.
            report.add("window.error", e);
        }
        report.save();

        if (arguments.contains(RESTART_ARG) && System.getenv(Restart.RESTARTED_BY) == null) {
            Restart.request(configurationArea, new File(dir, "restart.out"), report);
            report.save();
            Thread.sleep(RESTART_DELAY_MS);
        }

        report.add("application.ended", System.currentTimeMillis());
        report.save();
        // The exit value returned below becomes "eclipse.exitcode", which the
        // Equinox launcher passes to System.exit: recorded as the JVM exits.
        Runtime.getRuntime().addShutdownHook(new Thread(() -> {
            report.add("process.exit.code", System.getProperty("eclipse.exitcode"));
            report.add("process.exiting", System.currentTimeMillis());
            try {
                report.save();
            } catch (Exception e) {
                e.printStackTrace();
            }
        }));
        return IApplication.EXIT_OK;
    }

    @Override
    public void stop() {
        // Called when the platform shuts down while the application runs; a
        // real application closes its workbench here. The demo's window is
        // open for a moment only.
    }

    private static void reportPlatform(Report report, IProduct product, List<String> arguments, File workspace)
            throws IOException {
        BundleContext context = FrameworkUtil.getBundle(DemoApplication.class).getBundleContext();
        for (String name : PROPERTIES) {
            report.add("property." + name, context.getProperty(name));
        }
        for (Map.Entry<String, String> e : sorted(System.getProperties()).entrySet()) {
            if (e.getKey().startsWith("demo.")) {
                report.add("property." + e.getKey(), e.getValue());
            }
        }
        for (String name : VARIABLES) {
            report.add("env." + name, System.getenv(name));
        }
        for (Map.Entry<String, String> e : new TreeMap<>(System.getenv()).entrySet()) {
            if (e.getKey().startsWith("RCP_")) {
                report.add("env." + e.getKey(), e.getValue());
            }
        }
        if (product != null) {
            report.add("product.id", product.getId());
            report.add("product.name", product.getName());
            report.add("product.application", product.getApplication());
        }
        report.add("location.instance", Platform.getInstanceLocation().getURL());
        report.add("location.configuration", Platform.getConfigurationLocation().getURL());
        report.add("location.install", Platform.getInstallLocation().getURL());
        // What the runtime left for the application, after taking its own
        // options ("-data", "-configuration", "-debug", ...).
        report.addList("application.arg.", arguments);

        ProcessHandle self = ProcessHandle.current();
        report.addList("jvm.arg.", self.info().arguments().map(List::of).orElse(List.of()));
        report.add("process.pid", self.pid());
        report.add("process.parent.pid", self.parent().map(ProcessHandle::pid).orElse(null));
        // In the same clock as the other times of the report.
        report.add("process.started", ManagementFactory.getRuntimeMXBean().getStartTime());
        // The launcher's platform lock in the workspace names this process
        // while it runs: a restarted launcher waits until it has ended.
        File lock = new File(workspace, ".rcp.lock");
        if (lock.isFile()) {
            report.add("lock.pid", new String(Files.readAllBytes(lock.toPath()), StandardCharsets.US_ASCII).trim());
        }
        report.add("restart.requested.by", System.getenv(Restart.RESTARTED_BY));
    }

    private static Map<String, String> sorted(java.util.Properties props) {
        Map<String, String> out = new TreeMap<>();
        for (String name : props.stringPropertyNames()) {
            out.put(name, props.getProperty(name));
        }
        return out;
    }
}
