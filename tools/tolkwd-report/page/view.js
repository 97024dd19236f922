// The part of the log that is shown.

const kLeastSeconds = 10;
const kZoomStep = 2;

class View {
    // `extent`: all there is. `changed` is called whenever another part is shown.
    constructor(extent, changed) {
        this.extent = extent;
        this.changed = changed;
        this.from = extent.from;
        this.to = extent.to;
    }

    get length() {
        return this.to - this.from;
    }

    get whole() {
        return this.from <= this.extent.from && this.to >= this.extent.to;
    }

    // Shows from there to there, as far as there is anything, and never less than can be told apart.
    show(from, to) {
        const all = this.extent.to - this.extent.from;
        const length = Math.min(all, Math.max(to - from, kLeastSeconds));
        const begin = (from + to - length) / 2;
        const first = Math.min(Math.max(begin, this.extent.from), this.extent.to - length);
        if (first !== this.from || first + length !== this.to) {
            this.from = first;
            this.to = first + length;
            this.changed();
        }
    }

    // Makes everything larger (`factor` > 1) or smaller around a place, which stays where it is.
    zoom(factor, around = (this.from + this.to) / 2) {
        const all = this.extent.to - this.extent.from;
        const length = Math.min(all, Math.max(this.length / factor, Math.min(kLeastSeconds, all)));
        const from = around - (around - this.from) * (length / this.length);
        this.show(from, from + length);
    }

    // Moves by a share of what is shown: 1 is all of it, later.
    pan(share) {
        this.show(this.from + share * this.length, this.to + share * this.length);
    }

    // Moves just as far as it takes to see the middle of a stretch.
    reveal(from, to) {
        const middle = (Math.max(from, this.extent.from) + Math.min(to, this.extent.to)) / 2;
        const seen = to > this.from && from < this.to;
        if (!seen) {
            this.show(middle - this.length / 2, middle + this.length / 2);
        }
    }

    all() {
        this.show(this.extent.from, this.extent.to);
    }

    last(seconds) {
        this.show(this.extent.to - seconds, this.extent.to);
    }
}
