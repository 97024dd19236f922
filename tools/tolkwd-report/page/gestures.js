// The time lines by mouse and finger: the wheel zooms, dragging pans, two fingers pinch, a click or
// tap chooses. Fingers that go up or down scroll the page, which the browser does itself.

const kClickPixels = 4;
const kMouseReach = 3;
const kFingerReach = 14;
const kWheelNotch = 0.002;       // how much a pixel of the wheel zooms, as a power of two
const kLinePixels = 20;          // of a wheel that counts in lines
const kScrollRestSeconds = 0.35;

function wheelpixels(event) {
    return event.deltaMode === WheelEvent.DOM_DELTA_LINE ? kLinePixels : 1;
}

function ontrack(event) {
    return event.target.closest('.track, .axis') !== null;
}

// A page that is scrolled goes on scrolling when the lines come below the pointer, and so it does
// where zooming out ends.
function listentowheel(timelines, target) {
    const {view} = timelines;
    let scrolled = -Infinity;
    window.addEventListener('scroll', () => { scrolled = performance.now(); }, {passive: true});
    target.addEventListener('wheel', (event) => {
        const unit = wheelpixels(event);
        const [dx, dy] = event.shiftKey && event.deltaX === 0 ?
            [event.deltaY * unit, 0] : [event.deltaX * unit, event.deltaY * unit];
        const sideways = Math.abs(dx) > Math.abs(dy);
        const busy = performance.now() - scrolled < kScrollRestSeconds * 1000;
        if (!ontrack(event) || (!sideways && !event.ctrlKey && (busy || (dy > 0 && view.whole)))) {
            return;
        }
        event.preventDefault();
        if (sideways) {
            view.pan(dx / timelines.width);
        } else {
            // A pinch on a touchpad comes as a wheel with Ctrl, in small steps.
            const notch = event.ctrlKey ? kWheelNotch * 5 : kWheelNotch;
            view.zoom(2 ** (-dy * notch), timelines.placeat(event.clientX));
        }
    }, {passive: false});
}

// Follows the pointers that are down. One drags; two keep the places below them below them.
class Fingers {
    constructor(timelines) {
        this.timelines = timelines;
        this.down = new Map(); // id -> {x, start}
        this.moved = false;
    }

    press(event) {
        if (this.down.size === 0) {
            this.moved = false;
        }
        this.down.set(event.pointerId, {x: event.clientX, start: event.clientX});
    }

    move(event) {
        const finger = this.down.get(event.pointerId);
        this.moved = this.moved || Math.abs(event.clientX - finger.start) > kClickPixels ||
            this.down.size > 1;
        if (!this.moved) {
            return;
        }
        const before = this.spread();
        finger.x = event.clientX;
        this.follow(before, this.spread());
    }

    lift(event) {
        this.down.delete(event.pointerId);
    }

    // The middle of the fingers, and how far they are apart.
    spread() {
        const places = [...this.down.values()].map(({x}) => x);
        const [least, most] = d3.extent(places);
        return {middle: (least + most) / 2, apart: most - least};
    }

    follow(before, now) {
        const {view, width} = this.timelines;
        view.pan((before.middle - now.middle) / width);
        if (before.apart > kClickPixels && now.apart > kClickPixels) {
            view.zoom(now.apart / before.apart, this.timelines.placeat(now.middle));
        }
    }
}

function listentofingers(timelines, target) {
    const fingers = new Fingers(timelines);
    target.addEventListener('pointerdown', (event) => {
        if (ontrack(event) && event.button === 0) {
            fingers.press(event);
        }
    });
    target.addEventListener('pointermove', (event) => {
        if (!fingers.down.has(event.pointerId)) {
            return;
        }
        fingers.move(event);
        if (fingers.moved && !target.hasPointerCapture(event.pointerId)) {
            target.setPointerCapture(event.pointerId);
            target.classList.add('dragged');
        }
    });
    const lift = (event) => {
        fingers.lift(event);
        target.classList.toggle('dragged', fingers.down.size > 0 && fingers.moved);
    };
    target.addEventListener('pointerup', lift);
    target.addEventListener('pointercancel', lift);
    return fingers;
}

function listentopointing(timelines, fingers) {
    const {lines, details} = timelines;
    const pointed = (event, near) => {
        const row = event.target.closest('.row');
        return row && ontrack(event) ? timelines.itemat(row, event.clientX, near) : null;
    };
    lines.addEventListener('pointermove', (event) => {
        if (event.pointerType === 'mouse' && fingers.down.size === 0) {
            const item = pointed(event, kMouseReach);
            if (item) {
                details.show(item, true);
            } else {
                timelines.rest();
            }
        }
    });
    lines.addEventListener('pointerleave', () => timelines.rest());
    lines.addEventListener('click', (event) => {
        const item = fingers.moved ? null :
            pointed(event, event.pointerType === 'touch' ? kFingerReach : kMouseReach);
        if (item) {
            chooseitem(timelines, item);
        }
    });
    // What a click focuses is what it chooses.
    lines.addEventListener('mousedown', (event) => {
        if (ontrack(event)) {
            event.preventDefault();
        }
    });
}

// Of several spans drawn as one, the worst.
function chooseitem(timelines, {service, first, last, state}) {
    const spans = service.spans.slice(first, last + 1);
    timelines.choose(service, first + spans.findIndex((span) => span.state === state), true);
}

function listentogestures(timelines, chart) {
    listentowheel(timelines, chart);
    listentopointing(timelines, listentofingers(timelines, chart));
}
