// The records of kzcat.h stay as they are, as those of kzsdk do: fields in their order, each at the
// next offset that its type allows, with nothing in between and nothing behind. Where a record has
// no pointer its size is the same everywhere.

#include <cstddef>

#include <gtest/gtest.h>

#include "kzcat.h"
#include "whole/abi/record_layout.hpp"

namespace {

using kz::test::expect_layout;
using kz::test::Field;

TEST(CatalogueRecordLayout, OfMonitorOptions)
{
    using Record = kzcat_monitor_options;
    expect_layout<Record>({
        FIELD(Record, silence_level),
        FIELD(Record, least_silence),
        FIELD(Record, least_gap),
        FIELD(Record, report_every),
        FIELD(Record, speeds),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(80U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfEvent)
{
    using Record = kzcat_event;
    expect_layout<Record>({
        FIELD(Record, stage),
        FIELD(Record, heard),
        FIELD(Record, begin),
        FIELD(Record, end),
        FIELD(Record, known),
        FIELD(Record, track),
        FIELD(Record, source),
        FIELD(Record, title),
        FIELD(Record, artist),
        FIELD(Record, score),
        FIELD(Record, threshold),
        FIELD(Record, place_begin),
        FIELD(Record, place_end),
        FIELD(Record, speed),
        FIELD(Record, tempo),
        FIELD(Record, pitch),
        FIELD(Record, repeat),
        FIELD(Record, reserved),
    });
}

TEST(CatalogueRecordLayout, OfSettings)
{
    using Record = kzcat_settings;
    expect_layout<Record>({
        FIELD(Record, plan),
        FIELD(Record, index_file),
        FIELD(Record, fall_back),
        FIELD(Record, index_from),
        FIELD(Record, partial),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(64U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfFacts)
{
    using Record = kzcat_facts;
    expect_layout<Record>({
        FIELD(Record, tracks),
        FIELD(Record, codes),
        FIELD(Record, index_bytes),
        FIELD(Record, scan_ms),
        FIELD(Record, parts_ms),
        FIELD(Record, plan),
        FIELD(Record, index_state),
        FIELD(Record, left_out),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(88U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfSoundFormat)
{
    using Record = kzcat_format;
    expect_layout<Record>({
        FIELD(Record, format),
        FIELD(Record, sample_rate),
        FIELD(Record, channels),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(16U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfBuilderSettings)
{
    using Record = kzcat_builder_settings;
    expect_layout<Record>({
        FIELD(Record, documents),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(64U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfTrailFacts)
{
    using Record = kzcat_trail_facts;
    expect_layout<Record>({
        FIELD(Record, samples),
        FIELD(Record, code_count),
        FIELD(Record, sample_rate),
        FIELD(Record, profile),
        FIELD(Record, answers_documents),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(64U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfAlignments)
{
    using Record = kzcat_alignment;
    expect_layout<Record>({
        FIELD(Record, offset),
        FIELD(Record, begin),
        FIELD(Record, end),
        FIELD(Record, compared),
        FIELD(Record, agreeing),
        FIELD(Record, error_rate),
        FIELD(Record, agreeing_rate),
        FIELD(Record, first_sounding),
        FIELD(Record, second_sounding),
        FIELD(Record, lag),
        FIELD(Record, found),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(128U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfTags)
{
    using Record = kzcat_tag;
    expect_layout<Record>({
        FIELD(Record, name),
        FIELD(Record, value),
    });
}

TEST(CatalogueRecordLayout, OfSources)
{
    using Record = kzcat_source;
    expect_layout<Record>({
        FIELD(Record, uri),
        FIELD(Record, size),
        FIELD(Record, mtime_ns),
        FIELD(Record, hash),
    });
}

TEST(CatalogueRecordLayout, OfNewTracks)
{
    using Record = kzcat_new_track;
    expect_layout<Record>({
        FIELD(Record, trail),
        FIELD(Record, source),
        FIELD(Record, tags),
        FIELD(Record, tag_count),
    });
}

TEST(CatalogueRecordLayout, OfStoredTracks)
{
    using Record = kzcat_stored_track;
    expect_layout<Record>({
        FIELD(Record, trail),
        FIELD(Record, sources),
        FIELD(Record, source_count),
        FIELD(Record, tags),
        FIELD(Record, tag_count),
        FIELD(Record, added),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(64U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfAddedTracks)
{
    using Record = kzcat_added;
    expect_layout<Record>({
        FIELD(Record, track),
        FIELD(Record, is_new),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(16U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfTrackFacts)
{
    using Record = kzcat_track_facts;
    expect_layout<Record>({
        FIELD(Record, track),
        FIELD(Record, samples),
        FIELD(Record, code_count),
        FIELD(Record, added),
        FIELD(Record, sample_rate),
        FIELD(Record, tag_count),
        FIELD(Record, source_count),
        FIELD(Record, answers_documents),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(80U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfMatchOptions)
{
    using Record = kzcat_match_options;
    expect_layout<Record>({
        FIELD(Record, speeds),
        FIELD(Record, candidates),
        FIELD(Record, passages),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(64U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfSummaries)
{
    using Record = kzcat_summary;
    expect_layout<Record>({
        FIELD(Record, verdict),
        FIELD(Record, by),
        FIELD(Record, match_count),
        FIELD(Record, candidate_count),
        FIELD(Record, runner_up),
        FIELD(Record, clip_seconds),
        FIELD(Record, left_out),
        FIELD(Record, shards),
        FIELD(Record, shards_answered),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(64U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfMatches)
{
    using Record = kzcat_match;
    expect_layout<Record>({
        FIELD(Record, track),
        FIELD(Record, source),
        FIELD(Record, title),
        FIELD(Record, artist),
        FIELD(Record, score),
        FIELD(Record, threshold),
        FIELD(Record, offset),
        FIELD(Record, speed),
        FIELD(Record, tempo),
        FIELD(Record, pitch),
        FIELD(Record, clip_begin),
        FIELD(Record, clip_end),
        FIELD(Record, by),
        FIELD(Record, weak),
        FIELD(Record, reserved),
    });
}

TEST(CatalogueRecordLayout, OfMergeCounts)
{
    using Record = kzcat_merged;
    expect_layout<Record>({
        FIELD(Record, tracks_new),
        FIELD(Record, tracks_known),
        FIELD(Record, tracks_damaged),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(32U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfJobs)
{
    using Record = kzcat_job;
    expect_layout<Record>({
        FIELD(Record, job),
        FIELD(Record, uri),
        FIELD(Record, attempt),
        FIELD(Record, reserved),
    });
}

TEST(CatalogueRecordLayout, OfJobCounts)
{
    using Record = kzcat_job_counts;
    expect_layout<Record>({
        FIELD(Record, waiting),
        FIELD(Record, running),
        FIELD(Record, lost),
        FIELD(Record, done),
        FIELD(Record, failed),
        FIELD(Record, done_lately),
        FIELD(Record, reserved),
    });
    EXPECT_EQ(80U, sizeof(Record));
}

TEST(CatalogueRecordLayout, OfFailedJobs)
{
    using Record = kzcat_failed_job;
    expect_layout<Record>({
        FIELD(Record, job),
        FIELD(Record, uri),
        FIELD(Record, error),
        FIELD(Record, worker),
        FIELD(Record, attempts),
        FIELD(Record, reserved),
    });
}

} // namespace
