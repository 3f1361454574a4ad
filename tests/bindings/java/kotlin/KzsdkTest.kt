// The Kotlin side on a real VM: operators, defaults, exceptions.
package com.orvanta.android.kzsdk

import java.io.File
import org.junit.Assert.assertEquals
import org.junit.Assert.assertFalse
import org.junit.Assert.assertNull
import org.junit.Assert.assertThrows
import org.junit.Assert.assertTrue
import org.junit.Test

class KzsdkTest {
    @Test
    fun operatorsReachTheCatalogue() {
        Catalogue.inMemory().use { music ->
            val tune = Tunes.play(1, 0.0, 30.0)
            val added = music.add(tune.asSound(Tunes.RATE), "song.flac", "title" to "Song")
            assertEquals("Song", music[added.track()]?.title())
            assertEquals(added.track(), music["song.flac"]?.id())
            assertTrue("song.flac" in music)
            assertEquals("Song", music.match(Tunes.floats(Tunes.play(1, 9.0, 10.0)).asSound(Tunes.RATE)).best()?.title())
            assertEquals(listOf("song.flac"), music.flatMap { it.sources() })
            music -= "song.flac"
            assertFalse("song.flac" in music)
            assertNull(music[added.track()])
        }
    }

    @Test
    fun piecesBecomeAFingerprint() {
        val music = Tunes.floats(Tunes.play(2, 0.0, 20.0))
        val pieces = generateSequence(0) { it + 4000 }.takeWhile { it < music.size }
            .map { music.copyOfRange(it, minOf(it + 4000, music.size)) }
        assertEquals(30, pieces.fingerprint(Tunes.RATE).values().size)
        val short = assertThrows(FingerprintException::class.java) { pieces.take(3).fingerprint(Tunes.RATE) }
        assertTrue(short.message, short.message!!.contains("too short"))
    }

    @Test
    fun filesThatAreMissingAreNamed() {
        Catalogue.inMemory().use { music ->
            val missing = assertThrows(java.io.IOException::class.java) { music.match(File("/nowhere.wav")) }
            assertTrue(missing.message, missing.message!!.contains("/nowhere.wav"))
        }
    }
}
