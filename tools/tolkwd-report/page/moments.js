// The log's two clocks. Places in the picture are seconds since the log began, which only go
// forward; what is shown is what the log said, and that clock is set now and then.

// Threads that write at the same time make stamps that go back a little; that is no change.
const kJitterSeconds = 60;

class Clock {
    // `moments`: [elapsed, clock] pairs, both since `beginning`, in any order.
    constructor(beginning, moments) {
        this.beginning = beginning;
        this.changes = [{from: -Infinity, shift: 0}];
        for (const [elapsed, clock] of moments.sort((a, b) => a[0] - b[0])) {
            const shift = clock - elapsed;
            if (Math.abs(shift - this.changes[this.changes.length - 1].shift) > kJitterSeconds) {
                this.changes.push({from: elapsed, shift});
            }
        }
    }

    // What the clock said at a place.
    at(elapsed) {
        const change = d3.bisector((one) => one.from).right(this.changes, elapsed) - 1;
        return this.beginning + elapsed + this.changes[change].shift;
    }

    // The stretches between two places in which nobody set it: places, and by how much its seconds
    // since 1970 are more than places.
    stretches(from, to) {
        return this.changes
            .map(({from: begin, shift}, i) => ({
                from: Math.max(from, begin),
                to: Math.min(to, i + 1 < this.changes.length ? this.changes[i + 1].from : Infinity),
                offset: this.beginning + shift,
            }))
            .filter((stretch) => stretch.from <= stretch.to);
    }

    // Where it was set between two places, and by how many seconds.
    changed(from, to) {
        return this.changes
            .map(({from: place, shift}, i) => ({place, by: shift - (this.changes[i - 1]?.shift ?? 0)}))
            .filter(({place}) => place > from && place < to);
    }
}
