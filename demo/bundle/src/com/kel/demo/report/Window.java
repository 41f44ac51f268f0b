package com.kel.demo.report;

import java.io.File;
import java.nio.file.Files;
import java.nio.file.StandardCopyOption;

import org.eclipse.swt.SWT;
import org.eclipse.swt.graphics.Font;
import org.eclipse.swt.graphics.FontData;
import org.eclipse.swt.graphics.GC;
import org.eclipse.swt.graphics.Image;
import org.eclipse.swt.graphics.ImageData;
import org.eclipse.swt.graphics.ImageLoader;
import org.eclipse.swt.graphics.Rectangle;
import org.eclipse.swt.layout.GridData;
import org.eclipse.swt.layout.GridLayout;
import org.eclipse.swt.widgets.Display;
import org.eclipse.swt.widgets.Label;
import org.eclipse.swt.widgets.Shell;

/**
 * The application's window: a shell titled with the product's name that shows
 * where the platform runs. A real application would open its workbench here
 * and run the event loop until the user closes it; the demo shows the window
 * until it is painted, keeps a picture of it and closes it again.
 */
final class Window {
    /** How long the window may take to appear and paint itself. */
    private static final int PAINT_TIMEOUT_MS = 5000;
    /** Time for the labels to paint after the shell's first paint event. */
    private static final int SETTLE_MS = 300;

    private static final String NO_SESSION_MANAGER = "org.eclipse.swt.internal.SessionManagerDBus.disable";

    private Window() {
    }

    /**
     * Shows the window with one row per label and value, and saves a PNG of
     * its contents as png. Reports the title, the size of the picture and
     * where it is.
     */
    static void show(Report report, String title, String[][] rows, File png) throws Exception {
        // A window of a moment is no program of the desktop session: SWT need
        // not register it with a session manager (without D-Bus it would only
        // print warnings).
        if (System.getProperty(NO_SESSION_MANAGER) == null) {
            System.setProperty(NO_SESSION_MANAGER, "true");
        }
        Display display = new Display();
        try {
            Shell shell = new Shell(display);
            shell.setText(title);
            GridLayout layout = new GridLayout(2, false);
            layout.marginWidth = 16;
            layout.marginHeight = 16;
            layout.horizontalSpacing = 16;
            shell.setLayout(layout);
            // The title again, inside: the picture has no window frame.
            Label heading = new Label(shell, SWT.NONE);
            heading.setText(title);
            heading.setLayoutData(new GridData(SWT.FILL, SWT.CENTER, true, false, 2, 1));
            FontData font = heading.getFont().getFontData()[0];
            Font bold = new Font(display, font.getName(), font.getHeight() * 3 / 2, SWT.BOLD);
            heading.setFont(bold);
            shell.addDisposeListener(e -> bold.dispose());
            for (String[] row : rows) {
                new Label(shell, SWT.NONE).setText(row[0]);
                new Label(shell, SWT.NONE).setText(row[1]);
            }
            shell.pack();

            boolean[] painted = {false};
            shell.addPaintListener(e -> painted[0] = true);
            shell.open();
            runEventLoop(display, () -> painted[0], PAINT_TIMEOUT_MS);
            if (!painted[0]) {
                throw new IllegalStateException("the window was not painted within " + PAINT_TIMEOUT_MS + " ms");
            }
            runEventLoop(display, () -> false, SETTLE_MS);

            // The shell draws itself into the image, so another window over
            // it on a real desktop does not spoil the picture.
            Rectangle area = shell.getClientArea();
            Image image = new Image(display, area.width, area.height);
            GC gc = new GC(image);
            try {
                shell.print(gc);
            } finally {
                gc.dispose();
            }
            ImageLoader loader = new ImageLoader();
            loader.data = new ImageData[] {image.getImageData()};
            image.dispose();
            File tmp = new File(png.getPath() + ".tmp");
            loader.save(tmp.getPath(), SWT.IMAGE_PNG);
            Files.move(tmp.toPath(), png.toPath(), StandardCopyOption.REPLACE_EXISTING, StandardCopyOption.ATOMIC_MOVE);

            report.add("window.title", shell.getText());
            report.add("window.width", area.width);
            report.add("window.height", area.height);
            report.add("window.image", png);
            shell.close();
        } finally {
            display.dispose();
        }
    }

    /** Dispatches events until done answers true or timeoutMs have passed. */
    private static void runEventLoop(Display display, java.util.function.BooleanSupplier done, int timeoutMs) {
        boolean[] timedOut = {false};
        display.timerExec(timeoutMs, () -> timedOut[0] = true);
        while (!done.getAsBoolean() && !timedOut[0]) {
            if (!display.readAndDispatch()) {
                display.sleep();
            }
        }
    }
}
