// A training program: the parts of a typical Swing desktop application that its first minutes use
// beyond a plain frame: a menu bar, a tree, a table, a text area, a dialog and a file chooser.
import java.awt.BorderLayout;
import java.awt.event.WindowAdapter;
import java.awt.event.WindowEvent;
import javax.swing.*;
import javax.swing.table.DefaultTableModel;
import javax.swing.tree.DefaultMutableTreeNode;

public final class Workbench {
    public static void main(String[] args) {
        SwingUtilities.invokeLater(Workbench::show);
    }

    static void show() {
        JFrame frame = new JFrame("Workbench");
        JMenuBar bar = new JMenuBar();
        JMenu file = bar.add(new JMenu("File"));
        file.add(new JMenuItem("Open...")).setAccelerator(KeyStroke.getKeyStroke("control O"));
        file.add(new JCheckBoxMenuItem("Read only", true));
        file.addSeparator();
        file.add(new JMenuItem("Quit"));
        frame.setJMenuBar(bar);
        DefaultMutableTreeNode root = new DefaultMutableTreeNode("Sessions");
        for (int i = 1; i <= 3; i++) {
            DefaultMutableTreeNode session = new DefaultMutableTreeNode("Session " + i);
            session.add(new DefaultMutableTreeNode("scan.l57"));
            root.add(session);
        }
        JTree tree = new JTree(root);
        tree.expandRow(1);
        DefaultTableModel model = new DefaultTableModel(new Object[] {"Channel", "Value", "Valid"}, 0) {
            @Override public Class<?> getColumnClass(int column) {
                return column == 1 ? Double.class : column == 2 ? Boolean.class : String.class;
            }
        };
        for (int i = 0; i < 40; i++) model.addRow(new Object[] {"ch" + i, i * 0.25, i % 3 != 0});
        JTable table = new JTable(model);
        table.setAutoCreateRowSorter(true);
        JTextArea notes = new JTextArea("Notes\n", 6, 40);
        notes.setLineWrap(true);
        JSplitPane right = new JSplitPane(JSplitPane.VERTICAL_SPLIT, new JScrollPane(table), new JScrollPane(notes));
        frame.add(new JSplitPane(JSplitPane.HORIZONTAL_SPLIT, new JScrollPane(tree), right), BorderLayout.CENTER);
        frame.addWindowListener(new WindowAdapter() {
            @Override public void windowOpened(WindowEvent e) { dialogThenChooser(frame); }
        });
        frame.setSize(900, 600);
        frame.setVisible(true);
    }

    // A message dialog first, then, once it is up, a file chooser in its place.
    static void dialogThenChooser(JFrame frame) {
        JDialog dialog = new JOptionPane("Settings were read.", JOptionPane.INFORMATION_MESSAGE).createDialog(frame, "Workbench");
        dialog.setModal(false);
        dialog.addWindowListener(new WindowAdapter() {
            @Override public void windowOpened(WindowEvent e) {
                dialog.dispose();
                SwingUtilities.invokeLater(() -> new JFileChooser().showOpenDialog(frame));
            }
        });
        dialog.setVisible(true);
    }
}
