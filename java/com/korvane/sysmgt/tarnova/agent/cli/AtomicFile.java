package com.korvane.sysmgt.tarnova.agent.cli;

import java.io.IOException;
import java.nio.ByteBuffer;
import java.nio.channels.FileChannel;
import java.nio.file.AccessDeniedException;
import java.nio.file.FileAlreadyExistsException;
import java.nio.file.FileSystemException;
import java.nio.file.Files;
import java.nio.file.NoSuchFileException;
import java.nio.file.Path;
import java.nio.file.StandardCopyOption;
import java.nio.file.StandardOpenOption;
import java.util.concurrent.ThreadLocalRandom;

/**
 * Replaces a file in one step: the bytes go to a new file in the same folder, reach the disk,
 * and the new file is renamed over the old one. A reader (a collector that scrapes the folder)
 * sees the whole old file or the whole new one, never a part; after a failure the old file is
 * left as it was and the new one is removed.
 */
final class AtomicFile {
    private static final int ATTEMPTS = 16;

    private AtomicFile() {
    }

    /** Why a replacement failed, in the words of the system's error messages. */
    static String reason(IOException e) {
        String reason = e instanceof FileSystemException
            ? ((FileSystemException) e).getReason() : e.getMessage();
        if (reason != null) {
            return reason;
        }
        return e instanceof NoSuchFileException ? "No such file or directory"
            : e instanceof AccessDeniedException ? "Permission denied" : e.toString();
    }

    static void replace(Path target, byte[] bytes) throws IOException {
        Path folder = target.toAbsolutePath().getParent();
        // A hidden name that the text-file collector (which reads *.prom) passes over. Created
        // as any new file is, so that the collector's user may read it as the umask allows.
        Path temporary = null;
        FileChannel channel = null;
        for (int attempt = 1; channel == null; attempt++) {
            temporary = folder.resolve(String.format(".%s.%08x.tmp", target.getFileName(),
                ThreadLocalRandom.current().nextInt()));
            try {
                channel = FileChannel.open(temporary, StandardOpenOption.CREATE_NEW,
                    StandardOpenOption.WRITE);
            } catch (FileAlreadyExistsException e) {
                if (attempt == ATTEMPTS) {
                    throw e;
                }
            }
        }
        boolean moved = false;
        try {
            try (FileChannel open = channel) {
                ByteBuffer buffer = ByteBuffer.wrap(bytes);
                while (buffer.hasRemaining()) {
                    open.write(buffer);
                }
                open.force(true);
            }
            Files.move(temporary, target, StandardCopyOption.ATOMIC_MOVE);
            moved = true;
        } finally {
            if (!moved) {
                try {
                    Files.deleteIfExists(temporary);
                } catch (IOException e) {
                    // The failure that brought us here is the one to report.
                }
            }
        }
    }
}
