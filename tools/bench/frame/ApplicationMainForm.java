// The benchmark's frame program outside the runtime's training: an instrument control window with parts
// no training program uses (tool bar, tabs, custom painting, combo box, spinner, slider, progress bar,
// formatted field), so its start shows what the archive does for a Swing application it never saw.
package com.qz.kpo.emu57.app;

import java.awt.*;
import java.awt.image.BufferedImage;
import java.text.NumberFormat;
import javax.swing.*;

public final class ApplicationMainForm {
    public static void main(String[] args) {
        SwingUtilities.invokeLater(ApplicationMainForm::show);
    }

    static void show() {
        JToolBar tools = new JToolBar();
        for (Color color : new Color[] {Color.GREEN, Color.RED, Color.BLUE}) {
            BufferedImage icon = new BufferedImage(16, 16, BufferedImage.TYPE_INT_ARGB);
            Graphics2D g = icon.createGraphics();
            g.setColor(color);
            g.fillOval(2, 2, 12, 12);
            tools.add(new JButton(new ImageIcon(icon)));
        }
        JPanel screen = new JPanel() {
            @Override protected void paintComponent(Graphics graphics) {
                Graphics2D g = (Graphics2D) graphics;
                g.setRenderingHint(RenderingHints.KEY_ANTIALIASING, RenderingHints.VALUE_ANTIALIAS_ON);
                g.setPaint(new GradientPaint(0, 0, Color.BLACK, getWidth(), getHeight(), Color.DARK_GRAY));
                g.fillRect(0, 0, getWidth(), getHeight());
                g.setColor(Color.GREEN);
                for (int x = 1; x < getWidth(); x++) g.drawLine(x - 1, trace(x - 1), x, trace(x));
                g.drawString("trace 1", 10, 20);
            }

            int trace(int x) {
                return (int) (getHeight() * (0.5 + Math.sin(x / 30.0) / 3));
            }
        };
        JFormattedTextField offset = new JFormattedTextField(NumberFormat.getNumberInstance());
        offset.setValue(0.5);
        JPanel settings = new JPanel(new GridLayout(0, 2, 6, 6));
        for (Component part : new Component[] {new JLabel("Range"), new JComboBox<>(new String[] {"10 mV", "1 V"}),
                new JLabel("Samples"), new JSpinner(new SpinnerNumberModel(1024, 64, 65536, 64)), new JLabel("Gain"),
                new JSlider(0, 100, 40), new JLabel("Offset"), offset, new JCheckBox("Averaging", true), new JRadioButton("Once")}) {
            settings.add(part);
        }
        JTabbedPane tabs = new JTabbedPane();
        tabs.addTab("Screen", screen);
        tabs.addTab("Settings", settings);
        JProgressBar progress = new JProgressBar(0, 100);
        progress.setValue(30);
        progress.setStringPainted(true);
        JFrame frame = new JFrame("QZ-57 control");
        frame.add(tools, BorderLayout.NORTH);
        frame.add(tabs, BorderLayout.CENTER);
        frame.add(progress, BorderLayout.SOUTH);
        frame.setSize(720, 480);
        frame.setVisible(true);
    }
}
