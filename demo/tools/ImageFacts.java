import java.awt.image.BufferedImage;
import java.io.File;
import java.io.IOException;
import java.util.HashSet;
import java.util.Set;

import javax.imageio.ImageIO;

/**
 * Prints "width height colours" for each image named on the command line
 * (colours: the number of distinct RGB values, counted up to 1000), or
 * "unreadable" for a file that is missing or not an image. The demo's check that a
 * screenshot shows a window rather than an empty area.
 *
 *   java demo/tools/ImageFacts.java window.png ...
 */
public final class ImageFacts {
    public static void main(String[] args) throws Exception {
        for (String name : args) {
            BufferedImage image;
            try {
                image = ImageIO.read(new File(name));
            } catch (IOException e) {
                image = null;
            }
            if (image == null) {
                System.out.println("unreadable");
                continue;
            }
            Set<Integer> colours = new HashSet<>();
            for (int y = 0; y < image.getHeight() && colours.size() < 1000; y++) {
                for (int x = 0; x < image.getWidth() && colours.size() < 1000; x++) {
                    colours.add(image.getRGB(x, y) & 0xffffff);
                }
            }
            System.out.println(image.getWidth() + " " + image.getHeight() + " " + colours.size());
        }
    }
}
