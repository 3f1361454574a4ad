/*
 * Kotlin's operators and defaults for catalogues and streams. It needs nothing but kzsdk.jar and the
 * standard library; a CompletableFuture of the Java side is awaited with kotlinx-coroutines-jdk8.
 */
@file:JvmName("Kzsdk")

package com.orvanta.android.kzsdk

import java.io.File

/** Samples as sound: 16 bits, channels interleaved. The array is not copied. */
fun ShortArray.asSound(sampleRate: Int, channels: Int = 1): Sound = Sound.of(sampleRate, channels, this)

/** Samples as sound: full scale is 1, channels are interleaved. The array is not copied. */
fun FloatArray.asSound(sampleRate: Int, channels: Int = 1): Sound = Sound.of(sampleRate, channels, this)

/** Looks a sound file up. */
fun Catalogue.match(file: File, options: MatchOptions = MatchOptions.USUAL): Recognition =
    match(Sound.file(file), options)

/** Adds a recording: `music.add(sound, "song.flac", "title" to "Song")`. */
fun Catalogue.add(sound: Sound, source: String, vararg tags: Pair<String, String>): AddedTrack =
    add(sound, source, mapOf(*tags))

/** The track of an id: `music[3]`. */
operator fun Catalogue.get(track: Long): Track? = track(track)

/** The track that has a source: `music["song.flac"]`. */
operator fun Catalogue.get(source: String): Track? = find(source)

/** Whether a track has this source: `"song.flac" in music`. */
operator fun Catalogue.contains(source: String): Boolean = find(source) != null

/** Removes a source, and its track when it was the last one: `music -= "song.flac"`. */
operator fun Catalogue.minusAssign(source: String) = remove(source)

/**
 * The fingerprint of sound that comes in pieces, as many as it takes.
 *
 * @throws FingerprintException when the pieces end before it is complete; the message says why
 */
fun Sequence<FloatArray>.fingerprint(sampleRate: Int, channels: Int = 1): QueryDocument =
    StreamingFingerprint(SoundFormat.float32(sampleRate, channels)).use { stream ->
        if (none { stream.feed(it, 0, it.size) }) {
            stream.finish()
        }
        stream.made()
    }

/** The fingerprint of a finished stream, or the exception of its completion itself. */
private fun StreamingFingerprint.made(): QueryDocument =
    try {
        completion().join()
    } catch (failed: java.util.concurrent.CompletionException) {
        throw failed.cause ?: failed
    }
